#pragma once

#include <optional>

#include "fx/tile_stitcher.h"
#include "raster/raster_tasks.h"

// The stages that make the labels of tiles into an image. Slot 0 holds a tile of labels, slot 1
// receives a new one; they may be one slot.

namespace lumo {

/// Makes the labels of all tiles one numbering, see TileStitcher. Tiles come in raster order. Setup
/// arguments: three Scalar<unsigned>, the tiles across, and the width and height of a tile. Exists
/// for int.
template <typename T>
class VEXG_EXPORT RasterTileSegmentStitchTask final : public SequentialTask {
 public:
  explicit RasterTileSegmentStitchTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  std::optional<TileStitcher> stitcher_;
  TilePool<T> pool_;
};

/// Makes an image of the borders between segments: 1 where the label or the exclusion of a pixel
/// differs from that of its right or its lower neighbour, else 0. The last but one column and row
/// of a tile compare with those in front. Exists for int.
template <typename T>
class VEXG_EXPORT RasterSegmentBorderTask final : public StatelessTask {
 public:
  explicit RasterSegmentBorderTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  TilePool<T> pool_;
};

}  // namespace lumo
