#pragma once

#include <vector>

#include "fx/segment_tree.h"

namespace lumo {

/// The segments of a tree at one cost.
struct TreeCut {
  /// By basin the number of its segment: from 1, without gaps, in raster order of first pixels. The
  /// number of basin 0, which stands for pixels without one, is 0.
  std::vector<std::uint32_t> numbers;
  std::uint32_t count = 0;  ///< of segments
};

/// Finds the segments that merging up to a cost leaves: those of all merges in their order, up to
/// the first that costs more, which counts; none unless the cost is above 0. In a nested tree that
/// one does not count: segments are the largest all of whose merges cost no more. False, with the
/// fault set, where the tree can't be read.
VEXG_EXPORT bool CutTree(const SegmentTree& tree, double mergeValue, TreeCut& cut);

/// The same for several costs, in one pass. Segments of one cut lie within those of the next.
/// @param mergeValues  in ascending order.
VEXG_EXPORT bool CutTree(const SegmentTree& tree, const std::vector<double>& mergeValues,
                         std::vector<TreeCut>& cuts);

/// Finds the cost that a percentage of all merges does not exceed; 0 for no merges.
VEXG_EXPORT bool FindMergeValue(const SegmentTree& tree, double percent, double& mergeValue);

/// For each segment of a cut, by its number less 1, the segment of another cut that it lies in.
VEXG_EXPORT std::vector<std::uint32_t> ParentsOf(const TreeCut& cut, const TreeCut& upper);

/// How many pixels each segment of a cut has, by its number less 1.
VEXG_EXPORT std::vector<std::uint64_t> PixelsOf(const TreeCut& cut, const TreeBasins& basins);

}  // namespace lumo
