#include <cmath>

#include "foundation/fault.h"
#include "fx/attribute_inputs.h"
#include "fx/region_attribute_stats.h"
#include "fx/region_attributes.h"
#include "stats/large_stats_accumulator.h"

namespace lumo {
namespace {

const CommandDeclaration kAttributesStats{
    "FxComputeAttributesStatsCommand",
    "Feature extraction",
    "Computes the statistics of each attribute over all regions of a file.",
    {{"AttributeFXA", Presence::kRequired, ValueKind::kText, "the file of regions"},
     {"StatsFXAS", Presence::kRequired, ValueKind::kText, "the file of statistics to create"}},
    {}};

class FxComputeAttributesStatsCommand final : public RegionCommand {
  CommandResult Execute() override {
    URI from, to;
    if (!CheckInputs() || !TakeOutput("StatsFXAS", to) || !TakeExisting("AttributeFXA", from)) {
      return Fail();
    }
    RegionAttributesFile<float> regions(from, false);
    if (!regions.IsValid()) {
      return Fail("AttributeFXA: " + from.ToUTF8() + " is no file of regions");
    }
    RegionAttributeStatsFile<float> stats(to, regions.Bands(), regions.Attributes());
    const bool isDone = stats.IsValid() && Accumulate(regions) && Store(stats) && stats.Close();
    return isDone ? Succeed() : FailWithout("the statistics can't be written", RegionSums::kExact);
  }

  bool Accumulate(RegionAttributesFile<float>& regions) {
    accumulators_.resize(std::size_t{regions.Bands()} * regions.Attributes());
    const unsigned count = regions.RegionCount();
    for (unsigned region = 0; region < count; ++region) {
      if (region % 1024 == 0) {
        if (GetIPC().abort->IsSet()) {
          SetFault("the statistics were aborted");
          return false;
        }
        GetIPC().progress->Update(static_cast<double>(region) / count);
      }
      auto accumulator = accumulators_.begin();
      for (unsigned band = 0; band < regions.Bands(); ++band) {
        if (!regions.RegionExists(region, band)) {
          accumulator += regions.Attributes();
          continue;
        }
        for (unsigned i = 0; i < regions.Attributes(); ++i) {
          (accumulator++)->Add(std::as_const(regions).Value(region, band, i));
        }
      }
    }
    return regions.IsValid();
  }

  bool Store(RegionAttributeStatsFile<float>& stats) const {
    auto from = accumulators_.begin();
    for (unsigned band = 0; band < stats.Bands(); ++band) {
      for (unsigned i = 0; i < stats.Attributes(); ++i, ++from) {
        const bool isEmpty = from->count == 0;
        const double variance =
            from->count > 1 ? from->s / (static_cast<double>(from->count) - 1) : 0;
        stats.Mean(band, i) = static_cast<float>(from->mean);
        stats.StdDev(band, i) = static_cast<float>(std::sqrt(variance));
        stats.Min(band, i) = isEmpty ? 0 : from->min;
        stats.Max(band, i) = isEmpty ? 0 : from->max;
        stats.Count(band, i) = static_cast<float>(from->count);
      }
    }
    return stats.IsValid();
  }

  std::vector<LargeStatsAccumulator<float>> accumulators_;  // bands by attributes
};

const CommandFactoryT<FxComputeAttributesStatsCommand> factory(kAttributesStats);

}  // namespace
}  // namespace lumo
