#pragma once

#include "raster/tile.h"
#include "tasks/parallel_ranges.h"

// Parallel loops over the pixels of a tile. Dimension 0 is samples, 1 lines, 2 bands.

namespace lumo {

/// A loop over the samples, lines and bands of a tile, without its borders. A derived class
/// overrides Body(begin0, end0, begin1, end1, begin2, end2).
template <typename T>
class TileParallelFor3 : public ArrayParallelFor3 {
 public:
  /// @param tile  outlives the loop.
  explicit TileParallelFor3(Tile<T>& tile)
      : ArrayParallelFor3(tile.Width(), tile.Height(), tile.Bands()), tile_(&tile) {}

 protected:
  Tile<T>& GetTile() const { return *tile_; }

 private:
  Tile<T>* tile_;
};

/// A reduction over the samples and lines of a tile, without its borders.
template <typename T, typename R>
class TileParallelReduce2 : public ArrayParallelReduce2<R> {
 public:
  /// @param tile  outlives the loop.
  explicit TileParallelReduce2(Tile<T>& tile)
      : ArrayParallelReduce2<R>(tile.Width(), tile.Height()), tile_(&tile) {}

 protected:
  Tile<T>& GetTile() const { return *tile_; }

 private:
  Tile<T>* tile_;
};

/// A loop over the samples and lines of a tile, borders included: it begins at -BorderLeft() and
/// -BorderTop().
template <typename T>
class BorderedTileParallelFor2 : public RangeParallelFor2 {
 public:
  /// @param tile  outlives the loop.
  explicit BorderedTileParallelFor2(Tile<T>& tile)
      : RangeParallelFor2(-static_cast<int>(tile.BorderLeft()),
                          static_cast<int>(tile.Width() + tile.BorderRight()),
                          -static_cast<int>(tile.BorderTop()),
                          static_cast<int>(tile.Height() + tile.BorderBottom())),
        tile_(&tile) {}

 protected:
  Tile<T>& GetTile() const { return *tile_; }

 private:
  Tile<T>* tile_;
};

}  // namespace lumo
