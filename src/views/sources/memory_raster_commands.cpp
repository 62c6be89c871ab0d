#include "views/sources/memory_raster.h"
#include "views/sources/raster_def_command.h"

namespace lumo {
namespace {

const CommandDeclaration kCreate{
    "CreateMemoryRasterCommand", "Rasters", "Makes a raster in memory.",
    RasterDefInputs({{"Interleave", Presence::kOptional, ValueKind::kWord,
                      "BIP, BIL, BSQ: the order in memory", "", &WordsIn<Interleave>}}),
    PublishedOutputs()};

class CreateMemoryRasterCommand final : public RasterDefCommand {
  CommandResult Execute() override {
    RasterDef def;
    if (!CheckInputs() || !ReadRasterDef(def)) return Fail();
    if (def.interleave == Interleave::None && def.bands > 1) def.interleave = Interleave::BIP;
    BasicRasterPtr made;
    const bool typed = DispatchType(EightTypes{}, def.dataType, [&]<typename T>() {
      made.Reset(new AutoMemoryRaster<T>("AutoMemoryRaster", def.samples, def.lines, def.bands,
                                         def.interleave, def.geoRef, def.noData));
      return true;
    });
    return typed ? Publish(made) : Fail("DataType is no pixel type that a memory raster can have");
  }
};

const CommandFactoryT<CreateMemoryRasterCommand> createMemoryRasterFactory(kCreate);

}  // namespace
}  // namespace lumo
