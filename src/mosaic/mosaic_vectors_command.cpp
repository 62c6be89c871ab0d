#include <algorithm>
#include <cmath>

#include "commands/division.h"
#include "data/vector_records.h"
#include "foundation/fault.h"
#include "mosaic/mosaic_command.h"
#include "mosaic/mosaic_masks.h"
#include "mosaic/scene_raster.h"

namespace lumo {
namespace {

/// Names the polygons that a layer has.
enum class MosaicLayer : unsigned { kAll = 0, kFootprints = 1, kSeams = 2 };

std::span<const EnumWord<MosaicLayer>> WordsOf(MosaicLayer) {
  static constexpr EnumWord<MosaicLayer> kWords[] = {{"All", MosaicLayer::kAll},
                                                     {"Footprints", MosaicLayer::kFootprints},
                                                     {"Seams", MosaicLayer::kSeams}};
  return kWords;
}

const CommandDeclaration kVectors{
    "CreateMosaicVectorsCommand",
    "Mosaics",
    "Writes the footprints of a mosaic's scenes, and what is shown of each, as polygons to a "
    "vector file, on the map of the mosaic. A command of this library's own.",
    {{"MosaicURI", Presence::kRequired, ValueKind::kURI, "the mosaic"},
     {"Vectors", Presence::kRequired, ValueKind::kText, "the file to create"},
     {"Layer", Presence::kOptional, ValueKind::kWord,
      "All: the layers footprints and seams, of those that there are; Footprints or Seams: that "
      "one alone",
      "", &WordsIn<MosaicLayer>}},
    {{"Footprints", ValueKind::kInteger, "how many were written"},
     {"Seams", ValueKind::kInteger, "how many were written"}}};

double SignedArea(const Point2DArray<double>& ring) {
  double twice = 0;
  for (std::size_t i = 0; i + 1 < ring.size(); ++i) {
    twice += ring[i].x * ring[i + 1].y - ring[i + 1].x * ring[i].y;
  }
  return twice / 2;
}

/// True for a point inside a ring, by the even-odd rule.
bool Holds(const Point2DArray<double>& ring, const Point2D<double>& point) {
  bool isInside = false;
  for (std::size_t i = 0; i + 1 < ring.size(); ++i) {
    const Point2D<double>&a = ring[i], &b = ring[i + 1];
    if ((a.y > point.y) == (b.y > point.y)) continue;
    if (point.x < a.x + (point.y - a.y) * (b.x - a.x) / (b.y - a.y)) isInside = !isInside;
  }
  return isInside;
}

/// Puts each hole behind the smallest outer ring around it.
Contour2DArray<double> InOrder(const Contour2DArray<double>& rings) {
  std::vector<std::vector<const Contour2D<double>*>> polygons;
  for (const Contour2D<double>& ring : rings) {
    if (!ring.hole && ring.points.size() >= 4) polygons.push_back({&ring});
  }
  for (const Contour2D<double>& ring : rings) {
    if (!ring.hole || ring.points.size() < 4) continue;
    std::vector<const Contour2D<double>*>* around = nullptr;
    for (auto& polygon : polygons) {
      const Point2DArray<double>& outer = polygon.front()->points;
      if (!Holds(outer, ring.points.front())) continue;
      if (around == nullptr ||
          std::abs(SignedArea(outer)) < std::abs(SignedArea(around->front()->points))) {
        around = &polygon;
      }
    }
    if (around != nullptr) around->push_back(&ring);
  }
  Contour2DArray<double> ordered;
  for (const auto& polygon : polygons) {
    for (const Contour2D<double>* const ring : polygon) ordered.push_back(*ring);
  }
  return ordered;
}

class CreateMosaicVectorsCommand final : public MosaicCommand {
  CommandResult Execute() override {
    if (!CheckInputs()) return Fail();
    const bool isDone =
        OnMosaic([&]<typename T>(const MosaicRasterPtr<T>& mosaic) { return WriteAll(*mosaic); },
                 Storing::kNothing);
    return isDone ? Succeed() : Fail(TakeFaultOr("the polygons could not be written"));
  }

  template <typename T>
  bool WriteAll(const MosaicRaster<T>& mosaic) {
    const auto layer = Read<MosaicLayer>("Layer");
    const std::unique_ptr<MosaicMasks> masks = mosaic.MakeMasks();
    const unsigned count = mosaic.Definition()->SceneCount();
    bool haveFootprints = false;
    for (unsigned i = 0; i < count; ++i) haveFootprints |= masks->HasFootprint(i);
    const bool wantsFootprints = layer != MosaicLayer::kSeams && haveFootprints;
    const bool wantsSeams = layer != MosaicLayer::kFootprints && masks->HaveSeams();
    if (!wantsFootprints && !wantsSeams) {
      SetFault("the mosaic has no such polygons yet");
      return false;
    }
    const RasterDef def = mosaic.GetRasterDef();
    Write("Footprints", 0U);
    Write("Seams", 0U);
    if (wantsFootprints && !WriteLayer(*mosaic.Definition(), *masks, *def.geoRef, false)) {
      return false;
    }
    if (wantsSeams && !WriteLayer(*mosaic.Definition(), *masks, *def.geoRef, true)) return false;
    return sink_->Close();
  }

  bool BeginLayer(const VectorLayer& layer) {
    if (sink_) return sink_->NextLayer(layer);
    VectorRecordFactory* const factory = GetVectorRecordFactory();
    if (factory == nullptr) return false;
    sink_ = factory->Create(Read<String>("Vectors").ToUTF8(), layer);
    return bool(sink_);
  }

  bool WriteLayer(const BasicMosaicRasterDef& definition, const MosaicMasks& masks,
                  const GeoRef& grid, bool areSeams) {
    VectorLayer layer;
    layer.name = areSeams ? "seams" : "footprints";
    layer.geometry = VectorGeometry::kPolygon;
    layer.coordSys = grid.CoordinateSystem();
    layer.fields = {{"scene", VectorFieldType::kInteger},
                    {"file", VectorFieldType::kText},
                    {"area", VectorFieldType::kReal}};
    layer.isMulti = true;
    if (!BeginLayer(layer)) return false;
    unsigned written = 0;
    for (unsigned scene = 0; scene < definition.SceneCount(); ++scene) {
      if (GetIPC().abort->IsSet()) {
        SetFault("the writing of polygons was aborted");
        return false;
      }
      if (!(areSeams ? masks.HasSeam(scene) : masks.HasFootprint(scene))) continue;
      Contour2DArray<double> rings;
      const bool isRead =
          areSeams ? masks.ReadSeamRings(scene, rings) : masks.ReadFootprintRings(scene, rings);
      if (!isRead) return false;
      if (!WriteRecord(definition, scene, InOrder(rings), grid)) return false;
      ++written;
    }
    Write(areSeams ? "Seams" : "Footprints", written);
    return true;
  }

  bool WriteRecord(const BasicMosaicRasterDef& definition, unsigned scene,
                   Contour2DArray<double> rings, const GeoRef& grid) {
    VectorRecord record;
    record.geometry = VectorGeometry::kPolygon;
    double area = 0;
    for (Contour2D<double>& ring : rings) {
      Array<double> points{ArrayDims(static_cast<unsigned>(ring.points.size()), 2)};
      double* at = points.begin();
      for (const Point2D<double>& point : ring.points) {
        *at++ = point.x;
        *at++ = point.y;
      }
      if (!grid.PixelToMap(points)) {
        SetFault("a polygon can't be carried to the map of the mosaic");
        return false;
      }
      for (unsigned i = 0; i < ring.points.size(); ++i) {
        ring.points[i] = {points[2 * i], points[2 * i + 1]};
        record.coordinates.push_back(points[2 * i]);
        record.coordinates.push_back(points[2 * i + 1]);
      }
      record.partEnds.push_back(static_cast<std::uint32_t>(record.coordinates.size() / 2));
      record.holes.push_back(ring.hole ? 1 : 0);
      area += std::abs(SignedArea(ring.points)) * (ring.hole ? -1 : 1);
    }
    record.values = {std::int64_t{scene}, SceneFileOf(definition.SceneKey(scene)), area};
    return sink_->Write(record);
  }

  VectorRecordSinkPtr sink_;
};

const CommandFactoryT<CreateMosaicVectorsCommand> createMosaicVectorsFactory(kVectors);
const DivisionRegistration createMosaicVectorsDivision({.command = "CreateMosaicVectorsCommand",
                                                        .makes = {"Vectors"}});

}  // namespace
}  // namespace lumo
