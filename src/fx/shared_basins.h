#pragma once

#include <optional>

#include "fx/basin_labels.h"
#include "fx/shared_seams.h"

namespace lumo {

/// Puts labels into sections, some lines in each, in front of others.
VEXG_EXPORT void PutLabels(ShareWriter& to, const std::int32_t* labels, std::uint32_t width,
                           std::uint32_t lines);
/// How many sections that are.
VEXG_EXPORT std::uint64_t SectionsOfLabels(std::uint32_t width, std::uint32_t lines);

/// Gives the labels of basins that shares have found, in strips of any height. The files of the
/// shares stay where they are: labels are read from there when they are asked for.
class VEXG_EXPORT SharedBasins final : public BasinLabels {
 public:
  /// @param stripLines  of the strips that are asked for.
  /// @return false, with the fault set, for files that don't hold this.
  bool Open(const SegmentShares& shares, const ShareCut& cut, std::uint32_t stripLines,
            bool isRanked);

  const SegmentShares& Shares() const { return *shares_; }
  const ShareCut& Cut() const { return cut_; }

  unsigned Strips() const override { return (cut_.height - 1) / stripLines_ + 1; }
  std::uint32_t LinesOf(unsigned strip) const override;
  std::uint32_t Width() const override { return cut_.width; }
  std::uint32_t Count() const override { return seams_.Numbers().Count(); }
  std::vector<std::uint32_t> TakeRanks() override { return seams_.TakeRanks(); }
  bool MarkSeamBasins(std::vector<bool>& marks) const override {
    marks = seams_.MarkSeamBasins();
    return true;
  }
  bool Label(unsigned strip, std::int32_t* labels) const override {
    return ReadLines(FirstLineOf(strip), LinesOf(strip), labels);
  }
  bool ReadLabelsAbove(unsigned strip, std::vector<std::int32_t>& line) const override;
  bool ReadLabelsBelow(unsigned strip, std::vector<std::int32_t>& line) const override;

 private:
  std::uint32_t FirstLineOf(unsigned strip) const { return strip * stripLines_; }
  bool ReadLines(std::uint32_t first, std::uint32_t lines, std::int32_t* labels) const;

  std::optional<SegmentShares> shares_;
  ShareCut cut_;
  std::uint32_t stripLines_ = 1;
  SharedSeams seams_;
};

}  // namespace lumo
