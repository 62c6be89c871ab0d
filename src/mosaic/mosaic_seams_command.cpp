#include "foundation/fault.h"
#include "mosaic/mosaic_command.h"
#include "mosaic/mosaic_seams.h"

namespace lumo {
namespace {

const CommandDeclaration kSeams{
    "MosaicAutoSeamGenCommand",
    "Mosaics",
    "Decides which scene of a mosaic shows which ground: cuts the footprints of its scenes along "
    "seams through their overlaps.",
    {{"MosaicURI", Presence::kRequired, ValueKind::kURI, "the mosaic, of one of eight types"}},
    {{"Success", ValueKind::kBoolean, "the seams were made"}}};

class MosaicAutoSeamGenCommand final : public MosaicCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    return End(OnMosaic([&]<typename T>(const MosaicRasterPtr<T>& mosaic) {
      return MakeSeams(*mosaic, GetIPC());
    }));
  }
};

const CommandFactoryT<MosaicAutoSeamGenCommand> factory(kSeams);

}  // namespace
}  // namespace lumo
