#pragma once

#include <vector>

#include "fx/basin_labels.h"
#include "fx/label_forest.h"
#include "raster/raster_tasks.h"

namespace lumo {

/// The first stage of a process that reads no raster: gives the numbers 0, 1, ... as
/// Scalar<unsigned> in slot 0. Setup argument: Scalar<unsigned>, how many.
class VEXG_EXPORT StripNumberTask final : public SequentialTask {
 public:
  explicit StripNumberTask(ArgList& setup);
  bool Execute(ArgList& args) override;

 private:
  unsigned count_ = 0;
  unsigned next_ = 0;
};

/// Makes the labels of strips out of the basins of a watershed: a number for each segment, from 1
/// in raster order of their first pixels; or an image of the borders between segments, where each
/// pixel is compared with those on its right and below, the last but one column and line with those
/// in front (see RasterSegmentBorderTask).
///
/// Threads: FindBasins may be called for several strips at once, Number for one after the other,
///          from the first strip on.
class VEXG_EXPORT SegmentNumbers {
 public:
  /// @param forest  what basins have become; outlives this.
  /// @param joined  what the numbers of that have become in turn, each of which is given already;
  ///                null for themselves.
  SegmentNumbers(const BasinLabels& basins, LabelForest& forest, LabelForest* joined,
                 bool bordersOnly)
      : basins_(basins), forest_(forest), joined_(joined), bordersOnly_(bordersOnly) {}

  /// Makes a tile of a strip whose pixels are basins.
  bool FindBasins(unsigned strip, Tile<std::int32_t>& tile) const;
  /// Gives the pixels of the next strip the numbers of their segments, or marks borders of these.
  /// False, with the fault set, when the forest is not well or labels can't be read.
  bool Number(Tile<std::int32_t>& tile);

 private:
  void FindRoots(std::int32_t* labels, std::size_t count);
  bool MarkBorders(Tile<std::int32_t>& tile);

  const BasinLabels& basins_;
  LabelForest& forest_;
  LabelForest* joined_;
  bool bordersOnly_;
};

}  // namespace lumo
