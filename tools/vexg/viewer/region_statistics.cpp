#include "viewer/region_statistics.h"

#include <cmath>
#include <cstdio>
#include <fstream>

#include <fmt/format.h>

#include "rasters/band_table.h"
#include "rasters/map_points.h"
#include "stats/turn.h"
#include "verb.h"

namespace lumo::host {
namespace {

bool HasGrid(const ViewedRaster& raster) {
  return !raster.GetGeoRef().IsNull() && raster.GetGeoRef()->GetType() == GeoRef::kStd;
}

/// A file that goes away with the object.
class RegionFile {
 public:
  RegionFile(WorkFolder& folder, const Json& text) : path_(folder.NewPath(".geojson")) {
    std::ofstream out(path_);
    out << text.dump();
    if (!out.flush()) throw HostError(kExitFailed, "the region could not be written");
  }
  ~RegionFile() { std::remove(path_.c_str()); }
  RegionFile(const RegionFile&) = delete;
  RegionFile& operator=(const RegionFile&) = delete;
  const std::string& GetPath() const { return path_; }

 private:
  const std::string path_;
};

void AddRegion(JobDraft& draft, const ViewedRaster& raster, const RegionFile& file) {
  JobWriterCommand& region = draft.Open("region", "CreateGeometryROIDefCommand");
  region.AddInput("Vectors", String(file.GetPath()));
  region.AddInput("ScanRules", String("Steady"));
  region.AddInput("Coordinates", String(HasGrid(raster) ? "Map" : "Pixel"));
}

/// The rectangle around the region, and how many pixels lie in it.
struct Extent {
  SubRect rect;
  unsigned long long pixels;
};

Extent Measure(const ViewedRaster& raster, const RegionFile& file) {
  JobDraft draft;
  RasterChain chain(draft);
  raster.AddTo(chain);
  AddRegion(draft, raster, file);
  JobWriterCommand& measure = draft.Step("measure", "MeasureROICommand");
  measure.AddVariableInput("URI", chain.GetTop());
  measure.AddVariableInput("ROIDefURI", "$region");
  draft.Close("close.region", "$region");
  chain.Close();
  const JobResults results = raster.GetDoor().Run(draft);
  const Map<String, String>& told = results.Find("measure").returns;
  return {ParseValue<SubRect>(told.Find("SubRect")),
          ParseValue<unsigned long long>(told.Find("Pixels"))};
}

}  // namespace

Json RegionAsGeoJson(const ViewedRaster& raster, const PixelRing& ring) {
  Array<double> points{ArrayDims(static_cast<unsigned>(ring.size()), 2)};
  for (unsigned i = 0; i < ring.size(); ++i) {
    points[2 * i] = ring[i].first;
    points[2 * i + 1] = ring[i].second;
  }
  Json document{{"type", "FeatureCollection"}};
  if (HasGrid(raster)) {
    const GeoRef& model = *raster.GetGeoRef();
    model.PixelToMap(points);
    const unsigned epsg = raster.GetDescription()["geoRef"]["epsg"];
    const bool isKnown = !model.CoordinateSystem().IsEmpty();
    if (epsg != 0) {
      document["crs"] = {{"type", "name"},
                         {"properties", {{"name", fmt::format("urn:ogc:def:crs:EPSG::{}", epsg)}}}};
    } else if (isKnown) {
      MapToMap(model.CoordinateSystem(), ReadSystem("crs", "EPSG:4326"), points);
    } else {
      document["crs"] = nullptr;
    }
  } else {
    document["crs"] = nullptr;
  }
  Json corners = Json::array();
  for (unsigned i = 0; i < points.GetCount(); i += 2) {
    if (!std::isfinite(points[i]) || !std::isfinite(points[i + 1])) {
      throw HostError(kExitFailed, "the region can't be carried to the map");
    }
    corners.push_back({points[i], points[i + 1]});
  }
  const Json geometry{{"type", "Polygon"}, {"coordinates", Json::array({corners})}};
  document["features"] =
      Json::array({{{"type", "Feature"}, {"properties", Json::object()}, {"geometry", geometry}}});
  return document;
}

Json RegionStatistics(const ViewedRaster& raster, const Json& geoJson, WorkFolder& folder) {
  const RegionFile file(folder, geoJson);
  const Extent extent = Measure(raster, file);
  if (extent.pixels == 0) return {{"pixels", 0}, {"bands", Json::array()}};
  JobDraft draft;
  RasterChain chain(draft);
  raster.AddTo(chain);
  AddRegion(draft, raster, file);
  chain.AddView("inside", "CreateROIRasterCommand")
      .AddVariableInput("ROIDefURI", String("$region"));
  JobWriterCommand& part = chain.AddView("area", "CreateSpatialSubsetRasterCommand");
  part.AddInput("SubRect", extent.rect);
  part.AddInput("Placing", Form::kExact);
  JobWriterCommand& stats = draft.Step("stats", "GetBasicRasterStatsCommand");
  stats.AddVariableInput("URI", chain.GetTop());
  stats.AddInput("Wait", Waiting::kAlways);
  draft.Close("close.region", "$region");
  chain.Close();
  const JobResults results = raster.GetDoor().Run(draft);
  Array<unsigned> bands{ArrayDims(raster.Bands())};
  for (unsigned band = 0; band < raster.Bands(); ++band) bands[band] = band;
  const BandTable table =
      ReadTable(results.Find("stats").returns, raster.GetName(), false, bands, raster.Code());
  return {{"pixels", extent.pixels}, {"bands", AsJson(table)}};
}

}  // namespace lumo::host
