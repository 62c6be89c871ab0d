#pragma once

#include "fx/watershed.h"
#include "raster/raster_tasks.h"
#include "tasks/scratch_pool.h"

namespace lumo {

/// Labels the catchment basins of a tile of levels, borders included; see Watershed. Slot 0 holds
/// the tile, slot 1 receives the labels, with 0 for excluded pixels; they may be one slot.
///
/// Setup arguments: Array<unsigned>, which receives the number of labels of each tile and 1, by
/// row * tiles across + column; Scalar<unsigned>, the tiles across. Exists for int.
template <typename T>
class VEXG_EXPORT RasterTileWatershedTask final : public StatelessTask {
 public:
  explicit RasterTileWatershedTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  Pointer<Array<unsigned>> labelCounts_;
  unsigned tilesAcross_ = 0;
  ScratchPool<Watershed> watersheds_;
  TilePool<T> pool_;
};

/// The states of a tile of one band as a mask of excluded pixels; null where none is.
VEXG_EXPORT const std::uint8_t* FindExcluded(const BasicTile& tile);

}  // namespace lumo
