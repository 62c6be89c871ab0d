#pragma once

#include <vector>

#include "fx/segment_tree.h"

namespace lumo {

/// The segments of a tree at one cost, in numbers.
struct ScaleLevel {
  double mergeValue = 0;
  std::uint64_t segments = 0;
  /// Local variance: the mean over all segments of the standard deviation of a segment's values
  /// from the means of their bands.
  double localVariance = 0;
  /// The change of the local variance from the level before, in percent of it; 0 for the first.
  double rate = 0;
  /// How far the rate falls on both sides of a peak before it rises above it, or ends; 0 where
  /// there is no peak.
  double prominence = 0;
  /// The cost of the lowest rate in front of a peak, since the rate was last higher: the last at
  /// which hardly any objects of the peak have merged with others.
  double onset = 0;
};

/// Finds how local variance grows with scale (Drăguţ, Tiede and Levick, ESP: a tool to estimate
/// scale parameter for multiresolution image segmentation of remotely sensed data, 2010), in one
/// pass over the tree. While segments grow within objects it grows slowly; where objects of one
/// size begin to merge with others it grows fast. So peaks of its rate tell costs at which objects
/// of some size are whole.
///
/// Levels go up by a quarter of an octave, since costs go over many orders of magnitude: from the
/// first cost above 0 to the last. A peak needs ten segments, or the mean is one of chance.
/// False, with the fault set, where the tree can't be read.
VEXG_EXPORT bool FindScales(const SegmentTree& tree, std::vector<ScaleLevel>& levels);

/// The levels of peaks whose prominence is a share of the highest at least, the highest first.
VEXG_EXPORT std::vector<ScaleLevel> PeaksOf(const std::vector<ScaleLevel>& levels, double share);

}  // namespace lumo
