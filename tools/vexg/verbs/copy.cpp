#include <fmt/format.h>

#include "foundation/color.h"
#include "options/option_values.h"
#include "pictures/palette_reading.h"
#include "rasters/pixel_conversion.h"
#include "rasters/raster_verb.h"

namespace lumo::host {
namespace {

/// A colour table of the copy.
struct BandPalette {
  unsigned band;
  Palette palette;
};

class CopyVerb final : public RasterVerb {
 public:
  explicit CopyVerb(OptionSet& line) : RasterVerb(line, "The copy") {
    line.AddNote(
        "The copy keeps which pixels are valid, pixel type, no-data values, geo-reference, "
        "palettes, names, units and scales of bands and metadata items, as far as its format can; "
        "what it can't is said, and with --strict a failure.");
    line.AddExample("vexg copy scene.tif picture.tif --type Byte --scale 0,3000");
    line.AddExample("vexg copy scene.tif part.dat --format ORVA --rect 0,0,99,49 --bands 2,1,0");
    AddAreaTo(line);
    line.Add("--bands", bandsText_, "Bands in the order wanted, from 0; all by default")
        .Shows("B,B...")
        .Example("3,2,1");
    line.Add("--level", level_,
             "Level of its pyramid: 0 the raster itself, each further one half the size")
        .Within(0, 31)
        .ShowsDefault();
    line.Add("--interleave", interleave_, "Order of the pixels in the copy")
        .Takes(OneOf({"bip", "bil", "bsq"}));
    conversion_.AddTypeTo(line, "Pixel type of the copy");
    conversion_.AddScaleTo(line);
  }

 private:
  void AddSource(RasterChain& chain) const override {
    if (level_ == 0) {
      RasterVerb::AddSource(chain);
      return;
    }
    AddOpenWithPyramid(chain.GetDraft(), "source", GetSource());
    chain.Take("source");
    AddLevel(chain.GetDraft(), "level", "$source", level_);
    chain.Take("level");
  }

  RasterInfo PlanRaster(JobSession& session, const JobResults& opened,
                        const RasterInfo& source) override {
    bands_ = ParseBands(bandsText_, source);
    hasCodes_ = HoldsCodes(source, bands_);
    ReadPalettes(session,
                 level_ == 0 ? opened.Find("source").returns.Find("URI")
                             : opened.Find("level").returns.Find("PyramidURI"),
                 source);
    RasterInfo planned = source;
    planned.bands = bands_.GetCount();
    dataType_ = source.dataType;
    planned.dataType = conversion_.TypeOf(dataType_);
    return planned;
  }

  /// Reads the palettes of the bands that are copied, by their place in the copy.
  void ReadPalettes(JobSession& session, const String& raster, const RasterInfo& source) {
    for (unsigned i = 0; i < bands_.GetCount(); ++i) {
      if (!source.hasPalette[bands_[i]]) continue;
      palettes_.push_back({i, ReadPalette(session, raster, bands_[i])});
    }
  }

  void AddViews(RasterChain& chain) const override {
    if (!bandsText_.empty()) {
      AddBandView(chain.GetDraft(), "bands", chain.GetTop(), bands_);
      chain.Take("bands");
    }
    conversion_.AddView(chain, "converted", dataType_);
  }

  void AddToCreate(JobDraft& draft, JobWriterCommand& create) const override {
    if (!interleave_.empty()) create.AddInput("Interleave", ParseInterleave(interleave_));
    for (const BandPalette& entry : palettes_) {
      JobWriterCommand& set =
          draft.Step("palette" + std::to_string(entry.band), "SetRasterPaletteCommand");
      set.AddInput("URI", String("$target"));
      set.AddInput("Band", entry.band);
      set.AddInput("Palette", entry.palette);
    }
  }

  std::string GetOverviewMethod() const override { return hasCodes_ ? "Nearest" : "Average"; }

  void Compare(MadeRaster& raster, Losses& losses) const override {
    CompareKept(raster, losses);
    const RasterInfo& made = raster.made.info;
    for (const BandPalette& entry : palettes_) {
      if (!made.hasPalette[entry.band]) {
        losses.Add("the palette of band " + std::to_string(entry.band));
      }
    }
    const bool isOrdered = !interleave_.empty() && made.bands > 1;
    if (isOrdered && made.interleave != ParseInterleave(interleave_)) {
      losses.Add("the order " + interleave_);
    }
  }

  std::string bandsText_, interleave_;
  PixelConversion conversion_;
  unsigned level_ = 0;  // of the source's pyramid; 0: the source itself

  unsigned dataType_ = 0;  // of the source
  Array<unsigned> bands_;
  std::vector<BandPalette> palettes_;
  bool hasCodes_ = false;  // in a band that is copied
};

const VerbRegistration copyRegistration(
    "copy", "Copies a raster into a new file, of the same or another format", &SetUp<CopyVerb>);

}  // namespace
}  // namespace lumo::host
