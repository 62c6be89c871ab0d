#pragma once

#include <vector>

#include "foundation/run_controls.h"
#include "fx/region_attribute_histogram.h"
#include "fx/region_attributes.h"
#include "stats/large_stats_accumulator.h"

// Statistics and histograms of each attribute over the regions of a store.

namespace lumo {

/// Sums up an attribute over the regions that are there.
struct AttributeFigures {
  double mean = 0;
  double deviation = 0;  ///< of a sample: divided by n - 1
  double min = 0;
  double max = 0;
  double count = 0;
};

/// Computes the figures of bands by attributes. @return empty, with the fault set, when the store
/// can't be read, and at an abort.
std::vector<AttributeFigures> FindAttributeFigures(RegionAttributesFile<float>& regions,
                                                   const IPC& ipc);

/// Sets the limits of bins: the mean less and plus two deviations, as far as there are values.
/// @param figures  of bands by attributes.
void SetLimits(const std::vector<AttributeFigures>& figures, RegionAttributeHistogram<float>& to);

/// Counts the finite values between the limits. All go into the first bin where a histogram has no
/// extent. @return false, with the fault set, as for FindAttributeFigures.
bool CountAttributes(RegionAttributesFile<float>& regions, RegionAttributeHistogram<float>& to,
                     const IPC& ipc);

}  // namespace lumo
