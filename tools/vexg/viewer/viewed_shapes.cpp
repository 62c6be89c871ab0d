#include "viewer/viewed_shapes.h"

#include <cmath>

#include "data/vector_records.h"
#include "rasters/map_points.h"
#include "rasters/raster_source.h"
#include "regions/shape_file.h"
#include "verb.h"

namespace lumo::host {
namespace {

Json AsJson(const VectorValue& value) {
  if (const auto* const whole = std::get_if<std::int64_t>(&value)) return *whole;
  if (const auto* const real = std::get_if<double>(&value)) return NumberAsJson(*real);
  if (const auto* const text = std::get_if<std::string>(&value)) return *text;
  return {};
}

/// The vertices of a record in pixels, part by part; none where one of them can't be carried.
Json PartsOf(const VectorRecord& record, const CoordSys& system, const GeoRefPtr& grid) {
  Array<double> points{ArrayDims(static_cast<unsigned>(record.coordinates.size() / 2), 2)};
  std::copy_n(record.coordinates.begin(), points.GetCount(), points.begin());
  if (!grid.IsNull()) {
    const bool isCarried = !system.IsEmpty() && !grid->CoordinateSystem().IsEmpty();
    MapToPixels(*grid, isCarried ? system : CoordSys(), points);
  }
  Json parts = Json::array();
  std::uint32_t at = 0;
  for (const std::uint32_t end : record.partEnds) {
    Json part = Json::array();
    for (; at < end; ++at) {
      const double x = points[2 * at], y = points[2 * at + 1];
      if (!std::isfinite(x) || !std::isfinite(y)) return Json::array();
      part.push_back({x, y});
    }
    parts.push_back(std::move(part));
  }
  return parts;
}

Json PolygonsOf(const VectorRecord& record, const Json& parts) {
  Json polygons = Json::array();
  for (std::size_t i = 0; i < parts.size(); ++i) {
    const bool isHole = i < record.holes.size() && record.holes[i] != 0;
    if (!isHole || polygons.empty()) polygons.push_back(Json::array());
    polygons.back().push_back(parts[i]);
  }
  return {{"type", "MultiPolygon"}, {"coordinates", polygons}};
}

Json GeometryOf(const VectorRecord& record, const Json& parts) {
  if (record.geometry == VectorGeometry::kPolygon) return PolygonsOf(record, parts);
  if (record.geometry == VectorGeometry::kLine) {
    return {{"type", "MultiLineString"}, {"coordinates", parts}};
  }
  Json points = Json::array();
  for (const Json& part : parts) points.insert(points.end(), part.begin(), part.end());
  return {{"type", "MultiPoint"}, {"coordinates", points}};
}

void ReadLayer(VectorRecordSource& source, std::uint32_t number, const GeoRefPtr& grid,
               Json& document) {
  const VectorLayer layer = source.Layer(number);
  if (!layer.hasShapes || !source.Begin(number, nullptr)) return;
  Json& features = document["features"];
  for (VectorRecord record; source.Next(record);) {
    if (record.partEnds.empty()) continue;
    if (features.size() >= kMostShapes) {
      document["more"] = true;
      return;
    }
    const Json parts = PartsOf(record, layer.coordSys, grid);
    if (parts.empty()) continue;
    Json properties{{"layer", layer.name}};
    for (std::size_t i = 0; i < layer.fields.size() && i < record.values.size(); ++i) {
      properties[layer.fields[i].name] = AsJson(record.values[i]);
    }
    features.push_back(
        {{"type", "Feature"}, {"properties", properties}, {"geometry", GeometryOf(record, parts)}});
  }
}

}  // namespace

Json ReadViewedShapes(const std::string& file, const GeoRefPtr& grid) {
  const VectorRecordSourcePtr source = OpenShapes(file);
  if (!source) throw HostError(kExitFailed, FaultOfShapes(file));
  Json document{{"type", "FeatureCollection"}, {"features", Json::array()}, {"more", false}};
  for (std::uint32_t layer = 0; layer < source->LayerCount(); ++layer) {
    ReadLayer(*source, layer, grid, document);
  }
  return document;
}

Json ReadMosaicShapes(JobDoor& door, const std::string& mosaic, const GeoRefPtr& grid,
                      const std::string& work) {
  JobDraft draft;
  AddOpen(draft, "mosaic", {mosaic, ""});
  JobWriterCommand& step = draft.Step("vectors", "CreateMosaicVectorsCommand");
  step.AddVariableInput("MosaicURI", "$mosaic");
  step.AddInput("Vectors", String(work));
  draft.Close("close", "$mosaic");
  door.Run(draft);
  return ReadViewedShapes(work, grid);
}

}  // namespace lumo::host
