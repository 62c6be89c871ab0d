#include "raster/pixel_states.h"

#include <algorithm>
#include <cstdint>

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

constexpr std::size_t kChunk = 64;  // states that are looked at together

/// Whether a valid pixel is among the states of a chunk.
inline bool HasValid(const unsigned char* states) {
  unsigned char any = 0;
  for (std::size_t i = 0; i < kChunk; ++i) {
    any = static_cast<unsigned char>(any | (IsValidState(states[i]) ? 1 : 0));
  }
  return any != 0;
}

}  // namespace

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

bool AllHaveState(const unsigned char* states, std::size_t count, PixelValueState::Code bit) {
  return std::all_of(states, states + count, [bit](unsigned char s) { return (s & bit) != 0; });
}

}  // namespace lumo
