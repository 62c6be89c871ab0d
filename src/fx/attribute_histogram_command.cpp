#include "commands/division.h"
#include "foundation/fault.h"
#include "fx/attribute_inputs.h"
#include "fx/attribute_statistics.h"
#include "fx/region_attribute_stats.h"

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
      return Fail(String("AttributeFXA: " + from.ToUTF8() + " is no file of regions"));
    }
    const RegionAttributeStatsFile<float> stats(statsFrom);
    if (!stats.IsValid()) {
      return Fail(String("StatsFXAS: " + statsFrom.ToUTF8() + " is no file of statistics"));
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
    SetLimits(FiguresOf(stats, counts), counts);
    RegionAttributeHistogramFile<float> file(to, bands, attributes);
    if (!file.IsValid()) return Fail();
    NoteCreated(to);
    const bool isDone =
        CountAttributes(regions, counts, GetIPC()) && Copy(counts, file) && file.Close();
    return isDone ? Succeed() : FailWithout("the histograms can't be written", Form::kExact);
  }

  /// The statistics of the pairs that the histograms have.
  static std::vector<AttributeFigures> FiguresOf(const RegionAttributeStatsFile<float>& stats,
                                                 const Histograms& histograms) {
    std::vector<AttributeFigures> figures;
    for (unsigned band = 0; band < histograms.Bands(); ++band) {
      for (unsigned i = 0; i < histograms.Attributes(); ++i) {
        figures.push_back({stats.Mean(band, i), stats.StdDev(band, i), stats.Min(band, i),
                           stats.Max(band, i), stats.Count(band, i)});
      }
    }
    return figures;
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

const CommandFactoryT<FxComputeAttributesHistogramCommand> fxComputeAttributesHistogramFactory(
    kAttributesHistogram);
const DivisionRegistration fxComputeAttributesHistogramDivision(
    {.command = "FxComputeAttributesHistogramCommand", .makes = {"HistogramFXAH"}});

}  // namespace
}  // namespace lumo
