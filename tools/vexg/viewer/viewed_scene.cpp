#include "viewer/viewed_scene.h"

#include <algorithm>
#include <atomic>
#include <cmath>
#include <cstdlib>
#include <filesystem>

#include <fmt/format.h>

#include "foundation/text_case.h"
#include "foundation/thrown.h"
#include "raster/raster_details.h"
#include "rasters/map_points.h"
#include "rasters/value_names.h"
#include "verb.h"
#include "views/sources/catalog_raster_ref.h"

namespace lumo::host {
namespace {

constexpr std::size_t kKeptCuts = 6;
constexpr std::size_t kKeptAttributes = 4;

bool IsTreeName(const std::string& file) {
  return std::filesystem::path(file).extension() == ".tree";
}

/// The colours and names of the values of the first band; null where it has none.
Json ReadLegend(const ViewedRaster& raster) {
  const Json& palette = raster.GetDescription()["palettes"][0];
  if (palette.is_null()) return {};
  JobDraft draft;
  RasterChain chain(draft);
  raster.AddTo(chain);
  JobWriterCommand& ask = draft.Step("categories", "GetRasterCategoriesCommand");
  ask.AddVariableInput("URI", chain.GetTop());
  ask.AddInput("Band", 0U);
  chain.Close();
  const String text = raster.GetDoor().Run(draft).Find("categories").returns.Find("Categories");
  const auto names = ReadValueNames(text);
  Json legend = Json::array();
  for (unsigned value = 0; value < palette.size(); ++value) {
    const bool hasName = value < names.size() && !names[value].empty();
    legend.push_back({{"value", value},
                      {"name", hasName ? names[value] : std::string()},
                      {"color", palette[value]}});
  }
  return legend;
}

/// A detail of a band; empty where there is none.
std::string DetailOf(const Json& details, unsigned band, const char* what) {
  const auto at = details.find(fmt::format("Bands/{}/{}", band, what));
  return at != details.end() && at->is_string() ? at->get<std::string>() : std::string();
}

/// The wavelength of a band in nm, from its items or its name, as "640 nm"; null for none.
Json WavelengthOf(const Json& details, unsigned band) {
  const std::string item = DetailOf(details, band, "Items/wavelength");
  const std::string text = item.empty() ? DetailOf(details, band, "Description") : item;
  const std::string unit = item.empty() ? text : DetailOf(details, band, "Items/wavelength_units");
  char* end = nullptr;
  const double value = std::strtod(text.c_str(), &end);
  if (end == text.c_str() || !(value > 0)) return {};
  const std::string lower = LowerCase(unit);
  if (lower.ends_with("nm") || lower.starts_with("nano")) return value;
  if (lower.ends_with("um") || lower.ends_with("\u00b5m") || lower.starts_with("micro")) {
    return 1000 * value;
  }
  return {};
}

/// The place of a point on the map, and in longitude and latitude where that can be known.
Json PlaceOf(const GeoRefPtr& geoRef, double x, double y) {
  Json place;
  if (geoRef.IsNull()) return place;
  Array<double> points{ArrayDims(1, 2)};
  points[0] = x;
  points[1] = y;
  ShiftPixels(points, FirstPixel(*geoRef));
  if (!geoRef->PixelToMap(points) || !std::isfinite(points[0])) return place;
  place["map"] = {points[0], points[1]};
  if (geoRef->GetType() == GeoRef::kRpc) {
    place["degrees"] = place["map"];  // which is what such a model gives
    place.erase("map");
    return place;
  }
  if (geoRef->CoordinateSystem().IsEmpty()) return place;
  MapToMap(geoRef->CoordinateSystem(), ReadSystem("map", "EPSG:4326"), points);
  if (std::isfinite(points[0]) && std::isfinite(points[1])) {
    place["degrees"] = {points[0], points[1]};
  }
  return place;
}

}  // namespace

ViewedScene::ViewedScene(JobDoor& door, const ViewRequest& request, WorkFolder& folder)
    : door_(door), folder_(folder) {
  for (const std::string& file : request.files) Add(Role::kImage, file);
  AddOpenRasters(request.open);
  if (!request.mosaic.empty()) Add(Role::kImage, request.mosaic);
  if (!request.classes.empty()) Add(Role::kClasses, request.classes);
  if (!request.labels.empty()) Add(Role::kLabels, request.labels);
  if (!request.mosaic.empty()) {
    shapes_.push_back(ReadMosaicShapes(door_, request.mosaic, grid_, folder_.NewPath(".gpkg")));
    shapeNames_.push_back(std::filesystem::path(request.mosaic).filename().string());
  }
  if (!request.shapes.empty()) {
    shapes_.emplace_back(request.shapes, grid_);
    shapeNames_.push_back(std::filesystem::path(request.shapes).filename().string());
  }
}

void ViewedScene::Add(Role role, const std::string& file) {
  Entry entry{role, "", nullptr, {}};
  if (role == Role::kLabels && IsTreeName(file)) {
    entry.tree = file;
    entry.raster = std::make_shared<ViewedRaster>(door_, TreeCutRequest{file, {}, {}});
  } else {
    entry.raster = std::make_shared<ViewedRaster>(
        door_, SourceOptions{file, ""}, GridToCarryTo(),
        role == Role::kImage ? ViewedRaster::Levels::kAll : ViewedRaster::Levels::kPicked);
    entry.legend = ReadLegend(*entry.raster);
  }
  if (role == Role::kLabels && !entries_.empty() && !entry.tree.empty() &&
      (entry.raster->Samples() != entries_.front().raster->Samples() ||
       entry.raster->Lines() != entries_.front().raster->Lines())) {
    throw HostError(kExitFailed, file + ": --labels: the segments have another size");
  }
  AddRaster(std::move(entry));
}

/// Adds those of the rasters that can be shown, and says of which others there are.
void ViewedScene::AddOpenRasters(const std::vector<String>& uris) {
  constexpr std::size_t kMostRasters = 32;
  std::size_t left = 0;
  for (const String& uri : uris) {
    if (entries_.size() >= kMostRasters) {
      ++left;
      continue;
    }
    try {
      Entry entry{Role::kImage, "", nullptr, {}};
      entry.raster =
          std::make_shared<ViewedRaster>(door_, uri, GridToCarryTo(), ViewedRaster::Levels::kAll);
      entry.legend = ReadLegend(*entry.raster);
      AddRaster(std::move(entry));
    } catch (const HostError& error) {
      if (error.code == kExitNoServer) throw;
      Say(fmt::format("note: {} is not shown: {}", uri.ToUTF8(), error.what()));
    }
  }
  if (left != 0) Say(fmt::format("note: {} more rasters are open, and not shown", left));
}

GeoRefPtr ViewedScene::GridToCarryTo() const {
  return !grid_.IsNull() && grid_->GetType() == GeoRef::kStd ? grid_ : GeoRefPtr();
}

void ViewedScene::AddRaster(Entry entry) {
  if (entries_.empty()) grid_ = entry.raster->GetGeoRef();
  entries_.push_back(std::move(entry));
}

Json ViewedScene::DescribeEntry(const Entry& entry) const {
  constexpr const char* kRoles[] = {"image", "labels", "classes"};
  const ViewedRaster& raster = *entry.raster;
  const Json& told = raster.GetDescription();
  Json names = Json::array(), meanings = Json::array(), wavelengths = Json::array();
  for (unsigned band = 0; band < raster.Bands(); ++band) {
    const std::string name = DetailOf(told["details"], band, "Description");
    meanings.push_back(DetailOf(told["details"], band, "Meaning"));
    names.push_back(name.empty() ? meanings.back() : Json(name));
    wavelengths.push_back(WavelengthOf(told["details"], band));
  }
  return {{"name", raster.GetName()},
          {"role", kRoles[static_cast<int>(entry.role)]},
          {"isTree", !entry.tree.empty()},
          {"samples", raster.Samples()},
          {"lines", raster.Lines()},
          {"bands", raster.Bands()},
          {"bandNames", names},
          {"bandMeanings", meanings},
          {"wavelengths", wavelengths},
          {"type", told["type"]},
          {"format", told["format"]},
          {"noData", told["noData"]},
          {"levels", raster.LevelCount()},
          {"hasLevels", raster.HasLevels()},
          {"isFile", raster.IsFile()},
          {"geoRef", told["geoRef"]},
          {"legend", entry.legend}};
}

Json ViewedScene::Describe() const {
  const std::lock_guard lock(mutex_);
  Json rasters = Json::array();
  for (const Entry& entry : entries_) rasters.push_back(DescribeEntry(entry));
  return {{"rasters", rasters}, {"shapes", shapeNames_}};
}

std::shared_ptr<const ViewedRaster> ViewedScene::GetRaster(std::size_t number, double cost) {
  std::string tree;
  {
    const std::lock_guard lock(mutex_);
    const Entry& entry = entries_.at(number);
    if (entry.tree.empty() || !(cost > 0)) return entry.raster;
    for (const Cut& cut : cuts_) {
      if (cut.number == number && cut.cost == cost) return cut.raster;
    }
    tree = entry.tree;
  }
  const auto raster = std::make_shared<ViewedRaster>(door_, TreeCutRequest{tree, cost, {}});
  const std::lock_guard lock(mutex_);
  cuts_.push_front({number, cost, raster});
  if (cuts_.size() > kKeptCuts) cuts_.pop_back();
  return raster;
}

Json ViewedScene::GetLegend(std::size_t number) const {
  const std::lock_guard lock(mutex_);
  return entries_.at(number).legend;
}

std::shared_ptr<SegmentAttributes> ViewedScene::GetAttributes(std::size_t number, double cost) {
  const std::shared_ptr<const ViewedRaster> labels = GetRaster(number, cost);
  std::shared_ptr<SegmentAttributes> dropped;  // goes after the lock
  const std::lock_guard lock(mutex_);
  for (const Attributes& kept : attributes_) {
    if (kept.number == number && kept.cost == cost) return kept.values;
  }
  const std::shared_ptr<const ViewedRaster> scene = entries_.front().raster;
  if (scene->Samples() != labels->Samples() || scene->Lines() != labels->Lines()) {
    throw HostError(kExitFailed, "the labels have another size than the first raster");
  }
  attributes_.push_front(
      {number, cost, std::make_shared<SegmentAttributes>(scene, labels, folder_)});
  if (attributes_.size() > kKeptAttributes) {
    dropped = attributes_.back().values;
    attributes_.pop_back();
  }
  return attributes_.front().values;
}

Json ViewedScene::FindSegment(std::size_t number, unsigned x, unsigned y, double cost) {
  const Json label = GetRaster(number, cost)->ReadValues(x, y)[0];
  if (label.is_null()) return {{"label", nullptr}};
  const auto value = static_cast<std::uint32_t>(std::stoll(label.get<std::string>()));
  Json found = GetAttributes(number, cost)->Find(value);
  found["label"] = value;
  return found;
}

Json ViewedScene::FindScales(std::size_t number) {
  std::string tree;
  {
    const std::lock_guard lock(mutex_);
    tree = entries_.at(number).tree;
  }
  if (tree.empty()) throw HostError(kExitFailed, "there is no tree of this number");
  JobDraft draft;
  AddSuggest(draft, tree);
  const ScaleCurve curve = ScaleCurve::Read(door_.Run(draft));
  return {{"costs", curve.mergeValues}, {"segments", curve.segments}, {"peaks", curve.peaks}};
}

Json ViewedScene::ReadPixel(unsigned x, unsigned y, double cost) {
  Json rasters = Json::array();
  for (std::size_t number = 0; number < RasterCount(); ++number) {
    const std::shared_ptr<const ViewedRaster> raster = GetRaster(number, cost);
    const bool isInside = x < raster->Samples() && y < raster->Lines();
    rasters.push_back(isInside ? raster->ReadValues(x, y) : Json());
  }
  return {{"x", x}, {"y", y}, {"values", rasters}, {"place", PlaceOf(grid_, x + 0.5, y + 0.5)}};
}

/// Builds the levels of an open raster, and closes it.
void ViewedScene::Build(const String& uri, unsigned last) {
  JobDraft draft;
  JobWriterCommand& build = draft.Step("build", "BuildRasterPyramidCommand");
  build.AddInput("URI", uri);
  build.AddInput("PyramidType", String("ORVA"));
  build.AddInput("PyramidResamplingMethod", String("Nearest"));
  build.AddInput("PyramidLevelMin", 1U);
  build.AddInput("PyramidLevelMax", last);
  build.AddInput("PyramidCanBuild", true);
  build.AddInput("TileDimensions", TileDimensions{256, 256});
  build.AddInput("Bins", Form::kExact);
  std::string fault;
  try {
    door_.Run(draft, &pyramidAbort_, &pyramidProgress_);
  } catch (...) {
    fault = DescribeException();
  }
  JobDraft closing;
  closing.Close("close", uri);
  door_.RunOpening(closing);
  if (!fault.empty()) throw HostError(kExitFailed, fault);
}

void ViewedScene::RunPyramid(std::size_t number) {
  std::string fault;
  try {
    const SourceOptions source = GetRaster(number)->GetSource();
    JobDraft opening;
    JobWriterCommand& open = opening.Open("raster", "OpenRasterCommand");
    open.AddInput("CheckSource", SourceCheck::kCompared);
    open.AddInput("ConnStr", ConnStringsOf(source));
    open.AddInput("PyramidConnStr",
                  ConnStrings({"Pyramid", String(PyramidPathOf(FileOf(source)))}));
    open.AddInput("PyramidNew", true);
    Build(URIOf(door_.RunOpening(opening), "$raster"), GetRaster(number)->LevelCount() - 1);
    const auto raster =
        std::make_shared<ViewedRaster>(door_, source, GeoRefPtr(), ViewedRaster::Levels::kAll);
    const std::lock_guard lock(mutex_);
    entries_.at(number).raster = raster;
  } catch (...) {
    fault = DescribeException();
  }
  const std::lock_guard lock(mutex_);
  building_ = fault.empty() ? Building::kDone : Building::kFailed;
  pyramidFault_ = fault;
}

Json ViewedScene::BuildPyramid(std::size_t number) {
  {
    const std::lock_guard lock(mutex_);
    const Entry& entry = entries_.at(number);
    if (!entry.raster->IsFile() || entry.raster->LevelCount() < 2) {
      throw HostError(kExitFailed, entry.raster->GetName() + ": a pyramid is of no use to it");
    }
    if (building_ != Building::kRuns) {
      if (pyramid_.joinable()) pyramid_.join();
      building_ = Building::kRuns;
      pyramidProgress_ = 0;
      pyramid_ = std::thread([this, number] { RunPyramid(number); });
    }
  }
  return TellPyramid();
}

Json ViewedScene::TellPyramid() {
  const std::lock_guard lock(mutex_);
  constexpr const char* kWords[] = {"none", "runs", "done", "failed"};
  Json told{{"state", kWords[static_cast<int>(building_)]},
            {"progress", std::atomic_ref(pyramidProgress_).load()}};
  if (building_ == Building::kFailed) told["fault"] = pyramidFault_;
  return told;
}

void ViewedScene::Stop() {
  std::atomic_ref(pyramidAbort_).store(1);
  std::thread running;
  std::deque<Attributes> dropped;
  {
    const std::lock_guard lock(mutex_);
    running.swap(pyramid_);
    dropped.swap(attributes_);
  }
  dropped.clear();
  if (running.joinable()) running.join();
}

}  // namespace lumo::host
