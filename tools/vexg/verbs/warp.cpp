#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <optional>

#include <fmt/format.h>

#include "foundation/fault.h"
#include "foundation/text_case.h"
#include "georef/covering_grid.h"
#include "options/option_values.h"
#include "raster/pixel_value.h"
#include "rasters/raster_verb.h"

namespace lumo::host {
namespace {

/// A word of the command line as the commands have it.
std::string Capital(std::string word) {
  if (!word.empty() && word[0] >= 'a' && word[0] <= 'z') word[0] += 'A' - 'a';
  return word;
}

bool IsFile(const std::string& name) {
  std::error_code ignored;
  return std::filesystem::is_regular_file(name, ignored);
}

/// The grid of another raster file. Throws HostError when it has none.
GeoRefPtr GridOfFile(JobSession& session, const std::string& file) {
  JobDraft draft;
  AddOpen(draft, "like", {file, ""});
  AddQuery(draft, "like", "$like");
  draft.Close("close.like", "$like");
  const RasterInfo like = ReadInfo(session.Run(draft), "like");
  if (like.geoRef.IsNull() || like.geoRef->GetType() != GeoRef::kStd) {
    throw HostError(kExitFailed, file + ": the raster has no plain grid to be taken over");
  }
  return like.geoRef;
}

/// Takes a size above 0, with or without a unit.
ValueRule PixelSizeRule() {
  return {[](const std::string& text) {
            Quantity size;
            const bool isSize =
                ReadQuantity(text, size) && std::isfinite(size.value) && size.value > 0;
            return isSize ? std::string() : fmt::format("\"{}\" is no size above 0", text);
          },
          {},
          {}};
}

/// The unit that a person writes behind a number; null for none that is known.
const MapUnit* FindUnit(const std::string& typed) {
  static const std::map<std::string, std::int32_t> kShort{
      {"m", 9001},      {"metre", 9001},   {"metres", 9001}, {"meter", 9001}, {"meters", 9001},
      {"km", 9036},     {"ft", 9002},      {"feet", 9002},   {"foot", 9002},  {"deg", 9102},
      {"degree", 9102}, {"degrees", 9102}, {"\u00b0", 9102}};
  const auto at = kShort.find(typed);
  return at != kShort.end() ? FindMapUnit(at->second) : nullptr;
}

/// The side of a pixel in units of the system; 0 for no text. Throws HostError for one that can't
/// be, and questions one that can hardly be meant.
double ReadPixelSize(const std::string& text, const CoordSys& system) {
  Quantity size;
  if (text.empty() || !ReadQuantity(text, size)) return 0;
  const CoordSysInfo& info = *system.Info();
  if (!size.unit.empty()) {
    const MapUnit* const unit = FindUnit(size.unit);
    if (unit == nullptr || unit->kind != info.unitKind) {
      throw HostError(kExitUsage, "--pixel-size: " + text + ": the unit of the system is " +
                                      info.unitName.ToUTF8());
    }
    size.value *= unit->factor / info.unitFactor;
  }
  const double plain = size.value * info.unitFactor;  // metres or degrees
  if (info.unitKind == 1 && plain > 360) {
    throw HostError(kExitUsage, "--pixel-size: " + text + ": no pixel is that many degrees wide");
  }
  if (info.unitKind == 1 && plain >= 1) {
    Say(fmt::format(
        "note: --pixel-size: a pixel is {} degrees wide; that is the unit of the system", plain));
  } else if (info.unitKind == 0 && plain < 0.01) {
    Say(fmt::format("note: --pixel-size: a pixel is {} m wide; that is the unit of the system",
                    plain));
  }
  return size.value;
}

/// Questions a zone of the Universal Transverse Mercator grid that is far from the raster.
void QuestionZone(const std::string& named, const CoordSys& system, const GeoRef& source) {
  std::string name = system.Info()->name.ToUTF8();
  std::replace(name.begin(), name.end(), '_', ' ');
  const std::size_t at = LowerCase(name).find("utm zone ");
  if (at == std::string::npos) return;
  const int zone = std::atoi(name.c_str() + at + 9);
  if (zone < 1 || zone > 60) return;
  Array<double> centre{ArrayDims(1, 2)};
  centre[0] = source.Samples() / 2.0;
  centre[1] = source.Lines() / 2.0;
  source.PixelToMap(centre);
  double longitude = 0, latitude = 0;
  source.CoordinateSystem().MapToGeo(centre[0], centre[1], longitude, latitude);
  if (!std::isfinite(longitude)) return;
  constexpr double kFar = 9;  // degrees: the zone's half, and a zone between
  const double off = std::abs(std::remainder(longitude - (zone * 6 - 183), 360.0));
  if (off <= kFar) return;
  const int nearest = static_cast<int>(std::floor((std::remainder(longitude, 360.0) + 180) / 6));
  Say(
      fmt::format("note: --to: the raster lies {:.0f} degrees from the middle of zone {} ({}); its "
                  "own is zone {}",
                  off, zone, named, nearest % 60 + 1));
}

class WarpVerb final : public RasterVerb {
 public:
  explicit WarpVerb(OptionSet& line) : RasterVerb(line, "The warped raster") {
    line.AddNote(
        "The polynomial method is within an eighth of a pixel; rigorous transforms every pixel. "
        "All but nearest take in the whole area that a pixel covers, and leave out pixels that "
        "aren't valid; cubic has the parameter -0.5. Pixels outside the source are not valid: they "
        "have the no-data value, or 0 under a mask.");
    line.AddExample("vexg warp scene.tif geographic.tif --to EPSG:4326 --resampling bilinear");
    line.Add("--to", to_,
             "Coordinate system (EPSG:n, WKT, PROJ text), or a raster file whose grid is "
             "taken over")
        .Shows("CS|FILE")
        .Example("EPSG:4326")
        .Takes(CoordSysName())
        .Required();
    line.Add("--pixel-size", pixelSize_,
             "Side of a pixel in units of the system, or with its unit; by default about as "
             "many pixels as the source has")
        .Shows("SIZE")
        .Example("30m")
        .Takes(PixelSizeRule());
    line.Add("--method", method_, "How positions are found")
        .Takes(OneOf({"polynomial", "rigorous"}))
        .ShowsDefault();
    line.Add("--resampling", resampling_, "How pixels are made")
        .Takes(OneOf({"nearest", "bilinear", "cubic", "lanczos", "average", "mode", "min", "max",
                      "median", "linear"}))
        .ShowsDefault();
    line.Add("--bands", bandsText_, "Bands in the order wanted, from 0; all by default")
        .Shows("B,B...")
        .Example("3,2,1");
    AddAreaTo(line, "--source-no-data");
    line.Add("--no-data", noData_, "No-data value of the result; by default the source's")
        .Shows("VALUE");
  }

 private:
  std::vector<std::string> GetFurtherInputs() const override {
    return IsFile(to_) ? std::vector{to_} : std::vector<std::string>();
  }

  RasterInfo PlanRaster(JobSession& session, const JobResults& /*opened*/,
                        const RasterInfo& source) override {
    CheckNoData(source);
    bands_ = ParseBands(bandsText_, source);
    hasCodes_ = HoldsCodes(source, bands_);
    grid_ = FindGrid(session, source);
    RasterInfo planned = source;
    planned.samples = grid_->Samples();
    planned.lines = grid_->Lines();
    planned.bands = bands_.GetCount();
    return planned;
  }

  /// Refuses a no-data value that no pixel can have.
  void CheckNoData(const RasterInfo& source) const {
    if (!noData_ || FitsPixel(source.dataType, *noData_)) return;
    throw HostError(kExitUsage, fmt::format("--no-data: a pixel of type {} can't be {}",
                                            DataTypeName(source.dataType).ToUTF8(), *noData_));
  }

  /// The grid that was asked for. Throws HostError for one that can't be.
  GeoRefPtr FindGrid(JobSession& session, const RasterInfo& info) const {
    if (info.geoRef.IsNull()) {
      throw HostError(kExitFailed, GetSource().file + ": the raster has no geo-reference");
    }
    if (IsFile(to_)) {
      if (!pixelSize_.empty()) {
        throw HostError(kExitUsage, "--pixel-size: the grid of " + to_ + " has its own");
      }
      return GridOfFile(session, to_);
    }
    CoordSys system;
    TakeFault();
    if (!system.SetFromString(String(to_))) {
      const std::string why = TakeFault().ToUTF8();
      if (!why.empty()) throw HostError(kExitFailed, "--to " + to_ + ": " + why);
      throw HostError(kExitUsage, "--to: neither a file nor a coordinate system: " + to_);
    }
    if (info.geoRef->CoordinateSystem().IsEmpty()) {
      throw HostError(kExitFailed, GetSource().file + ": the raster has no coordinate system");
    }
    QuestionZone(to_, system, *info.geoRef);
    const GeoRefPtr grid = CoveringGrid(*info.geoRef, system, ReadPixelSize(pixelSize_, system));
    if (grid.IsNull()) {
      throw HostError(kExitFailed, GetSource().file +
                                       ": the raster can't be carried to that system with pixels "
                                       "of that size");
    }
    return grid;
  }

  void AddViews(RasterChain& chain) const override {
    if (!bandsText_.empty()) {
      AddBandView(chain.GetDraft(), "bands", chain.GetTop(), bands_);
      chain.Take("bands");
    }
    JobWriterCommand& view = chain.AddView("warped", "CreateProjectedRasterCommand");
    view.AddInput("GeoRef", grid_);
    view.AddInput("ReprojectionMethod", String(Capital(method_)));
    view.AddInput("ResamplingMethod", String("Nearest"));
    view.AddInput("Kernel", String(Capital(resampling_ == "bilinear" ? "linear" : resampling_)));
    view.AddInput("Grid", String("Exact"));
    view.AddInput("Sampling", String("Centred"));
    if (noData_) view.AddInput("NoData", *noData_);
  }

  const char* GetKeptDetails() const override { return "Bands"; }
  bool KeepsPalettes() const override { return resampling_ == "nearest" || resampling_ == "mode"; }
  std::string GetOverviewMethod() const override {
    return hasCodes_ && KeepsPalettes() ? "Nearest" : "Average";
  }
  bool MayChooseNoData() const override { return !noData_; }
  bool FillsNoData(const FillValues& noData) const override {
    return noData_.has_value() || RasterVerb::FillsNoData(noData);
  }

  /// A source that lies turned in the grid has no blocks that suit it.
  bool CopiesBlocksOfSource() const override { return false; }

  std::string to_;
  std::string pixelSize_;  // with or without a unit
  std::string method_ = "polynomial";
  std::string resampling_ = "nearest";
  std::string bandsText_;
  std::optional<double> noData_;

  Array<unsigned> bands_;
  bool hasCodes_ = false;
  GeoRefPtr grid_;
};

const VerbRegistration warpRegistration("warp",
                                        "Carries a raster to another coordinate system or grid",
                                        &SetUp<WarpVerb>);

}  // namespace
}  // namespace lumo::host
