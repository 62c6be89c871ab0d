#pragma once

#include <cstddef>
#include <cstdint>
#include <utility>
#include <vector>

#include "raster/tile_dimensions.h"

namespace lumo {

/// Makes the labels of overlapping tiles one numbering of the whole raster. A segment of a tile
/// takes the label of the segment of an earlier tile with which it shares the most pixels of the
/// common column at the left or the common row above; of two with equally many, that of the lower
/// label. A segment that shares none gets the next free label. Labels that were given stay, so two
/// earlier segments are never joined.
///
/// Tiles come row by row, from left to right, and overlap by a border on their right and lower
/// sides, except at the edges of the raster.
///
/// Threads: one at a time.
class VEXG_EXPORT TileStitcher {
 public:
  /// @param tilesAcross  of the raster.
  /// @param width        of a tile without borders, at most.
  /// @param height       of a tile without borders, at most.
  TileStitcher(std::uint32_t tilesAcross, std::uint32_t width, std::uint32_t height);

  /// Relabels the next tile.
  /// @param column     of the tile in the grid of tiles; `row` likewise.
  /// @param shape      of the tile, with the borders that it has.
  /// @param labels     of all pixels, borders included; 0 for none.
  /// @param excluded   not 0 for each pixel that takes no part; null when all do.
  /// @param stitched   [out] of the same shape: the labels of the pixels inside the borders, and of
  ///                   the first column and row of the right and lower borders; 0 elsewhere.
  void Stitch(std::uint32_t column, std::uint32_t row, const TileDimensions& shape,
              const std::int32_t* labels, const std::uint8_t* excluded, std::int32_t* stitched);

  /// How many labels were given.
  std::uint32_t LabelCount() const { return given_; }

 private:
  /// The new label of one of the tile's.
  struct Target {
    std::int32_t label = 0;    ///< 0: to be given
    std::uint32_t shared = 0;  ///< pixels that it shares with that label
    bool isThere = false;      ///< the tile has such pixels
  };

  void MatchSeam();

  std::uint32_t width_;
  std::uint32_t given_ = 0;
  std::vector<std::int32_t> column_;                         // the last of the tile at the left
  std::vector<std::int32_t> rows_;                           // of the tiles above
  std::vector<Target> targets_;                              // by label of the tile
  std::vector<std::pair<std::int32_t, std::int32_t>> seam_;  // label here, label there
};

}  // namespace lumo
