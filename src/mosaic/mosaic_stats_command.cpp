#include "commands/division.h"
#include "foundation/fault.h"
#include "mosaic/mosaic_command.h"
#include "mosaic/mosaic_matching.h"

namespace lumo {
namespace {

constexpr unsigned kMostMode = 1;

const CommandDeclaration kStats{
    "MosaicStatsCommand",
    "Mosaics",
    "Makes the tables that match the colours of a mosaic's scenes to those of its reference scene.",
    WithShareInputs(
        {{"MosaicURI", Presence::kRequired, ValueKind::kURI, "the mosaic, of one of eight types"},
         {"Level", Presence::kRequired, ValueKind::kInteger,
          "the pyramid level whose pixels are counted; 0, and one that there isn't, stand for the "
          "mosaic itself"}}),
    {{"Success", ValueKind::kBoolean, "the tables were made"}}};

class MosaicStatsCommand final : public MosaicCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const auto match = [&]<typename T>(const MosaicRasterPtr<T>& mosaic) {
      if (mosaic->Definition()->ColourMatchMode() <= kMostMode) {
        SceneShares shares;
        return BeginShares("tables", *mosaic->Definition(), shares) &&
               MatchScenes(*mosaic->Definition(), GetIPC(), shares) && shares.End();
      }
      SetFault("MosaicURI: the mosaic has no colour match mode that is known");
      return false;
    };
    if (!HasInput(kShareInput)) return End(OnMosaic(match));
    return OnMosaic(match, Storing::kNothing) ? Succeed()
                                              : Fail(TakeFaultOr("the work on the mosaic failed"));
  }
};

const CommandFactoryT<MosaicStatsCommand> mosaicStatsFactory(kStats);
const DivisionRegistration mosaicStatsDivision({.command = "MosaicStatsCommand",
                                                .kind = DivisionKind::kFirst,
                                                .source = "MosaicURI"});

}  // namespace
}  // namespace lumo
