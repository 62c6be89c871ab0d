#pragma once

#include <cstddef>

#include "raster/raster_enums.h"

namespace lumo {

/// A block of elements, of pixels or of their states, in the order of an interleave.
struct PickedBlock {
  const void* elements;   ///< without gaps
  unsigned elementBytes;  ///< 1, 2, 4, 8 or 16
  Interleave order;       ///< BIP, BIL or BSQ; None for one band
  unsigned width;         ///< samples
  unsigned height;        ///< lines
  unsigned bands;         ///< values of a pixel
};

/// Copies pixels of one line of a block, with all bands, to where they follow one another, pixel by
/// pixel: the first is `x`, then every `step`-th.
/// @param line  of the block.
/// @param step   1 or more.
/// @param count  pixels; the last one lies in the line.
/// @param to     [out] count * bands elements.
VEXG_EXPORT void PickPixels(const PickedBlock& block, unsigned line, unsigned x, std::size_t step,
                            std::size_t count, void* to);

/// True when some state of a line of a block says more than that the pixel holds no data, which its
/// value shows anyway.
VEXG_EXPORT bool HasMasks(const PickedBlock& states, unsigned line);

}  // namespace lumo
