#include "raster/pixel_states.h"

#include <algorithm>
#include <cstring>
#include <vector>

#include "platform/vector_clones.h"

namespace lumo {

VEXG_VECTOR_CLONES
bool AnyHasState(const unsigned char* states, std::size_t count, unsigned char bits) {
  // In pieces, so that an early state ends it.
  constexpr std::size_t kPiece = 4096;
  for (std::size_t i = 0; i < count; i += kPiece) {
    const std::size_t end = std::min(i + kPiece, count);
    unsigned char any = 0;
    for (std::size_t j = i; j < end; ++j) any |= states[j];
    if ((any & bits) != 0) return true;
  }
  return false;
}

VEXG_VECTOR_CLONES
std::size_t MaskValid(const unsigned char* states, std::size_t count, unsigned char* mask) {
  if (states == nullptr) {
    std::fill_n(mask, count, static_cast<unsigned char>(0xFF));
    return count;
  }
  for (std::size_t i = 0; i < count; ++i) {
    mask[i] = IsValidState(states[i]) ? 0xFF : 0;
  }
  std::uint32_t valid = 0;
  for (std::size_t i = 0; i < count; ++i) valid += mask[i] & 1;
  return valid;
}

namespace {

/// Adds 1 where a state isn't one of a valid pixel.
VEXG_VECTOR_CLONES
void AddInvalid(const unsigned char* states, std::size_t count, unsigned char* sums) {
  for (std::size_t i = 0; i < count; ++i) {
    sums[i] = static_cast<unsigned char>(sums[i] + (IsValidState(states[i]) ? 0 : 1));
  }
}

}  // namespace

void CountValid(const unsigned char* states, std::size_t pixels, std::size_t bands,
                std::uint64_t* counts) {
  // A row of sums of one byte each, as long as fits a first cache, is added to as often as that
  // holds.
  constexpr std::size_t kSums = 4096, kMostRows = 255;
  const std::size_t row = std::max<std::size_t>(kSums / bands, 1) * bands;
  std::vector<unsigned char> sums(row);
  const std::size_t count = pixels * bands;
  for (std::size_t band = 0; band < bands; ++band) counts[band] += pixels;
  for (std::size_t at = 0; at < count;) {
    for (unsigned rows = 0; rows < kMostRows && at < count; ++rows) {
      const std::size_t length = std::min(row, count - at);
      AddInvalid(states + at, length, sums.data());
      at += length;
    }
    for (std::size_t i = 0, band = 0; i < row; ++i, ++band) {
      if (band == bands) band = 0;
      counts[band] -= sums[i];
      sums[i] = 0;
    }
  }
}

namespace {

constexpr std::size_t kChunk = 64;  // states that are looked at together

/// Whether a valid pixel is among the states of a chunk.
inline bool HasValid(const unsigned char* states) {
  unsigned char any = 0;
  for (std::size_t i = 0; i < kChunk; ++i) {
    any = static_cast<unsigned char>(any | (IsValidState(states[i]) ? 1 : 0));
  }
  return any != 0;
}

/// Whether a pixel that isn't valid is among them.
inline bool HasInvalid(const unsigned char* states) {
  unsigned char any = 0;
  for (std::size_t i = 0; i < kChunk; ++i) any |= states[i];
  return !IsValidState(any);
}

}  // namespace

VEXG_VECTOR_CLONES
std::size_t CountLeadingValid(const unsigned char* states, std::size_t count) {
  std::size_t i = 0;
  while (i + kChunk <= count && !HasInvalid(states + i)) i += kChunk;
  while (i < count && IsValidState(states[i])) ++i;
  return i;
}

VEXG_VECTOR_CLONES
std::size_t CountLeadingInvalid(const unsigned char* states, std::size_t count) {
  std::size_t i = 0;
  while (i + kChunk <= count && !HasValid(states + i)) i += kChunk;
  while (i < count && !IsValidState(states[i])) ++i;
  return i;
}

VEXG_VECTOR_CLONES
std::size_t CountTrailingInvalid(const unsigned char* states, std::size_t count) {
  std::size_t end = count;
  while (end >= kChunk && !HasValid(states + end - kChunk)) end -= kChunk;
  while (end > 0 && !IsValidState(states[end - 1])) --end;
  return count - end;
}

void ExcludeMasked(const unsigned char* mask, std::size_t width, std::size_t bands,
                   const BlockStrides& strides, unsigned char bits, unsigned char* states) {
  const auto isSet = [](unsigned char byte) { return byte != 0; };
  const unsigned char* const end = mask + width;
  const unsigned char* stop = mask;
  // Pixels that are excluded come in runs, and mostly there are few of them.
  while (const void* const found = std::memchr(stop, 0, static_cast<std::size_t>(end - stop))) {
    const auto* const first = static_cast<const unsigned char*>(found);
    stop = std::find_if(first, end, isSet);
    unsigned char* const at = states + static_cast<std::size_t>(first - mask) * strides.pixel;
    const auto count = static_cast<std::size_t>(stop - first);
    const bool areTogether = strides.band == 1 && strides.pixel == bands;
    const std::size_t inRun = areTogether ? count * bands : count;
    for (std::size_t band = 0; band < (areTogether ? 1 : bands); ++band) {
      unsigned char* state = at + band * strides.band;
      for (std::size_t i = 0; i < inRun; ++i, state += areTogether ? 1 : strides.pixel) {
        *state = static_cast<unsigned char>(*state | bits);
      }
    }
  }
}

bool AllHaveState(const unsigned char* states, std::size_t count, PixelValueState::Code bit) {
  return std::all_of(states, states + count, [bit](unsigned char s) { return (s & bit) != 0; });
}

}  // namespace lumo
