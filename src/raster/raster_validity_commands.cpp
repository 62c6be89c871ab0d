#include <algorithm>

#include "foundation/fault.h"
#include "raster/block_strides.h"
#include "raster/raster_command.h"
#include "raster/raster_def.h"
#include "raster/raster_details.h"
#include "raster/tile_functions.h"
#include "raster/valid_pixels.h"
#include "raster/value_use.h"
#include "tasks/scratch_pool.h"

namespace lumo {
namespace {

const CommandDeclaration kValidity{
    "QueryRasterValidityCommand",
    "Pixels",
    "Counts the valid pixels of each band of a raster, by reading all of it.",
    {RasterURIInput(),
     {"Values", Presence::kOptional, ValueKind::kBoolean,
      "whether to look for a value that no valid pixel has; not when absent"}},
    {{"ValidPixels", ValueKind::kIntegerArray, "for each band"},
     {"HasFreeValue", ValueKind::kBooleanArray,
      "for each band, whether there is a value that none of its valid pixels has; false when it "
      "was "
      "not looked for"},
     {"FreeValue", ValueKind::kNumberArray,
      "that value, the same for all bands where there is one; 0 where there is none"}}};

class QueryRasterValidityCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const bool wantsValues = HasInput("Values") && Read<bool>("Values");
    const bool done = DispatchType(TwelveTypes{}, raster->DataType(), [&]<typename T>() {
      return Count<T>(RasterPtr<T>(raster), wantsValues);
    });
    if (GetIPC().abort->IsSet()) return Fail("the count was aborted");
    return done ? Succeed() : Fail(TakeFaultOr("the pixels could not be read"));
  }

  template <typename T>
  bool Count(const RasterPtr<T>& raster, bool wantsValues) {
    if (!raster) return false;
    ValidPixels counts(raster->Bands());
    ScratchPool<std::vector<ValueUse<T>>> uses;  // of each thread
    const auto look = [&](const Tile<T>& tile) {
      counts.Add(tile);
      if (wantsValues) NoteValues(tile, *uses.Borrow(tile.Bands()));
    };
    const RasterIteratorPtr<T> tiles(new RasterIteratorStream<T>(raster));
    if (!ForEachTile("QueryRasterValidity", TilesBy(tiles), look, GetIPC())) return false;
    std::vector<ValueUse<T>> use(raster->Bands());
    for (const auto& ofThread : uses.TakeAll()) {
      for (std::size_t band = 0; band < use.size(); ++band) use[band].Join((*ofThread)[band]);
    }
    Write("ValidPixels", counts.Get());
    WriteFreeValues(use, wantsValues);
    return true;
  }

  template <typename T>
  void WriteFreeValues(const std::vector<ValueUse<T>>& use, bool wantsValues) {
    Array<bool> has{ArrayDims(static_cast<unsigned>(use.size()))};
    Array<double> values{has.GetDims()};
    ValueUse<T> all;
    for (const ValueUse<T>& band : use) all.Join(band);
    const std::optional<double> common = all.FindFree();
    for (unsigned band = 0; band < has.GetCount(); ++band) {
      const auto found = !wantsValues ? std::nullopt : common ? common : use[band].FindFree();
      has[band] = found.has_value();
      values[band] = found.value_or(0.0);
    }
    Write("HasFreeValue", has);
    Write("FreeValue", values);
  }

  template <typename T>
  static void NoteValues(const Tile<T>& tile, std::vector<ValueUse<T>>& use) {
    const BlockStrides strides(tile.Order(), tile.Width(), tile.Height(), use.size());
    const unsigned char* const states = tile.StateArray().GetData();
    const T* const pixels = tile.PixelArray().GetData();
    for (std::size_t band = 0; band < use.size(); ++band) {
      for (std::size_t line = 0; line < tile.Height(); ++line) {
        std::size_t at = band * strides.band + line * strides.line;
        for (unsigned x = 0; x < tile.Width(); ++x, at += strides.pixel) {
          if (IsValidState(states[at])) use[band].Note(pixels[at]);
        }
      }
    }
  }
};

const CommandFactoryT<QueryRasterValidityCommand> validityFactory(kValidity);

const CommandDeclaration kDetails{
    "QueryRasterDetailsCommand",
    "Rasters",
    "Tells what a raster says beside its size, type, place and no-data values.",
    {RasterURIInput()},
    {{"Details", ValueKind::kTextList,
      "texts \"name=value\", such as \"Bands/0/Unit=K\"; a bar in one is written as a blank"}}};

class QueryRasterDetailsCommand final : public RasterCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const BasicRasterPtr raster = FindRaster();
    if (!raster) return Fail();
    const RasterDef def = raster->GetRasterDef();
    const std::vector<std::string> names = DetailNames(def.metadata);
    Array<String> details{ArrayDims(static_cast<unsigned>(names.size()))};
    for (unsigned i = 0; i < details.GetCount(); ++i) {
      std::string text = names[i] + "=" + FindDetail(def.metadata, DetailPath(names[i]));
      std::replace_if(
          text.begin(), text.end(), [](unsigned char c) { return c == '|' || c < ' '; }, ' ');
      details[i] = String(text);
    }
    Write("Details", details);
    return Succeed();
  }
};

const CommandFactoryT<QueryRasterDetailsCommand> detailsFactory(kDetails);

}  // namespace
}  // namespace lumo
