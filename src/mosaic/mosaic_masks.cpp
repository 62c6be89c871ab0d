#include "mosaic/mosaic_masks.h"

#include "foundation/fault.h"
#include "georef/affine_link.h"
#include "mosaic/footprint_file.h"

namespace lumo {

MosaicMasks::MosaicMasks(const BasicMosaicRasterDef& definition, const MosaicSideFiles& files,
                         const std::vector<GeoRefPtr>& sceneModels, const GeoRefPtr& grid,
                         double scaleX, double scaleY, unsigned dataType)
    : sceneModels_(sceneModels),
      grid_(grid),
      scaleX_(scaleX),
      scaleY_(scaleY),
      dataType_(dataType) {
  for (unsigned i = 0; i < sceneModels.size(); ++i) {
    const String key = definition.SceneKey(i);
    seams_.push_back(files.seamFiles.Find(key).ToUTF8());
    footprints_.push_back(files.footprints.Find(key).ToUTF8());
    haveSeams_ = haveSeams_ || !seams_.back().empty();
  }
}

bool MosaicMasks::Read(const std::string& path, Polygon2D<std::uint32_t>& polygon) const {
  TakeFault();
  DispatchType(EightTypes{}, dataType_, [&]<typename T>() {
    polygon = ReadFootprint<T>(String(path));
    return true;
  });
  // A whole file without polygons says that nothing of the scene is shown.
  const bool isEmpty = polygon.GetErrorState().code == PolygonErrorBadPolygon::Code;
  if (polygon.IsValid() || isEmpty) return true;
  const std::string why = TakeFaultOr("holds no polygon").ToUTF8();
  SetFault(why.find(path) != why.npos ? why : path + ": " + why);
  return false;
}

bool MosaicMasks::ReadSeamRings(unsigned scene, Contour2DArray<double>& rings) const {
  Polygon2D<std::uint32_t> polygon;
  if (!Read(seams_[scene], polygon)) return false;
  for (const auto& ring : polygon.Rings()) {
    Contour2D<double>& scaled = rings.emplace_back();
    scaled.hole = ring.hole;
    for (const auto& point : ring.points) {
      scaled.points.push_back({point.x * scaleX_, point.y * scaleY_});
    }
  }
  return true;
}

bool MosaicMasks::ReadFootprintRings(unsigned scene, Contour2DArray<double>& rings) const {
  Polygon2D<std::uint32_t> polygon;
  if (!Read(footprints_[scene], polygon)) return false;
  const GeoRef& model = *sceneModels_[scene];
  const double shift = model.GetType() == GeoRef::kRpc ? 0.5 : 0.0;  // counts from its middle
  for (const auto& ring : polygon.Rings()) {
    Array<double> points{ArrayDims(static_cast<unsigned>(ring.points.size()), 2)};
    double* at = points.begin();
    for (const auto& point : ring.points) {
      *at++ = point.x - shift;
      *at++ = point.y - shift;
    }
    if (!CarryPixels(model, *grid_, points)) continue;
    Contour2D<double>& carried = rings.emplace_back();
    carried.hole = ring.hole;
    for (unsigned i = 0; i + 1 < points.GetCount(); i += 2) {
      carried.points.push_back({points[i], points[i + 1]});
    }
  }
  return true;
}

MosaicMasks::Shape MosaicMasks::Seam(unsigned scene) {
  return seamShapes_.Get(scene, [&]() -> Shape {
    Contour2DArray<double> rings;
    if (!ReadSeamRings(scene, rings)) return {};
    return std::make_shared<const MaskShape>(std::move(rings), grid_->Lines());
  });
}

MosaicMasks::Shape MosaicMasks::Footprint(unsigned scene) {
  return footprintShapes_.Get(scene, [&]() -> Shape {
    Contour2DArray<double> rings;
    if (!ReadFootprintRings(scene, rings)) return {};
    return std::make_shared<const MaskShape>(std::move(rings), grid_->Lines());
  });
}

}  // namespace lumo
