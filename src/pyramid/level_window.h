#pragma once

#include "pyramid/level_shape.h"
#include "raster/tile.h"

namespace lumo {

/// Some tiles of a level, side by side in one row, while their pixels are gathered from blocks of
/// the raster. Exists for TwelveTypes.
///
/// In its memory the tiles follow one another from left to right, each a block of its own,
/// pixel-interleaved: the form in which the store of a pyramid takes them. States travel with the
/// pixels where they say more than that a pixel holds no data, which its value shows.
template <typename T>
class LevelWindow {
 public:
  explicit LevelWindow(const LevelShape& shape) : shape_(shape) {}

  /// The level whose tiles these are.
  const LevelShape& Shape() const { return shape_; }

  /// Makes room for the tiles from `column` to before `endColumn` of a row.
  /// @return false, with the fault set, when there is no memory.
  bool Begin(unsigned column, unsigned endColumn, unsigned row, unsigned bands);

  /// Copies the pixels that a block has of these tiles. The block may lie in any order of axes.
  void Take(const Tile<T>& block);

  /// The tiles as one, to be written.
  Tile<T>& Pixels() { return tiles_; }

 private:
  struct Line;
  void TakeLine(const Tile<T>& block, unsigned line);
  template <typename E>
  void Pick(const Array<E>& from, const Tile<T>& block, const Line& line, Array<E>& to) const;

  const LevelShape shape_;
  Tile<T> tiles_;
  unsigned left_ = 0;  // in pixels of the level
  unsigned top_ = 0;
};

VEXG_EXTERN_HIDDEN(TWELVE, LevelWindow);

}  // namespace lumo
