#pragma once

#include "raster/tile.h"

namespace lumo {

/// True for a pixel that takes part in what is computed for regions: no band has no data or lies
/// outside the region of interest, and not all bands are masked.
inline bool IsUsable(const BasicTile& tile, int x, int y) {
  return !tile.AnyNoData(x, y) && !tile.AllMasked(x, y) && !tile.AnyOutsideROI(x, y);
}

}  // namespace lumo
