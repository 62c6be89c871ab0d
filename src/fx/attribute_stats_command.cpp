#include "commands/division.h"
#include "foundation/fault.h"
#include "fx/attribute_inputs.h"
#include "fx/attribute_statistics.h"
#include "fx/region_attribute_stats.h"

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
      return Fail(String("AttributeFXA: " + from.ToUTF8() + " is no file of regions"));
    }
    RegionAttributeStatsFile<float> stats(to, regions.Bands(), regions.Attributes());
    if (!stats.IsValid()) return Fail();
    NoteCreated(to);
    const bool isDone = Fill(regions, stats) && stats.Close();
    return isDone ? Succeed() : FailWithout("the statistics can't be written", Form::kExact);
  }

  bool Fill(RegionAttributesFile<float>& regions, RegionAttributeStatsFile<float>& stats) const {
    const std::vector<AttributeFigures> figures = FindAttributeFigures(regions, GetIPC());
    auto from = figures.begin();
    for (unsigned band = 0; band < stats.Bands(); ++band) {
      for (unsigned i = 0; i < stats.Attributes(); ++i, ++from) {
        if (from == figures.end()) return false;
        stats.Mean(band, i) = static_cast<float>(from->mean);
        stats.StdDev(band, i) = static_cast<float>(from->deviation);
        stats.Min(band, i) = static_cast<float>(from->min);
        stats.Max(band, i) = static_cast<float>(from->max);
        stats.Count(band, i) = static_cast<float>(from->count);
      }
    }
    return stats.IsValid();
  }
};

const CommandFactoryT<FxComputeAttributesStatsCommand> fxComputeAttributesStatsFactory(
    kAttributesStats);
const DivisionRegistration fxComputeAttributesStatsDivision(
    {.command = "FxComputeAttributesStatsCommand",
     .kind = DivisionKind::kEach,
     .makes = {"StatsFXAS"}});

}  // namespace
}  // namespace lumo
