#include "commands/division.h"
#include "data/data_manager.h"
#include "data/open_sources.h"
#include "foundation/fault.h"
#include "raster/raster_details.h"
#include "raster/rows_files.h"
#include "views/sources/raster_def_command.h"
#include "views/sources/temp_raster.h"

namespace lumo {
namespace {

/// The inputs of a new raster, with the creation options behind them.
std::vector<InputDeclaration> WithCreationOptions(std::vector<InputDeclaration> inputs) {
  for (const CreationValue& value : CreationValues()) {
    inputs.push_back(
        {value.input, Presence::kOptional, value.kind, value.meaning, "", value.words});
  }
  return inputs;
}

const CommandDeclaration kCreate{
    "CreateRasterCommand", "Rasters", "Makes a new raster in a data source.",
    WithCreationOptions(RasterDefInputs(
        {{"ConnStr", Presence::kRequired, ValueKind::kTextList, "where it is made"},
         {"Format", Presence::kOptional, ValueKind::kText, "key of the format"},
         {"Interleave", Presence::kOptional, ValueKind::kWord,
          "BIP, BIL, BSQ: the order in the source", "", &WordsIn<Interleave>},
         {"Details", Presence::kOptional, ValueKind::kWord,
          "of the raster in SrcURI, as far as the format has room for them. Told: "
          "none; Names: the names of bands; Bands: all of the bands and the raster, "
          "such as units, scales and further items; All: also the place, as control "
          "points",
          "", &WordsIn<KeptDetails>},
         {"RowsURI", Presence::kOptional, ValueKind::kURI,
          "a raster of CreateJoinedRowsRasterCommand that is to be copied into the new one: that "
          "takes the packed blocks of its files as they are where it packs alike, or is a VRT file "
          "on them, and the copy has nothing left to do"},
         {"Categories", Presence::kOptional, ValueKind::kTextList,
          "names of the values of the first band, from 0 on"}})),
    PublishedOutputs()};

class CreateRasterCommand final : public RasterDefCommand {
  CommandResult Execute() override {
    RasterDef def;
    if (!CheckInputs() || !ReadRasterDef(def) || !ReadCreation(def)) return Fail();
    KeepDetails(def.metadata, Read<KeptDetails>("Details"));
    if (HasInput("Categories")) SetCategories(def.metadata, 0, Read<Array<String>>("Categories"));
    if (HasInput("RowsURI")) {
      const BasicRasterPtr rows = FindRaster("RowsURI");
      const auto* const files = dynamic_cast<const RowsSource*>(rows.Get());
      if (files == nullptr) return Fail("RowsURI: is no raster of files that hold its lines");
      def.creation.rows = files->GetRows();
    }
    const auto connStrings = Read<Array<String>>("ConnStr");
    const SourceClaim claim(connStrings);
    if (!claim.IsGranted()) {
      return Fail("the source is open already, and left as it is: " +
                  connStrings[connStrings.GetCount() - 1]);
    }
    const RowsWatch::Scope watch(def.creation.rows != nullptr ? def.creation.rows->watch : nullptr,
                                 GetIPC());
    return Publish(MakeReaderRaster(GetGlobalDataManager().CreateRaster(connStrings, def)));
  }

  /// Reads the creation options; false, with the fault set, for some that don't fit.
  bool ReadCreation(RasterDef& def) const {
    def.creation = {};
    std::string fault;
    const auto textOf = [this](const char* input) {
      return HasInput(input) ? Read<String>(input).ToUTF8() : std::string();
    };
    if (ReadCreationOptions(textOf, def.creation, fault)) fault = FindCreationMisfit(def);
    if (fault.empty()) return true;
    SetFault(fault);
    return false;
  }
};

const CommandFactoryT<CreateRasterCommand> createFactory(kCreate);
const DivisionRegistration createDivision({.command = "CreateRasterCommand", .makes = {"ConnStr"}});

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
