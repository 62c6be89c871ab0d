#pragma once

#include "raster/tile.h"

namespace lumo {

/// True for a pixel that takes part in what is computed for regions: no band has no data or lies
/// outside the region of interest, and not all bands are masked.
/// @param states  of its bands, which lie together.
inline bool IsUsable(const unsigned char* states, std::size_t bands) {
  unsigned char any = 0, all = PixelValueState::NotValid;
  for (std::size_t band = 0; band < bands; ++band) {
    any |= states[band];
    all &= states[band];
  }
  return (any & (PixelValueState::NoData | PixelValueState::OutsideROI)) == 0 &&
         (all & PixelValueState::Masked) == 0;
}

/// The same of a pixel of a tile.
inline bool IsUsable(const BasicTile& tile, int x, int y) {
  return IsUsable(tile.StateArray().GetData() + tile.Offset(x, y), tile.Bands());
}

}  // namespace lumo
