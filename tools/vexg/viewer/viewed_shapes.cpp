#include "viewer/viewed_shapes.h"

#include <algorithm>
#include <cmath>
#include <set>
#include <tuple>

#include "rasters/map_points.h"
#include "rasters/raster_source.h"
#include "regions/shape_file.h"
#include "verb.h"

namespace lumo::host {
namespace {

constexpr std::size_t kMostShapes = 20000;        // of an answer
constexpr std::size_t kMostVertices = 1'000'000;  // of a small file
constexpr double kScreen = 2000;                  // pixels, of a view that isn't told

Json AsJson(const VectorValue& value) {
  if (const auto* const whole = std::get_if<std::int64_t>(&value)) return *whole;
  if (const auto* const real = std::get_if<double>(&value)) return NumberAsJson(*real);
  if (const auto* const text = std::get_if<std::string>(&value)) return *text;
  return {};
}

/// The vertices of a record in pixels; none where one of them can't be carried.
std::vector<double> PointsOf(const VectorRecord& record, const CoordSys& system,
                             const GeoRefPtr& grid) {
  Array<double> points{ArrayDims(static_cast<unsigned>(record.coordinates.size() / 2), 2)};
  std::copy_n(record.coordinates.begin(), points.GetCount(), points.begin());
  if (!grid.IsNull()) {
    const bool isCarried = !system.IsEmpty() && !grid->CoordinateSystem().IsEmpty();
    MapToPixels(*grid, isCarried ? system : CoordSys(), points);
  }
  const bool isWhole =
      std::all_of(points.begin(), points.end(), [](double value) { return std::isfinite(value); });
  return isWhole ? std::vector<double>(points.begin(), points.end()) : std::vector<double>();
}

/// The polygons of parts, each of an outer ring and the holes behind it.
Json PolygonsOf(const std::vector<std::uint8_t>& holes, const Json& parts) {
  Json polygons = Json::array();
  for (std::size_t i = 0; i < parts.size(); ++i) {
    const bool isHole = i < holes.size() && holes[i] != 0;
    if (!isHole || polygons.empty()) polygons.push_back(Json::array());
    polygons.back().push_back(parts[i]);
  }
  return {{"type", "MultiPolygon"}, {"coordinates", polygons}};
}

Json GeometryOf(VectorGeometry kind, const std::vector<std::uint8_t>& holes, const Json& parts) {
  if (kind == VectorGeometry::kPolygon) return PolygonsOf(holes, parts);
  if (kind == VectorGeometry::kLine) {
    return {{"type", "MultiLineString"}, {"coordinates", parts}};
  }
  Json points = Json::array();
  for (const Json& part : parts) points.insert(points.end(), part.begin(), part.end());
  return {{"type", "MultiPoint"}, {"coordinates", points}};
}

}  // namespace

ViewedShapes::ViewedShapes(const std::string& file, const GeoRefPtr& grid) {
  const VectorRecordSourcePtr source = OpenShapes(file);
  if (!source) throw HostError(kExitFailed, FaultOfShapes(file));
  for (std::uint32_t layer = 0; layer < source->LayerCount(); ++layer) {
    ReadLayer(*source, layer, grid);
  }
}

void ViewedShapes::ReadLayer(VectorRecordSource& source, std::uint32_t number,
                             const GeoRefPtr& grid) {
  const VectorLayer layer = source.Layer(number);
  if (!layer.hasShapes || !source.Begin(number, nullptr)) return;
  layers_.push_back(layer.name);
  for (VectorRecord record; source.Next(record);) {
    if (record.partEnds.empty()) continue;
    Shape shape;
    shape.layer = static_cast<std::uint32_t>(layers_.size() - 1);
    shape.kind = record.geometry;
    shape.points = PointsOf(record, layer.coordSys, grid);
    if (shape.points.empty()) continue;
    shape.partEnds = record.partEnds;
    shape.holes.assign(record.holes.begin(), record.holes.end());
    shape.left = shape.right = shape.points[0];
    shape.top = shape.bottom = shape.points[1];
    for (std::size_t i = 0; i + 1 < shape.points.size(); i += 2) {
      shape.left = std::min(shape.left, shape.points[i]);
      shape.right = std::max(shape.right, shape.points[i]);
      shape.top = std::min(shape.top, shape.points[i + 1]);
      shape.bottom = std::max(shape.bottom, shape.points[i + 1]);
    }
    vertices_ += shape.points.size() / 2;
    for (std::size_t i = 0; IsSmall() && i < layer.fields.size() && i < record.values.size(); ++i) {
      shape.properties[layer.fields[i].name] = AsJson(record.values[i]);
    }
    shapes_.push_back(std::move(shape));
  }
  if (IsSmall()) return;
  for (Shape& shape : shapes_) shape.properties = Json();  // of a large file nobody asks for them
}

bool ViewedShapes::IsSmall() const {
  return shapes_.size() <= kMostShapes && vertices_ <= kMostVertices;
}

/// @param apart  vertices that lie nearer than this to the one before are left out.
Json ViewedShapes::FeatureOf(const Shape& shape, double apart) const {
  Json parts = Json::array();
  std::uint32_t at = 0;
  for (const std::uint32_t end : shape.partEnds) {
    Json part = Json::array();
    double keptX = 0, keptY = 0;
    for (const std::uint32_t first = at; at < end; ++at) {
      const double x = shape.points[2 * at], y = shape.points[2 * at + 1];
      const bool isEnd = at == first || at + 1 == end;
      if (!isEnd && std::hypot(x - keptX, y - keptY) < apart) continue;
      part.push_back({x, y});
      keptX = x;
      keptY = y;
    }
    parts.push_back(std::move(part));
  }
  Json properties = shape.properties.is_object() ? shape.properties : Json::object();
  properties["layer"] = layers_[shape.layer];
  return {{"type", "Feature"},
          {"properties", properties},
          {"geometry", GeometryOf(shape.kind, shape.holes, parts)}};
}

/// Chooses what a view shows of a large file.
std::vector<const ViewedShapes::Shape*> ViewedShapes::Choose(const ShapeView& view,
                                                             Json& told) const {
  std::vector<const Shape*> chosen;
  std::set<std::tuple<std::uint32_t, double, double>> taken;  // pixels of the screen
  std::size_t inView = 0;
  for (const Shape& shape : shapes_) {
    if (shape.left > view.right || shape.right < view.left || shape.top > view.bottom ||
        shape.bottom < view.top) {
      continue;
    }
    ++inView;
    if (shape.Size() < view.step) {
      const double column = std::floor(shape.left / view.step);
      const double row = std::floor(shape.top / view.step);
      if (!taken.emplace(shape.layer, column, row).second) continue;
    }
    chosen.push_back(&shape);
  }
  told["inView"] = inView;
  told["left"] = chosen.size() - std::min(chosen.size(), kMostShapes);
  if (chosen.size() > kMostShapes) {
    const auto last = chosen.begin() + kMostShapes;
    std::nth_element(chosen.begin(), last, chosen.end(),
                     [](const Shape* a, const Shape* b) { return a->Size() > b->Size(); });
    chosen.erase(last, chosen.end());
  }
  return chosen;
}

Json ViewedShapes::Give(const std::optional<ShapeView>& view) const {
  Json document{{"type", "FeatureCollection"}, {"layers", layers_}, {"isWhole", IsSmall()}};
  Json features = Json::array();
  if (IsSmall()) {
    document["inView"] = shapes_.size();
    document["left"] = 0;
    for (const Shape& shape : shapes_) features.push_back(FeatureOf(shape, 0));
    document["features"] = std::move(features);
    return document;
  }
  ShapeView all{shapes_[0].left, shapes_[0].top, shapes_[0].right, shapes_[0].bottom, 1};
  for (const Shape& shape : shapes_) {
    all = {std::min(all.left, shape.left), std::min(all.top, shape.top),
           std::max(all.right, shape.right), std::max(all.bottom, shape.bottom), 1};
  }
  all.step = std::max(all.right - all.left, all.bottom - all.top) / kScreen;
  const ShapeView& shown = view ? *view : all;
  for (const Shape* const shape : Choose(shown, document)) {
    features.push_back(FeatureOf(*shape, shown.step / 2));
  }
  document["features"] = std::move(features);
  return document;
}

ViewedShapes ReadMosaicShapes(JobDoor& door, const std::string& mosaic, const GeoRefPtr& grid,
                              const std::string& work) {
  JobDraft draft;
  AddOpen(draft, "mosaic", {mosaic, ""});
  JobWriterCommand& step = draft.Step("vectors", "CreateMosaicVectorsCommand");
  step.AddVariableInput("MosaicURI", "$mosaic");
  step.AddInput("Vectors", String(work));
  draft.Close("close", "$mosaic");
  door.Run(draft);
  return {work, grid};
}

}  // namespace lumo::host
