#include "fx/stitch_tasks.h"

#include <algorithm>

#include "fx/task_setup.h"
#include "fx/tile_shape.h"
#include "fx/watershed_task.h"
#include "tasks/task_errors.h"

namespace lumo {
namespace {

/// Takes the labels of a token, and a tile of the same size, states and place for the result.
template <typename T>
bool TakeTiles(const ArgList& args, TilePool<T>& pool, TilePtr<T>& labels, TilePtr<T>& result) {
  labels = TilePtr<T>(args.Get(0));
  if (args.GetCount() < 2 || labels.IsNull() || !labels->IsValid() || labels->Bands() != 1) {
    return false;
  }
  result = pool.Take();
  return SizeLike(*labels, *result);
}

}  // namespace

template <typename T>
RasterTileSegmentStitchTask<T>::RasterTileSegmentStitchTask(ArgList& setup)
    : SequentialTask("RasterTileSegmentStitchTask") {
  unsigned tilesAcross = 0, width = 0, height = 0;
  if (ReadSetup(setup, 0, tilesAcross) && ReadSetup(setup, 1, width) &&
      ReadSetup(setup, 2, height)) {
    stitcher_.emplace(tilesAcross, width, height);
  } else {
    SetErrorState(TaskErrorBadParams());
  }
}

template <typename T>
bool RasterTileSegmentStitchTask<T>::Execute(ArgList& args) {
  if (HasError()) return false;
  TilePtr<T> labels, stitched;
  if (!TakeTiles(args, pool_, labels, stitched)) {
    SetErrorState(TaskErrorBadArgs());
    return false;
  }
  const auto [column, row] = labels->Index();
  stitcher_->Stitch(column, row, labels->Dimensions(), labels->PixelArray().GetData(),
                    FindExcluded(*labels), stitched->PixelArray().GetData());
  return args.Set(1, stitched);
}

template <typename T>
RasterSegmentBorderTask<T>::RasterSegmentBorderTask(ArgList& /*setup*/)
    : StatelessTask("RasterSegmentBorderTask") {}

template <typename T>
bool RasterSegmentBorderTask<T>::Execute(ArgList& args) {
  TilePtr<T> labels, borders;
  if (!TakeTiles(args, pool_, labels, borders)) return false;
  const std::int64_t left = labels->BorderLeft(), top = labels->BorderTop();
  const std::int64_t right = std::int64_t{labels->Width()} + labels->BorderRight();
  const std::int64_t bottom = std::int64_t{labels->Height()} + labels->BorderBottom();
  const T* const values = labels->PixelArray().GetData();
  const unsigned char* const states = std::as_const(*labels).StateArray().GetData();
  // A tile that is one pixel wide or high has no neighbour: the pixel stands for it.
  const auto beside = [](std::int64_t at, std::int64_t end) {
    return std::max<std::int64_t>(at + 1 < end - 1 ? at + 1 : at - 1, 0);
  };
  T* to = borders->PixelArray().GetData();
  for (std::int64_t y = -top; y < bottom; ++y) {
    for (std::int64_t x = -left; x < right; ++x) {
      const std::size_t at = labels->Offset(x, y);
      const auto isAlike = [&](std::size_t other) {
        return values[other] == values[at] && (states[other] != 0) == (states[at] != 0);
      };
      *to++ = isAlike(labels->Offset(beside(x, right), y)) &&
                      isAlike(labels->Offset(x, beside(y, bottom)))
                  ? 0
                  : 1;
    }
  }
  return args.Set(1, borders);
}

template class RasterTileSegmentStitchTask<std::int32_t>;
template class RasterSegmentBorderTask<std::int32_t>;

}  // namespace lumo
