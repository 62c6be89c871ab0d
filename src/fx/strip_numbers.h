#pragma once

#include <vector>

#include "fx/seamless_watershed.h"
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
/// Threads: FindSegments may be called for several strips at once, Number for one after the other,
///          from the first strip on.
class VEXG_EXPORT SegmentNumbers {
 public:
  /// @param roots  for each basin one that stands for its segment; empty when each is one.
  SegmentNumbers(const SeamlessWatershed& basins, std::vector<std::uint32_t>&& roots,
                 bool bordersOnly);

  /// Makes a tile of a strip whose pixels are one basin for each segment, or of its borders.
  bool FindSegments(unsigned strip, Tile<std::int32_t>& tile) const;
  /// Gives the pixels of the next strip the numbers of their segments.
  void Number(Tile<std::int32_t>& tile);

 private:
  void MarkBorders(unsigned strip, Tile<std::int32_t>& tile) const;
  std::int32_t RootOf(std::int32_t basin) const {
    return roots_.empty() ? basin
                          : static_cast<std::int32_t>(roots_[static_cast<std::size_t>(basin)]);
  }

  const SeamlessWatershed& basins_;
  std::vector<std::uint32_t> roots_;   // by basin
  std::vector<std::int32_t> numbers_;  // by the basin that stands for a segment; 0 for none yet
  std::int32_t count_ = 0;
  bool bordersOnly_;
};

}  // namespace lumo
