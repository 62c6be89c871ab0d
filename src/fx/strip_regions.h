#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// Neighbouring pixels of one line that are of one region.
struct LabelRun {
  std::uint32_t first = 0;   ///< column of the first
  std::uint32_t count = 0;   ///< pixels
  std::uint32_t region = 0;  ///< among the regions of the strip
};

/// Lists the regions of some lines of labels as runs of pixels, and numbers the regions from 0 in
/// the order in which they come.
///
///     StripRegions regions;
///     regions.AddLine(labels, states, nullptr, width);
///     for (const LabelRun& run : regions.RunsOf(0)) Use(regions.Labels()[run.region], run);
///
/// Cost: a look into a table for each run that isn't of the region above its first pixel.
/// Threads: one at a time.
class VEXG_EXPORT StripRegions {
 public:
  /// Forgets all lines; memory stays.
  void Clear();

  /// Adds the next line. L is std::int32_t or std::uint32_t.
  /// @param labels  `width` of them.
  /// @param states  a state byte for each; a pixel that isn't valid is in no run.
  /// @param usable  0 for each pixel that is in no run; null when all may be.
  /// @return false at a label below 0, which is then NegativeLabel().
  template <typename L>
  bool AddLine(const L* labels, const unsigned char* states, const unsigned char* usable,
               std::size_t width);

  /// The labels of the regions, by their numbers.
  const std::vector<std::uint32_t>& Labels() const { return labels_; }
  /// The runs of a line, from 0, left to right.
  std::span<const LabelRun> RunsOf(std::size_t line) const {
    const std::size_t begin = line == 0 ? 0 : lineEnds_[line - 1];
    return {runs_.data() + begin, lineEnds_[line] - begin};
  }
  std::size_t LineCount() const { return lineEnds_.size(); }
  std::int32_t NegativeLabel() const { return negative_; }

 private:
  struct Slot {
    std::uint32_t label = 0;
    std::uint32_t number = 0;  // of the region, plus 1; 0 for a free slot
  };

  std::uint32_t NumberOf(std::uint32_t label);
  void Grow();

  std::vector<Slot> slots_;
  std::vector<std::uint32_t> labels_;
  std::vector<LabelRun> runs_;
  std::vector<std::size_t> lineEnds_;
  std::int32_t negative_ = 0;
};

}  // namespace lumo
