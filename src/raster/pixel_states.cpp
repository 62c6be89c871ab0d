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

bool AllHaveState(const unsigned char* states, std::size_t count, PixelValueState::Code bit) {
  return std::all_of(states, states + count, [bit](unsigned char s) { return (s & bit) != 0; });
}

}  // namespace lumo
