#pragma once

#include <cstdint>
#include <vector>

#include "fx/local_merge.h"
#include "fx/segment_tree.h"

namespace lumo {

/// Gathers the merges in rounds of a whole raster for a nested tree (TreeScene::isNested).
///
/// A merge counts in a cut when it and all merges of the segment before cost no more. So merges go
/// into the tree by the most that any of these costs; of equal ones by rounds, and in a round by
/// labels: in the same order whatever the order in which segments went through their rounds.
///
/// Memory: BytesOfBasin for each basin. Threads: one at a time.
class VEXG_EXPORT LocalTree final : public LocalMerge::Listener {
 public:
  /// @param basins   how many there are.
  /// @param squares  by basin the sum of the squares of its values, which the sum of the squares
  ///                 of their means is taken from when it is whole; outlives this.
  LocalTree(std::uint32_t basins, std::uint32_t bands, std::vector<double>& squares);

  void OnSegment(std::uint32_t label, const MergeSide& segment) override;
  void OnJoin(const LocalMerge::Join& join) override;

  /// The pixels of a basin.
  std::uint32_t PixelsOf(std::uint32_t label) const { return pixels_[label]; }
  /// Puts all merges into a tree, whose basins are numbered by `numbers`. False, with the fault
  /// set, where it can't be written.
  bool Put(const std::vector<std::uint32_t>& numbers, SegmentTreeWriter& tree);

  /// The bytes that a basin takes, with its squares and its number.
  static constexpr std::size_t BytesOfBasin() {
    return sizeof(Kept) + 2 * sizeof(double) + 2 * sizeof(std::uint32_t);
  }

 private:
  struct Kept {
    double most;  // of the costs of all merges of the segment
    LocalMerge::Join join;
  };

  std::uint32_t bands_;
  std::vector<double>& squares_;
  std::vector<std::uint32_t> pixels_;  // by basin
  std::vector<double> most_;           // by basin, of the segment that it stands for
  std::vector<Kept> kept_;
};

}  // namespace lumo
