#include "raster/raster_command.h"
#include "raster/raster_def.h"
#include "raster/raster_details.h"

namespace lumo {
namespace {

const InputDeclaration kPaletteBands{"Bands", Presence::kRequired, ValueKind::kIntegerArray,
                                     "the bands, from 0"};

const CommandDeclaration kGetPalette{
    "GetRasterPaletteCommand",
    "Palettes",
    "Gives the colour tables of bands.",
    {RasterURIInput(), kPaletteBands},
    {{"Palettes", ValueKind::kPaletteArray, "one for each band given; empty where it has none"}}};

class GetRasterPaletteCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const auto bands = Read<Array<unsigned>>("Bands");
    if (!CheckBands(*raster, bands)) return Fail();
    Array<Palette> palettes(bands.GetDims());
    for (unsigned i = 0; i < bands.GetCount(); ++i) {
      const PalettePtr palette = raster->Palette(bands[i]);
      if (palette) palettes[i] = *palette;
    }
    Write("Palettes", palettes);
    return Succeed();
  }
};

const CommandFactoryT<GetRasterPaletteCommand> getRasterPaletteFactory(kGetPalette);

const CommandDeclaration kCategories{
    "GetRasterCategoriesCommand",
    "Palettes",
    "Gives the names that the values of a band have. A command of this library's own.",
    {RasterURIInput(), {"Band", Presence::kRequired, ValueKind::kInteger, "from 0"}},
    {{"Categories", ValueKind::kTextList, "of the values from 0 on; empty where it has none"}}};

class GetRasterCategoriesCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const auto band = Read<unsigned>("Band");
    if (band >= raster->Bands()) return Fail("Band: the raster has no such band");
    const std::vector<std::string> names = FindCategories(raster->GetRasterDef().metadata, band);
    Array<String> categories{ArrayDims(static_cast<unsigned>(names.size()))};
    for (unsigned i = 0; i < categories.GetCount(); ++i) categories[i] = String(names[i]);
    Write("Categories", categories);
    return Succeed();
  }
};

const CommandFactoryT<GetRasterCategoriesCommand> categoriesFactory(kCategories);

const CommandDeclaration kSet{
    "SetRasterPaletteCommand",
    "Palettes",
    "Stores the colour table of a band through the data source.",
    {RasterURIInput(),
     {"Band", Presence::kRequired, ValueKind::kInteger, "the band, from 0"},
     {"Palette", Presence::kRequired, ValueKind::kPalette, "the colour table"}},
    {{"Return", ValueKind::kBoolean, "the source took it"}}};

class SetRasterPaletteCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const auto band = Read<unsigned>("Band");
    if (band >= raster->Bands()) return Fail("Band is not a band of the raster");
    Write("Return", raster->WritePalette(band, PalettePtr(new Palette(Read<Palette>("Palette")))));
    return Succeed();
  }
};

const CommandFactoryT<SetRasterPaletteCommand> setFactory(kSet);

const CommandDeclaration kCopyPalettes{
    "CopyRasterPalettesCommand",
    "Palettes",
    "Stores the colour tables of all bands of a raster with another one. A command of this "
    "library's own.",
    {{"SrcURI", Presence::kRequired, ValueKind::kURI, "the raster that has them"},
     {"DstURI", Presence::kRequired, ValueKind::kURI, "the raster that gets them"}},
    {{"Return", ValueKind::kBooleanArray,
      "for each band of the first: it has none, or the other source took it"}}};

class CopyRasterPalettesCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr source = FindRaster("SrcURI");
    const BasicRasterPtr target = source ? FindRaster("DstURI") : BasicRasterPtr();
    if (!target) return Fail();
    if (source->Bands() != target->Bands()) return Fail("the rasters differ in bands");
    Array<bool> taken{ArrayDims(source->Bands())};
    for (unsigned band = 0; band < taken.GetCount(); ++band) {
      const PalettePtr palette = source->HasPalette(band) ? source->Palette(band) : PalettePtr();
      taken[band] = !palette || target->WritePalette(band, palette);
    }
    Write("Return", taken);
    return Succeed();
  }
};

const CommandFactoryT<CopyRasterPalettesCommand> copyFactory(kCopyPalettes);

const CommandDeclaration kDelete{
    "DeleteRasterPaletteCommand",
    "Palettes",
    "Takes the colour tables of bands away from the data source.",
    {RasterURIInput(), kPaletteBands},
    {{"Return", ValueKind::kBooleanArray, "for each band given: it has none any more"}}};

class DeleteRasterPaletteCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const auto bands = Read<Array<unsigned>>("Bands");
    if (!CheckBands(*raster, bands)) return Fail();
    Array<bool> deleted(bands.GetDims());
    for (unsigned i = 0; i < bands.GetCount(); ++i) deleted[i] = raster->DeletePalette(bands[i]);
    Write("Return", deleted);
    return Succeed();
  }
};

const CommandFactoryT<DeleteRasterPaletteCommand> deleteFactory(kDelete);

}  // namespace
}  // namespace lumo
