#include "data/data_manager.h"
#include "foundation/fault.h"
#include "views/raster_def_command.h"
#include "views/temp_raster.h"

namespace lumo {
namespace {

const CommandDeclaration kCreate{
    "CreateRasterCommand", "Rasters", "Makes a new raster in a data source.",
    RasterDefInputs({{"ConnStr", Presence::kRequired, ValueKind::kTextList, "where it is made"},
                     {"Format", Presence::kOptional, ValueKind::kText, "key of the format"},
                     {"Interleave", Presence::kOptional, ValueKind::kWord,
                      "BIP, BIL, BSQ: the order in the source", "", &WordsIn<Interleave>}}),
    PublishedOutputs()};

class CreateRasterCommand final : public RasterDefCommand {
  CommandResult Execute() override {
    RasterDef def;
    if (!CheckInputs() || !ReadRasterDef(def)) return Fail();
    return Publish(
        MakeReaderRaster(GetGlobalDataManager().CreateRaster(Read<Array<String>>("ConnStr"), def)));
  }
};

const CommandFactoryT<CreateRasterCommand> createFactory(kCreate);

const CommandDeclaration kCreateTemp{
    "CreateTempRasterCommand", "Rasters",
    "Makes a raster in a temporary file, which goes away with the raster.",
    RasterDefInputs({{"Directory", Presence::kOptional, ValueKind::kText,
                      "where the file lies; the system's choice when absent"}}),
    PublishedOutputs()};

class CreateTempRasterCommand final : public RasterDefCommand {
  CommandResult Execute() override {
    RasterDef def;
    if (!CheckInputs() || !ReadRasterDef(def)) return Fail();
    Context context;
    if (HasInput("Directory")) {
      context[Context::kWorkingDirectory].text = Read<String>("Directory");
    }
    BasicRasterPtr made;
    const bool typed = DispatchType(EightTypes{}, def.dataType, [&]<typename T>() {
      made.Reset(new TempRaster<T>(context, def));
      return true;
    });
    return typed ? Publish(made)
                 : Fail("DataType is no pixel type that a temporary raster can have");
  }
};

const CommandFactoryT<CreateTempRasterCommand> createTempFactory(kCreateTemp);

}  // namespace
}  // namespace lumo
