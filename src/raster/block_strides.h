#pragma once

#include <cstddef>

#include "raster/raster_enums.h"

namespace lumo {

/// How far apart neighbours lie in a block, in elements: one arithmetic for all interleaves.
struct BlockStrides {
  BlockStrides() = default;
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
  std::size_t line = 0;
  std::size_t band = 0;
};

}  // namespace lumo
