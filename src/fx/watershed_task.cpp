#include "fx/watershed_task.h"

#include "fx/task_setup.h"
#include "fx/tile_shape.h"
#include "raster/pixel_states.h"
#include "tasks/task_errors.h"

namespace lumo {

const std::uint8_t* FindExcluded(const BasicTile& tile) {
  const Array<unsigned char>& states = tile.StateArray();
  return AllValid(states.GetData(), states.GetCount()) ? nullptr : states.GetData();
}

template <typename T>
RasterTileWatershedTask<T>::RasterTileWatershedTask(ArgList& setup)
    : StatelessTask("RasterTileWatershedTask"), labelCounts_(FindSetupArray<unsigned>(setup, 0)) {
  if (labelCounts_.IsNull() || !ReadSetup(setup, 1, tilesAcross_)) {
    SetErrorState(TaskErrorBadParams());
  }
}

template <typename T>
bool RasterTileWatershedTask<T>::Execute(ArgList& args) {
  const TilePtr<T> levels(args.Get(0));
  if (args.GetCount() < 2 || levels.IsNull() || !levels->IsValid() || levels->Bands() != 1) {
    return false;
  }
  const auto [column, row] = levels->Index();
  const std::size_t tile = std::size_t{row} * tilesAcross_ + column;
  const TilePtr<T> labels = pool_.Take();
  if (tile >= labelCounts_->GetCount() || !SizeLike(*levels, *labels)) return false;
  (*labelCounts_)[tile] =
      1 + watersheds_.Borrow()->Label(levels->PixelArray().GetData(), FindExcluded(*levels),
                                      static_cast<std::uint32_t>(levels->FullWidth()),
                                      static_cast<std::uint32_t>(levels->FullHeight()),
                                      labels->PixelArray().GetData(), GetAbortFlag());
  return args.Set(1, labels);
}

template class RasterTileWatershedTask<std::int32_t>;

}  // namespace lumo
