#include "fx/local_tree.h"

#include <algorithm>
#include <tuple>

namespace lumo {

LocalTree::LocalTree(std::uint32_t basins, std::uint32_t bands, std::vector<double>& squares)
    : bands_(bands),
      squares_(squares),
      pixels_(std::size_t{basins} + 1),
      most_(std::size_t{basins} + 1) {
  kept_.reserve(basins);
}

void LocalTree::OnSegment(std::uint32_t label, const MergeSide& segment) {
  pixels_[label] = static_cast<std::uint32_t>(segment.pixels);
  double& squares = squares_[label];
  for (std::uint32_t band = 0; band < bands_; ++band) {
    squares -= segment.pixels * segment.means[band] * segment.means[band];
  }
}

void LocalTree::OnJoin(const LocalMerge::Join& join) {
  double& most = most_[join.lower];
  most = std::max({most, most_[join.higher], join.cost});
  kept_.push_back({most, join});
}

bool LocalTree::Put(const std::vector<std::uint32_t>& numbers, SegmentTreeWriter& tree) {
  std::sort(kept_.begin(), kept_.end(), [](const Kept& a, const Kept& b) {
    return std::tie(a.most, a.join.round, a.join.lower) <
           std::tie(b.most, b.join.round, b.join.lower);
  });
  return std::all_of(kept_.begin(), kept_.end(), [&](const Kept& kept) {
    const LocalMerge::Join& join = kept.join;
    return tree.AddMerge({join.cost, numbers[join.lower], numbers[join.higher], join.border});
  });
}

}  // namespace lumo
