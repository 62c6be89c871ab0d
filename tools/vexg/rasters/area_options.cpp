#include "rasters/area_options.h"

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <limits>

#include <fmt/format.h>

#include "options/option_values.h"
#include "raster/pixel_value.h"
#include "rasters/map_points.h"
#include "rasters/shape_options.h"
#include "verb.h"

namespace lumo::host {
namespace {

/// A number with commas between its thousands.
std::string Grouped(std::uint64_t number) {
  const std::string digits = std::to_string(number);
  std::string text;
  for (std::size_t i = 0; i < digits.size(); ++i) {
    if (i != 0 && (digits.size() - i) % 3 == 0) text += ',';
    text += digits[i];
  }
  return text;
}

/// The four numbers of a box.
struct Box {
  double west = 0, south = 0, east = 0, north = 0;
};

Box ParseBox(const std::string& text) {
  std::vector<double> numbers;
  for (const std::string& piece : SplitList(text)) {
    Quantity number;
    if (!ReadQuantity(piece, number) || !number.unit.empty() || !std::isfinite(number.value)) break;
    numbers.push_back(number.value);
  }
  if (numbers.size() != 4 || SplitList(text).size() != 4 || numbers[0] > numbers[2] ||
      numbers[1] > numbers[3]) {
    throw HostError(kExitUsage, "--bbox: \"" + text +
                                    "\" is not west,south,east,north with west below east and "
                                    "south below north");
  }
  return {numbers[0], numbers[1], numbers[2], numbers[3]};
}

/// Points of the sides of a box, close enough for sides that are bent on another map.
Array<double> SidesOf(const Box& box) {
  constexpr unsigned kSteps = 32;  // of a side
  Array<double> points{ArrayDims(4 * kSteps, 2)};
  double* next = points.begin();
  for (unsigned i = 0; i < kSteps; ++i) {
    const double share = static_cast<double>(i) / kSteps;
    const double x = box.west + share * (box.east - box.west);
    const double y = box.south + share * (box.north - box.south);
    for (const double number : {x, box.south, box.east, y, box.east + box.west - x, box.north,
                                box.west, box.south + box.north - y}) {
      *next++ = number;
    }
  }
  return points;
}

/// The values of a list as texts of one array of pixels; throws HostError for one that no pixel can
/// have.
template <typename Format>
String ValuesOf(const std::string& option, const std::string& list, unsigned dataType,
                const Format& format) {
  const std::vector<std::string> pieces = SplitList(list);
  String text;
  const bool isTyped = DispatchType(EightTypes{}, dataType, [&]<typename T>() {
    Array<T> values{ArrayDims(static_cast<unsigned>(pieces.size()))};
    for (unsigned i = 0; i < values.GetCount(); ++i) {
      const std::optional<T> value = ToPixel<T>(pieces[i]);
      if (!value) {
        throw HostError(kExitUsage, fmt::format("{}: a pixel of type {} can't be {}", option,
                                                DataTypeName(dataType).ToUTF8(), pieces[i]));
      }
      values[i] = *value;
    }
    text = format(values);
    return true;
  });
  if (isTyped) return text;
  throw HostError(kExitFailed, fmt::format("{}: there is no such view on pixels of type {}", option,
                                           DataTypeName(dataType).ToUTF8()));
}

/// Refuses an empty text, as that of a variable of a shell that isn't set.
ValueRule SomeText() {
  return {
      [](const std::string& text) { return std::string(text.empty() ? "the text is empty" : ""); },
      {},
      {}};
}

}  // namespace

void AreaOptions::AddTo(OptionSet& line, const char* noDataOption) {
  noDataOption_ = noDataOption;
  line.Add("--rect", rectText_, "Only these pixels: left,top,right,bottom, from 0, inclusive")
      .Shows("L,T,R,B")
      .Example("0,0,511,511");
  line.Add(
          "--bbox", box_,
          "Only the pixels that this box on the map touches; of a grid that is turned, or of a box "
          "in another system, the rectangle of pixels around it")
      .Shows("W,S,E,N")
      .Example("-34.92,-8.05,-34.86,-8.00");
  line.Add("--bbox-crs", boxSystem_, "The coordinate system of the box; the raster's by default")
      .Shows("CS")
      .Example("EPSG:4326")
      .Takes(CoordSysName());
  line.Add("--region", region_,
           "Only the pixels inside the shapes of this file, cut to the rectangle around them; "
           "shapes "
           "of another coordinate system are carried")
      .IsFile("FILE[:LAYER]")
      .Takes(SomeText())
      .Example("parcels.gpkg");
  line.Add("--where", where_, "Only the shapes whose field has this value")
      .Shows("FIELD=VALUE")
      .Takes(SomeText());
  line.Add("--mask-band", maskBand_, "Band, from 0, that tells which pixels do not count")
      .Shows("B");
  line.Add("--mask-values", maskValues_, "The values of that band where pixels do not count")
      .Shows("V,V...")
      .Example("0,255");
  line.Add("--mask-inverse", isInversed_, "Only pixels with one of these values count");
  line.Add(noDataOption, noData_,
           "Values that are no data, in the place of what the file says; none: no pixel is")
      .Shows("V,V...|none")
      .Example("0");
}

void AreaOptions::Check() const {
  const auto need = [](bool isGiven, const char* option, bool hasOther, const char* other) {
    if (!isGiven || hasOther) return;
    throw HostError(kExitUsage, fmt::format("{} goes with {}", option, other));
  };
  if (!rectText_.empty() && !box_.empty()) {
    throw HostError(kExitUsage, "--rect and --bbox exclude each other");
  }
  if (!box_.empty()) ParseBox(box_);
  need(!boxSystem_.empty(), "--bbox-crs", !box_.empty(), "--bbox");
  need(!where_.empty(), "--where", !region_.empty(), "--region");
  need(maskBand_.has_value(), "--mask-band", !maskValues_.empty(), "--mask-values");
  need(!maskValues_.empty(), "--mask-values", maskBand_.has_value(), "--mask-band");
  need(isInversed_, "--mask-inverse", maskBand_.has_value(), "--mask-band");
}

bool AreaOptions::IsGiven() const {
  return !rectText_.empty() || !box_.empty() || !region_.empty() || maskBand_ || !noData_.empty();
}

std::vector<std::string> AreaOptions::GetFiles() const {
  return region_.empty() ? std::vector<std::string>() : std::vector{SplitLayer(region_).file};
}

RasterInfo AreaOptions::Plan(JobSession& session, const String& raster, const RasterInfo& info,
                             const std::string& shown) {
  rect_ = FindRect(info, shown);
  pixels_ = std::uint64_t{rect_.Width()} * rect_.Height();
  CheckValues(info);
  if (!region_.empty()) Measure(session, raster);
  isPart_ = !(rect_ == info.GetRect());
  if (!isPart_ && noData_.empty()) return info;
  JobDraft draft;
  RasterChain chain(draft, raster);
  AddViews(chain, Masks::kNone);
  AddQuery(draft, "area", chain.GetTop());
  chain.Close();
  return ReadInfo(session.Run(draft), "area");
}

std::string AreaOptions::Describe(const RasterInfo& info) const {
  if (rectText_.empty() && box_.empty() && region_.empty()) return {};
  return fmt::format("{},{} to {},{}, {} of {} pixels", rect_.left, rect_.top, rect_.right,
                     rect_.bottom, Grouped(pixels_),
                     Grouped(std::uint64_t{info.samples} * info.lines));
}

void AreaOptions::AddViews(RasterChain& chain) const {
  AddViews(chain, Masks::kAll);
}

/// Stands the views on one another. A mask is made of the cut raster, so that no more is read than
/// the area.
void AreaOptions::AddViews(RasterChain& chain, Masks masks) const {
  if (!noData_.empty()) AddNoData(chain, "nodata", noDataArray_);
  AddPlace(chain, masks, {});
  if (maskBand_ && masks == Masks::kAll) AddMask(chain);
}

void AreaOptions::AddViewsOfFurther(RasterChain& chain, const std::string& name,
                                    unsigned dataType) const {
  if (!noData_.empty()) AddNoData(chain, name + "_nodata", ReadNoData(dataType));
  AddPlace(chain, Masks::kAll, name + "_");
}

/// Adds the views of the region and of the rectangle, their names behind `name`.
void AreaOptions::AddPlace(RasterChain& chain, Masks masks, const std::string& name) const {
  JobDraft& draft = chain.GetDraft();
  if (!region_.empty() && masks == Masks::kAll) {
    const std::string region = name + "region";
    AddRegion(draft, region);
    chain.AddView(name + "inside", "CreateROIRasterCommand")
        .AddVariableInput("ROIDefURI", String("$" + region));
    draft.Close("close." + region, String("$" + region));
  }
  if (isPart_) {
    JobWriterCommand& view = chain.AddView(name + "area", "CreateSpatialSubsetRasterCommand");
    view.AddInput("SubRect", rect_);
    view.AddInput("Placing", Form::kExact);
  }
}

void AreaOptions::AddRegion(JobDraft& draft, const std::string& name) const {
  const LayerName from = SplitLayer(region_);
  JobWriterCommand& region = draft.Open(name, "CreateGeometryROIDefCommand");
  region.AddInput("Vectors", String(AbsoluteName(from.file)));
  if (!from.layer.empty()) region.AddInput("Layer", String(from.layer));
  if (!where_.empty()) region.AddInput("Where", String(where_));
  region.AddInput("ScanRules", String("Steady"));
  region.AddInput("Coordinates", String("Map"));
}

void AreaOptions::AddNoData(RasterChain& chain, const std::string& name,
                            const String& values) const {
  JobWriterCommand& view = chain.AddView(name, "CreateNoDataRasterCommand");
  view.AddInput("NoDataValues", values);
  view.AddInput(noData_ == "none" ? "RemoveAll" : "Replace", true);
  view.AddInput("Description", Form::kExact);
}

void AreaOptions::AddMask(RasterChain& chain) const {
  JobDraft& draft = chain.GetDraft();
  Array<unsigned> band{ArrayDims(1)};
  band[0] = *maskBand_;
  AddBandView(draft, "maskband", chain.GetTop(), band);
  JobWriterCommand& mask = draft.Open("mask", "CreateRasterMaskCommand");
  mask.AddVariableInput("SrcURI", "$maskband");
  band[0] = 0;
  mask.AddInput("MaskBands", band);
  mask.AddInput("MaskValues", maskArray_);
  mask.AddInput("Inversed", isInversed_);
  draft.Close("close.maskband", "$maskband");
  chain.AddView("masked", "CreateMaskedRasterCommand").AddVariableInput("MaskURI", "$mask");
  draft.Close("close.mask", "$mask");
}

SubRect AreaOptions::FindRect(const RasterInfo& info, const std::string& shown) const {
  return box_.empty() ? ParseRect(rectText_, info) : FindBox(info, shown);
}

SubRect AreaOptions::FindBox(const RasterInfo& info, const std::string& shown) const {
  if (info.geoRef.IsNull()) {
    throw HostError(kExitFailed, shown + ": --bbox: the raster has no geo-reference; give --rect");
  }
  const CoordSys system = boxSystem_.empty() ? CoordSys() : ReadSystem("--bbox-crs", boxSystem_);
  CheckMapToPixels(*info.geoRef, system, shown, "--bbox");
  Array<double> points = SidesOf(ParseBox(box_));
  MapToPixels(*info.geoRef, system, points);
  constexpr double kFar = std::numeric_limits<double>::infinity();
  double left = kFar, top = kFar, right = -kFar, bottom = -kFar;
  for (unsigned i = 0; i < points.GetCount(); i += 2) {
    if (!std::isfinite(points[i]) || !std::isfinite(points[i + 1])) {
      throw HostError(kExitFailed, shown + ": --bbox: the box can't be carried to the raster");
    }
    left = std::min(left, points[i]);
    right = std::max(right, points[i]);
    top = std::min(top, points[i + 1]);
    bottom = std::max(bottom, points[i + 1]);
  }
  // A side on the border of pixels, but for rounding, touches those within alone.
  constexpr double kRounding = 1e-5;
  const auto first = [](double at) { return std::floor(at + kRounding); };
  const auto last = [&](double at, double from) {
    return std::max(std::ceil(at - kRounding) - 1, first(from));
  };
  const double x0 = first(left), x1 = last(right, left), y0 = first(top), y1 = last(bottom, top);
  if (x1 < 0 || y1 < 0 || x0 >= info.samples || y0 >= info.lines) {
    throw HostError(kExitFailed,
                    fmt::format("{}: --bbox: the box lies outside the raster, from pixel {},{} to "
                                "{},{} of {} by {}",
                                shown, x0, y0, x1, y1, info.samples, info.lines));
  }
  const auto within = [](double at, unsigned size) {
    return static_cast<unsigned>(std::clamp(at, 0.0, size - 1.0));
  };
  return {within(x0, info.samples), within(y0, info.lines), within(x1, info.samples),
          within(y1, info.lines)};
}

/// Finds the pixels of the region in the rectangle, and cuts this to them.
void AreaOptions::Measure(JobSession& session, const String& raster) {
  JobDraft draft;
  AddRegion(draft);
  JobWriterCommand& measure = draft.Step("measure", "MeasureROICommand");
  measure.AddInput("URI", raster);
  measure.AddVariableInput("ROIDefURI", "$region");
  measure.AddInput("SubRect", rect_);
  draft.Close("close.region", "$region");
  const JobResults results = session.Run(draft);
  const Map<String, String>& told = results.Find("measure").returns;
  pixels_ = ParseValue<unsigned long long>(told.Find("Pixels"));
  if (pixels_ == 0) {
    const bool isAll = rectText_.empty() && box_.empty();
    throw HostError(kExitFailed, "--region: " + region_ + ": no pixel of " +
                                     (isAll ? "the raster" : "the rectangle") + " lies inside");
  }
  rect_ = ParseValue<SubRect>(told.Find("SubRect"));
}

/// Reads values as those of pixels. Throws HostError for what can't be.
void AreaOptions::CheckValues(const RasterInfo& info) {
  if (maskBand_ && *maskBand_ >= info.bands) {
    throw HostError(kExitUsage, fmt::format("--mask-band: the raster has no band {}, only 0 to {}",
                                            *maskBand_, info.bands - 1));
  }
  if (maskBand_) {
    maskArray_ = ValuesOf("--mask-values", maskValues_, info.dataType,
                          []<typename T>(const Array<T>& values) {
                            Array<Array<T>> arrays{ArrayDims(1)};
                            arrays[0] = values;
                            return FormatValue(arrays);
                          });
  }
  noDataArray_ = ReadNoData(info.dataType);
}

/// The no-data values as text of an array of pixels. Throws HostError for one that can't be.
String AreaOptions::ReadNoData(unsigned dataType) const {
  if (noData_.empty() || noData_ == "none") return FormatValue(Array<double>());
  return ValuesOf(noDataOption_, noData_, dataType,
                  [](const auto& values) { return FormatValue(values); });
}

}  // namespace lumo::host
