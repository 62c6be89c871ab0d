#pragma once

#include <cstddef>

#include "raster/raster_enums.h"

namespace lumo {

/// Gives the distances of neighbours in a block, in elements: one arithmetic for all interleaves.
/// The element of sample x, line y and band b stands at x * pixel + y * line + b * band:
///
///     const BlockStrides strides(interleave, width, height, bands);
///     const float value = pixels[x * strides.pixel + y * strides.line + b * strides.band];
struct BlockStrides {
  BlockStrides() = default;
  /// Strides of a block without gaps; one without an interleave lies as in BSQ.
  /// @param width,height  samples and lines of the block.
  /// @param bands         of the block, not of its raster.
  BlockStrides(Interleave interleave, std::size_t width, std::size_t height, std::size_t bands) {
    switch (interleave) {
      case Interleave::BIP:
        pixel = bands;
        line = width * bands;
        band = 1;
        return;
      case Interleave::BIL:
        pixel = 1;
        line = width * bands;
        band = width;
        return;
      default:
        pixel = 1;
        line = width;
        band = width * height;
    }
  }

  std::size_t pixel = 0;  ///< to the next sample
  std::size_t line = 0;   ///< to the next line
  std::size_t band = 0;   ///< to the next band
};

}  // namespace lumo
