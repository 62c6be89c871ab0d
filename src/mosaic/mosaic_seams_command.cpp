#include "commands/division.h"
#include "foundation/fault.h"
#include "mosaic/mosaic_command.h"
#include "mosaic/mosaic_seams.h"

namespace lumo {
namespace {

const CommandDeclaration kSeamGeneration{
    "MosaicAutoSeamGenCommand",
    "Mosaics",
    "Decides which scene of a mosaic shows which ground: cuts the footprints of its scenes along "
    "seams through their overlaps.",
    {{"MosaicURI", Presence::kRequired, ValueKind::kURI, "the mosaic, of one of eight types"},
     {"Sides", Presence::kOptional, ValueKind::kWord,
      "how the side of a seam that a scene keeps is found where the overlap has four corners a, b, "
      "c, d: Told: by the distance of its outline from b and from the middles of a and b, and of c "
      "and d; Exact: of b and c instead of the last, so that scenes side by side keep their own",
      "", &WordsIn<Form>}},
    {{"Success", ValueKind::kBoolean, "the seams were made"}}};

class MosaicAutoSeamGenCommand final : public MosaicCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    return End(OnMosaic([&]<typename T>(const MosaicRasterPtr<T>& mosaic) {
      return MakeSeams(*mosaic, GetIPC(), Read<Form>("Sides"));
    }));
  }
};

const CommandFactoryT<MosaicAutoSeamGenCommand> mosaicAutoSeamGenFactory(kSeamGeneration);
const DivisionRegistration mosaicAutoSeamGenDivision({.command = "MosaicAutoSeamGenCommand",
                                                      .kind = DivisionKind::kFirst});

}  // namespace
}  // namespace lumo
