#include <algorithm>
#include <cmath>

#include "foundation/fault.h"
#include "fx/attribute_inputs.h"
#include "fx/region_attribute_histogram.h"
#include "fx/region_attribute_stats.h"
#include "fx/region_attributes.h"

namespace lumo {
namespace {

const CommandDeclaration kAttributesHistogram{
    "FxComputeAttributesHistogramCommand",
    "Feature extraction",
    "Computes a histogram of each attribute over all regions of a file.",
    {{"AttributeFXA", Presence::kRequired, ValueKind::kText, "the file of regions"},
     {"StatsFXAS", Presence::kRequired, ValueKind::kText, "its statistics"},
     {"HistogramFXAH", Presence::kRequired, ValueKind::kText,
      "the file of histograms to create: 256 bins between the mean less and the mean plus two "
      "deviations, as far as there are values"}},
    {}};

using Histograms = RegionAttributeHistogram<float>;

class FxComputeAttributesHistogramCommand final : public RegionCommand {
  CommandResult Execute() override {
    URI from, statsFrom, to;
    if (!CheckInputs() || !TakeOutput("HistogramFXAH", to) || !TakeExisting("AttributeFXA", from) ||
        !TakeExisting("StatsFXAS", statsFrom)) {
      return Fail();
    }
    RegionAttributesFile<float> regions(from, false);
    if (!regions.IsValid()) {
      return Fail("AttributeFXA: " + from.ToUTF8() + " is no file of regions");
    }
    const RegionAttributeStatsFile<float> stats(statsFrom);
    if (!stats.IsValid()) {
      return Fail("StatsFXAS: " + statsFrom.ToUTF8() + " is no file of statistics");
    }
    const unsigned bands = regions.Bands(), attributes = regions.Attributes();
    if (stats.Bands() < bands || stats.Attributes() < attributes) {
      return Fail(
          "StatsFXAS: there are statistics of fewer bands or attributes than the regions "
          "have");
    }
    RegionAttributeHistogramMap<float> counts(bands, attributes,
                                              RegionAttributeHistogramFile<float>::kBins);
    if (!counts.IsValid()) return Fail("there is no memory for the histograms");
    SetLimits(stats, counts);
    RegionAttributeHistogramFile<float> file(to, bands, attributes);
    const bool isDone =
        file.IsValid() && Count(regions, counts) && Copy(counts, file) && file.Close();
    return isDone ? Succeed() : FailWithout("the histograms can't be written", RegionSums::kExact);
  }

  static void SetLimits(const RegionAttributeStatsFile<float>& stats, Histograms& to) {
    for (unsigned band = 0; band < to.Bands(); ++band) {
      for (unsigned i = 0; i < to.Attributes(); ++i) {
        const double mean = stats.Mean(band, i), deviation = stats.StdDev(band, i);
        const double min = stats.Min(band, i), max = stats.Max(band, i);
        to.LowerLimit(band, i) = static_cast<float>(std::max(mean - 2 * deviation, min));
        to.UpperLimit(band, i) = static_cast<float>(std::min(mean + 2 * deviation, max));
      }
    }
  }

  bool Count(RegionAttributesFile<float>& regions, Histograms& to) {
    const unsigned count = regions.RegionCount();
    for (unsigned region = 0; region < count; ++region) {
      if (region % 1024 == 0) {
        if (GetIPC().abort->IsSet()) {
          SetFault("the histograms were aborted");
          return false;
        }
        GetIPC().progress->Update(static_cast<double>(region) / count);
      }
      for (unsigned band = 0; band < regions.Bands(); ++band) {
        if (!regions.RegionExists(region, band)) continue;
        for (unsigned i = 0; i < regions.Attributes(); ++i) {
          CountValue(std::as_const(regions).Value(region, band, i), band, i, to);
        }
      }
    }
    return regions.IsValid();
  }

  static void CountValue(float value, unsigned band, unsigned attribute, Histograms& to) {
    const float lower = to.LowerLimit(band, attribute);
    if (!std::isfinite(value) || value < lower || value > to.UpperLimit(band, attribute)) return;
    const double last = to.Bins() - 1;
    const double size =
        (static_cast<double>(to.UpperLimit(band, attribute)) - static_cast<double>(lower)) / last;
    const double bin = size > 0 ? std::floor((static_cast<double>(value) - lower) / size) : 0;
    ++to.Count(band, attribute, static_cast<unsigned>(std::clamp(bin, 0.0, last)));
  }

  static bool Copy(const Histograms& from, RegionAttributeHistogramFile<float>& to) {
    for (unsigned band = 0; band < from.Bands(); ++band) {
      for (unsigned i = 0; i < from.Attributes(); ++i) {
        to.LowerLimit(band, i) = from.LowerLimit(band, i);
        to.UpperLimit(band, i) = from.UpperLimit(band, i);
        for (unsigned bin = 0; bin < from.Bins(); ++bin) {
          to.Count(band, i, bin) = from.Count(band, i, bin);
        }
      }
    }
    return to.IsValid();
  }
};

const CommandFactoryT<FxComputeAttributesHistogramCommand> factory(kAttributesHistogram);

}  // namespace
}  // namespace lumo
