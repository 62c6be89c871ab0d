#pragma once

#include <cstdint>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// A share, and the bounds between which it lies with a probability of 95 % (Wilson, Probable
/// inference, 1927). All NaN where nothing was counted.
struct ShareEstimate {
  double share = 0;
  double low = 0;
  double high = 0;
};

/// Estimates a share. @param all  how many were counted, `hits` of which count for it.
VEXG_EXPORT ShareEstimate EstimateShare(std::uint64_t hits, std::uint64_t all);

/// How well a map agrees with samples of known classes (Congalton, A review of assessing the
/// accuracy of classifications of remotely sensed data, 1991).
struct VEXG_EXPORT Accuracy {
  ShareEstimate overall;  ///< samples whose class the map has
  double kappa = 0;       ///< agreement beyond chance (Cohen, 1960); NaN for one class
  std::vector<ShareEstimate> producer;  ///< for each class, of its samples those that the map has
  std::vector<ShareEstimate> user;      ///< of the samples on it in the map those that are of it
  std::vector<double> f1;               ///< harmonic mean of both; NaN where neither counts

  /// @param matrix  counts of samples, a row for each class that is known, a column for each class
  ///                of the map.
  /// @param classes  of both.
  static Accuracy Of(const std::vector<std::uint64_t>& matrix, std::size_t classes);
};

}  // namespace lumo
