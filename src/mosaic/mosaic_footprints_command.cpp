#include "commands/division.h"
#include "foundation/fault.h"
#include "mosaic/mosaic_command.h"
#include "mosaic/mosaic_seams.h"

namespace lumo {
namespace {

const CommandDeclaration kMake{
    "MakeMosaicFootPrintsCommand",
    "Mosaics",
    "Makes the footprints of a mosaic's scenes that have none, and stores them in its definition. "
    "A command of this library's own.",
    WithShareInputs(
        {{"MosaicURI", Presence::kRequired, ValueKind::kURI, "the mosaic"},
         {"Again", Presence::kOptional, ValueKind::kBoolean, "1: of all scenes"},
         {"SmoothParameter", Presence::kOptional, ValueKind::kNumber,
          "how far outlines may lie from the pixels; 3.1 when absent", "square pixels"},
         {"NoData", Presence::kOptional, ValueKind::kNumber, "see MosaicFootPrintsCommand"},
         {"Tolerance", Presence::kOptional, ValueKind::kNumber, "see MosaicFootPrintsCommand",
          "pixel values"},
         {"MaskURIs", Presence::kOptional, ValueKind::kURIArray,
          "for each scene a mask, see MosaicFootPrintsCommand; empty for none"}}),
    {{"Made", ValueKind::kInteger, "how many footprints were made"}}};

class MakeMosaicFootPrintsCommand final : public MosaicCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    FootprintOptions options;
    options.again = Read<bool>("Again");
    if (HasInput("SmoothParameter")) options.smoothing = Read<double>("SmoothParameter");
    if (HasInput("NoData")) options.noData = Read<double>("NoData");
    if (HasInput("Tolerance")) options.tolerance = Read<double>("Tolerance");
    options.masks = Read<Array<URI>>("MaskURIs");
    unsigned made = 0;
    const auto make = [&]<typename T>(const MosaicRasterPtr<T>& mosaic) {
      SceneShares shares;
      return BeginShares("footprints", *mosaic->Definition(), shares) &&
             MakeMissingFootprints(*mosaic->Definition(), options, GetIPC(), made, shares) &&
             shares.End();
    };
    const bool isDone =
        OnMosaic(make, HasInput(kShareInput) ? Storing::kNothing : Storing::kDefinition);
    if (!HasInput(kShareInput)) Write("Made", made);
    return isDone ? Succeed() : Fail(TakeFaultOr("the footprints could not be made"));
  }
};

const CommandFactoryT<MakeMosaicFootPrintsCommand> makeMosaicFootPrintsFactory(kMake);
const DivisionRegistration makeMosaicFootPrintsDivision({.command = "MakeMosaicFootPrintsCommand",
                                                         .kind = DivisionKind::kFirst,
                                                         .source = "MosaicURI"});

}  // namespace
}  // namespace lumo
