#pragma once

#include <algorithm>

#include "raster/tile.h"

namespace lumo {

/// Sizes a tile like another one, with the same bands, borders, states and place; its pixels are
/// whatever the storage holds. False when there is no memory.
inline bool SizeLike(const BasicTile& shape, BasicTile& tile) {
  if (!tile.ResizeForOverwrite(shape.Dimensions())) return false;
  std::ranges::copy(shape.StateArray(), tile.StateArray().begin());
  tile.SetIndex(shape.Index());
  tile.SetOrigin(shape.Origin());
  return true;
}

}  // namespace lumo
