#include "fx/tree_cut.h"

#include <algorithm>
#include <cmath>
#include <numeric>

#include "foundation/fault.h"

namespace lumo {
namespace {

/// The basins that stand for segments while merges are done.
class Forest {
 public:
  explicit Forest(std::uint32_t basins) : parents_(std::size_t{basins} + 1) {
    std::iota(parents_.begin(), parents_.end(), 0U);
  }

  /// False where one of both does not stand for a segment.
  bool Join(const TreeMerge& merge) {
    if (parents_[merge.lower] != merge.lower || parents_[merge.higher] != merge.higher) {
      return false;
    }
    parents_[merge.higher] = merge.lower;
    return true;
  }

  TreeCut Cut() {
    TreeCut cut;
    cut.numbers.assign(parents_.size(), 0);
    for (std::uint32_t basin = 1; basin < parents_.size(); ++basin) {
      const std::uint32_t root = RootOf(basin);
      if (cut.numbers[root] == 0) cut.numbers[root] = ++cut.count;
      cut.numbers[basin] = cut.numbers[root];
    }
    return cut;
  }

 private:
  std::uint32_t RootOf(std::uint32_t basin) {
    while (parents_[basin] != basin) basin = parents_[basin] = parents_[parents_[basin]];
    return basin;
  }

  std::vector<std::uint32_t> parents_;
};

}  // namespace

bool CutTree(const SegmentTree& tree, const std::vector<double>& mergeValues,
             std::vector<TreeCut>& cuts) {
  cuts.clear();
  Forest forest(tree.Basins());
  const auto isNext = [&] { return cuts.size() < mergeValues.size(); };
  while (isNext() && !(mergeValues[cuts.size()] > 0)) cuts.push_back(forest.Cut());
  bool isWell = true;
  const auto cutBelow = [&](double cost) {
    while (isNext() && cost > mergeValues[cuts.size()]) cuts.push_back(forest.Cut());
  };
  const bool isNested = tree.Scene().isNested;
  const auto join = [&](const TreeMerge& merge) {
    if (isNested) cutBelow(merge.cost);
    if (!isNext()) return false;
    isWell = forest.Join(merge);
    if (isWell && !isNested) cutBelow(merge.cost);
    return isWell && isNext();
  };
  if (isNext() && !tree.ForEachMerge(join)) return false;
  if (!isWell) {
    SetFault(String(tree.Path() + ": the tree of segments merges one that is merged already"));
    return false;
  }
  while (isNext()) cuts.push_back(forest.Cut());
  return true;
}

bool CutTree(const SegmentTree& tree, double mergeValue, TreeCut& cut) {
  std::vector<TreeCut> cuts;
  if (!CutTree(tree, std::vector{mergeValue}, cuts)) return false;
  cut = std::move(cuts.front());
  return true;
}

bool FindMergeValue(const SegmentTree& tree, double percent, double& mergeValue) {
  std::vector<double> costs;
  costs.reserve(tree.Merges());
  double most = 0;
  const bool isRead = tree.ForEachMerge([&](const TreeMerge& merge) {
    most = std::max(most, merge.cost);
    costs.push_back(tree.Scene().isNested ? most : merge.cost);
    return true;
  });
  if (!isRead) return false;
  const double wanted = std::ceil(percent / 100 * static_cast<double>(costs.size()));
  const auto count = std::min(static_cast<std::size_t>(std::max(wanted, 0.0)), costs.size());
  mergeValue = 0;
  if (count == 0) return true;
  const auto last = costs.begin() + static_cast<std::ptrdiff_t>(count) - 1;
  std::nth_element(costs.begin(), last, costs.end());
  mergeValue = std::max(*last, std::numeric_limits<double>::min());  // 0 would be no merging
  return true;
}

std::vector<std::uint32_t> ParentsOf(const TreeCut& cut, const TreeCut& upper) {
  std::vector<std::uint32_t> parents(cut.count);
  for (std::size_t basin = 1; basin < cut.numbers.size(); ++basin) {
    parents[cut.numbers[basin] - 1] = upper.numbers[basin];
  }
  return parents;
}

std::vector<std::uint64_t> PixelsOf(const TreeCut& cut, const TreeBasins& basins) {
  std::vector<std::uint64_t> pixels(cut.count);
  for (std::size_t basin = 1; basin < cut.numbers.size(); ++basin) {
    pixels[cut.numbers[basin] - 1] += basins.pixels[basin - 1];
  }
  return pixels;
}

}  // namespace lumo
