#pragma once

#include <utility>
#include <vector>

#include "fx/seam_zone.h"
#include "fx/segment_shares.h"
#include "fx/strip_ways.h"

namespace lumo {

/// Reads what the first round of shares has found at their edges, and settles it (SettleSeams).
VEXG_EXPORT bool ReadSettledSeams(const SegmentShares& shares, const ShareCut& cut,
                                  std::vector<SeamStrip>& strips);
/// Puts what a share shows of its edges.
VEXG_EXPORT void PutSeams(ShareWriter& to, const SeamStrip& strip);

/// Holds the ways of a share, and what connecting them with those of others takes.
struct ShareWays {
  StripWays ways;
  std::vector<std::uint8_t> isFirstFar, isLastFar;  ///< no lower ground is reached from there
  std::vector<std::int32_t> levels;                 ///< of the minima, where they are ranked
};
VEXG_EXPORT void PutWays(ShareWriter& to, const ShareWays& ways);

/// Connects the basins of all shares at their edges, by the files of the second round, as
/// SeamlessWatershed does with strips.
///
/// Memory: 16 bytes for each pixel of a line for each share, and where minima are ranked 20 for
/// each of them. Failure: false, with the fault set.
class VEXG_EXPORT SharedSeams {
 public:
  bool Read(const SegmentShares& shares, const ShareCut& cut, bool isRanked);

  const MinimumNumbers& Numbers() const { return numbers_; }
  std::vector<std::uint32_t> TakeRanks() { return std::move(ranks_); }
  /// Marks the basins, by label, that have pixels in the first line of a share, but for the first.
  std::vector<bool> MarkSeamBasins() const;
  /// The labels of the line above a share, and below it; null where there is none.
  const std::int32_t* LabelsAbove(unsigned share) const {
    return share == 0 ? nullptr : last_[share - 1].data();
  }
  const std::int32_t* LabelsBelow(unsigned share) const {
    return share + 1 < first_.size() ? first_[share + 1].data() : nullptr;
  }

 private:
  bool Number(const std::vector<ShareWays>& ways);
  std::int32_t Follow(const std::vector<ShareWays>& ways, unsigned share, std::int32_t label) const;

  std::uint32_t width_ = 0;
  MinimumNumbers numbers_;
  std::vector<std::uint32_t> ranks_;
  std::vector<std::vector<std::int32_t>> first_, last_;  // labels of these lines, by share
};

}  // namespace lumo
