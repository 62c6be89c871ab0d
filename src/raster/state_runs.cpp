#include "raster/state_runs.h"

#include <algorithm>
#include <cstdint>
#include <cstring>

#include "platform/vector_clones.h"
#include "raster/pixel_states.h"

namespace lumo {
namespace {

VEXG_VECTOR_CLONES void SetBits(unsigned char* states, std::size_t count, unsigned char bits) {
  for (std::size_t i = 0; i < count; ++i) states[i] = static_cast<unsigned char>(states[i] | bits);
}

VEXG_VECTOR_CLONES void KeepBits(unsigned char* states, std::size_t count, unsigned char bits) {
  for (std::size_t i = 0; i < count; ++i) states[i] = static_cast<unsigned char>(states[i] & bits);
}

/// Gives each state the bit of its pixel's byte in the mask.
VEXG_VECTOR_CLONES void PutByMask(unsigned char* __restrict states, std::size_t count,
                                  const unsigned char* __restrict mask, unsigned char set,
                                  unsigned char bit) {
  for (std::size_t i = 0; i < count; ++i) {
    states[i] = static_cast<unsigned char>((states[i] & ~bit) | (mask[i] == set ? bit : 0));
  }
}

/// The same for kBands states of each pixel, which lie together.
template <std::size_t kBands>
void PutPixelsByMask(unsigned char* __restrict states, std::size_t count,
                     const unsigned char* __restrict mask, unsigned char set, unsigned char bit) {
  for (std::size_t i = 0; i < count; ++i, states += kBands) {
    const auto bits = static_cast<unsigned char>(mask[i] == set ? bit : 0);
    for (std::size_t band = 0; band < kBands; ++band) {
      states[band] = static_cast<unsigned char>((states[band] & ~bit) | bits);
    }
  }
}

constexpr std::size_t kGroup = 64;  // pixels that are looked at together

/// True when all bytes of a group are the same, 0 or 1; `value` is that of the first.
bool IsUniform(const unsigned char* mask, std::size_t count, unsigned char& value) {
  value = mask[0];
  if (count != kGroup) {
    return std::all_of(mask, mask + count, [&](unsigned char byte) { return byte == value; });
  }
  constexpr std::uint64_t kOnes = 0x0101010101010101;
  std::uint64_t all = ~std::uint64_t{0}, any = 0;
  for (std::size_t i = 0; i < kGroup; i += 8) {
    std::uint64_t word = 0;
    std::memcpy(&word, mask + i, 8);
    all &= word;
    any |= word;
  }
  return any == 0 || all == kOnes;
}

}  // namespace

StateRuns::StateRuns(PixelValueState::Code bit, Array<unsigned char>& states, Interleave interleave,
                     std::size_t width, std::size_t height, std::size_t bands)
    : states_(states.GetData()),
      bit_(bit),
      width_(width),
      height_(height),
      bands_(interleave == Interleave::None ? 1 : bands),
      strides_(interleave, width, height, bands_),
      fits_(states.GetCount() == width_ * height_ * bands_) {}

void StateRuns::Put(unsigned char* states, std::size_t count, bool on) const {
  if (on) {
    SetBits(states, count, bit_);
  } else if (AnyHasState(states, count, bit_)) {  // seldom, and looking costs less than writing
    KeepBits(states, count, static_cast<unsigned char>(0xFF & ~bit_));
  }
}

void StateRuns::PutRun(std::size_t line, std::size_t first, std::size_t count, bool on) {
  unsigned char* const states = states_ + line * strides_.line + first * strides_.pixel;
  if (strides_.band == 1) {
    Put(states, count * bands_, on);
    return;
  }
  for (std::size_t band = 0; band < bands_; ++band) Put(states + band * strides_.band, count, on);
}

void StateRuns::PutLine(std::size_t line, const unsigned char* mask, unsigned char set) {
  std::size_t first = 0;
  while (first < width_) {
    // As many alike as there are, else a group of its own.
    unsigned char value = 0;
    const auto groupAt = [&](std::size_t at) { return std::min(kGroup, width_ - at); };
    if (!IsUniform(mask + first, groupAt(first), value)) {
      PutPixels(line, first, groupAt(first), mask, set);
      first += groupAt(first);
      continue;
    }
    std::size_t stop = first + groupAt(first);
    unsigned char next = value;
    while (stop < width_ && IsUniform(mask + stop, groupAt(stop), next) && next == value) {
      stop += groupAt(stop);
    }
    PutRun(line, first, stop - first, value == set);
    first = stop;
  }
}

/// Writes pixels of a line each by its byte.
void StateRuns::PutPixels(std::size_t line, std::size_t first, std::size_t count,
                          const unsigned char* mask, unsigned char set) {
  unsigned char* states = states_ + line * strides_.line + first * strides_.pixel;
  if (strides_.pixel == 1) {
    for (std::size_t band = 0; band < bands_; ++band) {
      PutByMask(states + band * strides_.band, count, mask + first, set, bit_);
    }
    return;
  }
  switch (bands_) {
    case 2:
      return PutPixelsByMask<2>(states, count, mask + first, set, bit_);
    case 3:
      return PutPixelsByMask<3>(states, count, mask + first, set, bit_);
    case 4:
      return PutPixelsByMask<4>(states, count, mask + first, set, bit_);
    default:
      for (std::size_t i = first; i < first + count; ++i, states += bands_) {
        Put(states, bands_, mask[i] == set);
      }
  }
}

void StateRuns::PutLineOfBand(std::size_t line, std::size_t position, const unsigned char* mask,
                              unsigned char set) {
  unsigned char* states = states_ + line * strides_.line + position * strides_.band;
  if (strides_.pixel == 1) {
    PutByMask(states, width_, mask, set, bit_);
    return;
  }
  for (std::size_t i = 0; i < width_; ++i, states += strides_.pixel) {
    *states = static_cast<unsigned char>((*states & ~bit_) | (mask[i] == set ? bit_ : 0));
  }
}

}  // namespace lumo
