#pragma once

#include <cstddef>
#include <cstdint>

#include "foundation/sub_rect.h"
#include "raster/block_strides.h"
#include "raster/interleave.h"

// Questions about state bytes and changes of them, many at a time.

namespace lumo {

/// Turns states into a mask: a byte of ones (0xFF) where a value is valid, else of zeros. `states`
/// may be null, for values that are all valid. @return how many are valid.
VEXG_EXPORT std::size_t MaskValid(const unsigned char* states, std::size_t count,
                                  unsigned char* mask);

/// True when a bit is set in every state, and where there is no state.
VEXG_EXPORT bool AllHaveState(const unsigned char* states, std::size_t count,
                              PixelValueState::Code bit);
/// True when some state has one of the bits.
VEXG_EXPORT bool AnyHasState(const unsigned char* states, std::size_t count, unsigned char bits);

/// Counts the states of valid pixels of each of several bands that lie pixel by pixel.
/// @param counts  [in,out] one for each band, to which its number is added.
VEXG_EXPORT void CountValid(const unsigned char* states, std::size_t pixels, std::size_t bands,
                            std::uint64_t* counts);

/// How many states of valid pixels there are before the first other one.
VEXG_EXPORT std::size_t CountLeadingValid(const unsigned char* states, std::size_t count);
/// How many states there are before the first of a valid pixel, and behind the last one; as many as
/// `count` where none is valid.
VEXG_EXPORT std::size_t CountLeadingInvalid(const unsigned char* states, std::size_t count);
VEXG_EXPORT std::size_t CountTrailingInvalid(const unsigned char* states, std::size_t count);

/// True when none of the states has a bit of PixelValueState::NotValid.
inline bool AllValid(const unsigned char* states, std::size_t count) {
  return !AnyHasState(states, count, PixelValueState::NotValid);
}

/// Sets bits in the states of the pixels of a line whose byte in a mask is 0, in some bands.
/// @param strides  of the block; that of its lines doesn't count.
/// @param states   of the line's first pixel in the first of the bands.
VEXG_EXPORT void ExcludeMasked(const unsigned char* mask, std::size_t width, std::size_t bands,
                               const BlockStrides& strides, unsigned char bits,
                               unsigned char* states);

/// Sets a bit of a state, or clears it.
inline void SetState(unsigned char& state, PixelValueState::Code bit, bool on) {
  state = static_cast<unsigned char>(on ? state | bit : state & ~bit);
}

/// Sets a bit in the states of a block where `isMarked(x, y, band)` is true, and clears it
/// elsewhere. x and y are pixels of the raster, and `states` is what GetSubRect has given.
template <typename IsMarked>
void MarkStates(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                PixelValueState::Code bit, Array<unsigned char>& states, const IsMarked& isMarked) {
  const Array<unsigned> shown = BandsOfBlock(bands, interleave);
  const std::size_t width = rect.Width(), height = rect.Height();
  const BlockStrides strides(interleave, width, height, shown.GetCount());
  for (unsigned i = 0; i < shown.GetCount(); ++i) {
    for (unsigned y = 0; y < height; ++y) {
      unsigned char* state = states.GetData() + i * strides.band + y * strides.line;
      for (unsigned x = 0; x < width; ++x, state += strides.pixel) {
        SetState(*state, bit, isMarked(rect.left + x, rect.top + y, shown[i]));
      }
    }
  }
}

}  // namespace lumo
