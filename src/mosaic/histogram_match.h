#pragma once

#include <span>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// The part of all values that lies in each bin and those before it; none for a histogram that has
/// counted nothing.
VEXG_EXPORT std::vector<double> CumulativeDistribution(std::span<const unsigned long long> counts);

/// The distribution that values are matched to, and the values of its first and its last bin.
struct ReferenceDistribution {
  std::vector<double> cumulative;
  double low = 0;
  double high = 0;
};

/// The distribution of the values of a scene, and which values its bins stand for.
struct SceneDistribution {
  std::vector<double> cumulative;
  double low = 0;        ///< of the first bin
  double binSize = 1;    ///< from one to the next
  std::size_t bins = 0;  ///< how many there are, counted or not
};

/// The values that give a scene the distribution of a reference, one for each of its bins
/// (histogram matching; Gonzalez and Woods, Digital Image Processing, section 3.3). Between two
/// bins of the reference the value is the mean of theirs, weighted by the inverse distance.
/// Each bin keeps its own value where one of the two has counted nothing, or the reference has one
/// bin alone.
VEXG_EXPORT std::vector<double> MatchDistributions(const ReferenceDistribution& reference,
                                                   const SceneDistribution& scene);

}  // namespace lumo
