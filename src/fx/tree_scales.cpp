#include "fx/tree_scales.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include "foundation/fault.h"

namespace lumo {
namespace {

constexpr double kStepsPerOctave = 4;
constexpr std::uint64_t kFewest = 10;  // segments at a peak

double CostOfLevel(std::int64_t number) {
  return std::exp2(static_cast<double>(number) / kStepsPerOctave);
}

/// The deviations of segments while they merge.
class Deviations {
 public:
  Deviations(TreeBasins&& basins, const TreeScene& scene)
      : basins_(std::move(basins)),
        bands_(scene.bands),
        borderPower_(1 + scene.compactness),
        count_(basins_.pixels.size()) {
    for (std::size_t i = 0; i < basins_.pixels.size(); ++i) sum_ += Of(i);
  }

  /// False where one of both stands for no segment.
  bool Join(const TreeMerge& merge) {
    const std::size_t to = merge.lower - 1, from = merge.higher - 1;
    if (basins_.pixels[to] == 0 || basins_.pixels[from] == 0) return false;
    sum_ -= Of(to) + Of(from);
    // a b / (a + b) |u - v|^2, by which the squares of both grow, is the cost times the border.
    basins_.squares[to] +=
        basins_.squares[from] + merge.cost * std::pow(merge.border, borderPower_);
    basins_.pixels[to] += basins_.pixels[from];
    basins_.pixels[from] = 0;
    sum_ += Of(to);
    --count_;
    return true;
  }

  std::uint64_t Count() const { return count_; }
  double Mean() const {
    return count_ == 0 ? 0 : std::max(sum_, 0.0) / static_cast<double>(count_);
  }

 private:
  double Of(std::size_t basin) const {
    return std::sqrt(basins_.squares[basin] /
                     (static_cast<double>(basins_.pixels[basin]) * bands_));
  }

  TreeBasins basins_;  // no pixels: stands for no segment
  double bands_;
  double borderPower_;
  double sum_ = 0;
  std::uint64_t count_;
};

bool IsPeak(const std::vector<ScaleLevel>& levels, std::size_t at) {
  return at > 0 && levels[at].segments >= kFewest && levels[at].rate > 0 &&
         levels[at].rate > levels[at - 1].rate &&
         (at + 1 == levels.size() || levels[at].rate >= levels[at + 1].rate);
}

/// The level of the lowest rate from one on, before one has a higher rate than a peak. The first of
/// equal ones.
template <typename Iterator>
Iterator FindLowest(double peak, Iterator at, Iterator end) {
  Iterator lowest = at;
  for (; at != end && !(at->rate > peak); ++at) {
    if (at->rate < lowest->rate) lowest = at;
  }
  return lowest;
}

void FindRates(std::vector<ScaleLevel>& levels) {
  for (std::size_t i = 1; i < levels.size(); ++i) {
    const double before = levels[i - 1].localVariance;
    constexpr double kPercent = 100;
    levels[i].rate = before > 0 ? (levels[i].localVariance - before) / before * kPercent : 0;
  }
  for (std::size_t i = 0; i < levels.size(); ++i) {
    if (!IsPeak(levels, i)) continue;
    const auto at = levels.begin() + static_cast<std::ptrdiff_t>(i);
    // Both begin at the peak itself: nothing lower may lie on one side.
    const auto after = FindLowest(at->rate, at, levels.end());
    const auto before = FindLowest(at->rate, std::reverse_iterator(at + 1), levels.rend());
    at->prominence = at->rate - std::max(before->rate, after->rate);
    at->onset = before->mergeValue;
  }
}

}  // namespace

bool FindScales(const SegmentTree& tree, std::vector<ScaleLevel>& levels) {
  levels.clear();
  TreeBasins basins;
  if (!tree.ReadBasins(basins)) return false;
  Deviations deviations(std::move(basins), tree.Scene());
  std::int64_t next = 0;
  bool isWell = true;
  const auto note = [&] {
    levels.push_back({CostOfLevel(next++), deviations.Count(), deviations.Mean(), 0, 0, 0});
  };
  const bool isNested = tree.Scene().isNested;
  const auto noteBelow = [&](double cost) {
    if (cost == 0) return;
    if (levels.empty()) {
      next = static_cast<std::int64_t>(std::ceil(std::log2(cost) * kStepsPerOctave)) - 1;
    }
    while (cost > CostOfLevel(next)) note();
  };
  const bool isRead = tree.ForEachMerge([&](const TreeMerge& merge) {
    isWell = merge.cost >= 0 && std::isfinite(merge.cost);
    if (isWell && isNested) noteBelow(merge.cost);
    isWell = isWell && deviations.Join(merge);
    if (isWell && !isNested) noteBelow(merge.cost);
    return isWell;
  });
  if (!isRead) return false;
  if (!isWell) {
    SetFault(String(tree.Path() + ": the tree of segments merges one that is merged already"));
    return false;
  }
  if (!levels.empty()) note();
  FindRates(levels);
  return true;
}

std::vector<ScaleLevel> PeaksOf(const std::vector<ScaleLevel>& levels, double share) {
  std::vector<ScaleLevel> peaks;
  for (const ScaleLevel& level : levels) {
    if (level.prominence > 0) peaks.push_back(level);
  }
  std::stable_sort(peaks.begin(), peaks.end(), [](const ScaleLevel& a, const ScaleLevel& b) {
    return a.prominence > b.prominence;
  });
  const auto isLow = [&](const ScaleLevel& level) {
    return level.prominence < share * peaks.front().prominence;
  };
  while (!peaks.empty() && isLow(peaks.back())) peaks.pop_back();
  return peaks;
}

}  // namespace lumo
