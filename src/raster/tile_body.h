#pragma once

#include <algorithm>

#include "raster/tile.h"

namespace lumo {

/// Gives every band of `tile` at its pixels, borders included, the state bits that some band of
/// `shape` has there. Pixels outside `shape` get the state of no data.
VEXG_EXPORT void JoinStates(const BasicTile& shape, BasicTile& tile);

template <typename T>
TileFromTemplate<T>::TileFromTemplate(const BasicTile& shape) : Tile<T>(shape.Dimensions()) {
  if (!this->IsValid()) return;
  std::ranges::copy(shape.StateArray(), this->StateArray().begin());
  this->SetIndex(shape.Index());
}

template <typename T>
TileFromTemplate<T>::TileFromTemplate(const BasicTile& shape, unsigned bands) {
  TileDimensions dimensions = shape.Dimensions();
  dimensions.bands = bands;
  if (!this->Resize(dimensions)) return;
  JoinStates(shape, *this);
  this->SetIndex(shape.Index());
}

template <typename T>
TileFromTemplateBorder<T>::TileFromTemplateBorder(const BasicTile& shape, unsigned left,
                                                  unsigned right, unsigned top, unsigned bottom) {
  if (!this->Resize(shape.Width(), shape.Height(), 1, left, right, top, bottom)) return;
  JoinStates(shape, *this);
  this->SetIndex(shape.Index());
}

}  // namespace lumo
