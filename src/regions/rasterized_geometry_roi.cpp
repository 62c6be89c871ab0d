#include "regions/rasterized_geometry_roi.h"

#include "foundation/type_code.h"
#include "regions/projected_geometry_roi.h"

namespace lumo {
const unsigned RasterizedGeometryROI::TypeCode =
    GloballyUniqueObjectTypeCode("RasterizedGeometryROI");

bool RasterizedGeometryROI::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || RasterizedROI::IsA(typeCode);
}

RasterizedGeometryROI::RasterizedGeometryROI(const GeometryROIDefPtr& definition, unsigned samples,
                                             unsigned lines, const GeoRefPtr& geoRef)
    : RasterizedROI(samples, lines, geoRef), definition_(definition) {
  if (!definition_ || !definition_->Geometry()) {
    SetErrorState(ObjectErrorNotConstructed());
    return;
  }
  projected_ = AreProjected(*definition_->Geometry(), geoRef_, definition_->Options());
  if (projected_) {
    inner_.Reset(new ProjectedGeometryROI(definition_, geoRef_));
  } else {
    geometry_.Reset(new RasterizedGeometry(definition_->Geometry(), geoRef_, samples_, lines_,
                                           definition_->Options()));
  }
}

bool RasterizedGeometryROI::HitTest(const Point2D<unsigned>& point, ROIHitInfoPtr& info) {
  info = ROIHitInfoPtr();
  std::uint32_t record = 0;
  std::uint32_t part = 0;
  if (inner_) {
    if (!inner_->HitTest(point, info)) return false;
    info->SetROIDef(definition_);
    return true;
  }
  if (!geometry_ || !geometry_->HitTest(Offset({point.x, point.y, 1, 1}), record, part)) {
    return false;
  }
  info = ROIHitInfoPtr(new GeometryROIHitInfo(definition_, record, part));
  return true;
}

bool RasterizedGeometryROI::Mask(const SubRect& rect, Array<unsigned char>& mask,
                                 std::uint64_t& count) {
  count = 0;
  if (!IsValid() || !ShapeMask(rect, mask, true)) return false;
  RegionMarks marks(WindowOf(rect), mask.GetData());
  if (!Mark(marks)) return false;
  count = marks.Count();
  return true;
}

bool RasterizedGeometryROI::Mark(RegionMarks& marks) {
  if (inner_) return inner_->Mark(marks);
  return geometry_ && marks.MarkMoved(Offset(marks.Window()),
                                      [&](RegionMarks& own) { return geometry_->Mark(own); });
}

RegionCover RasterizedGeometryROI::Cover(const RegionWindow& window) {
  if (inner_) return inner_->Cover(window);
  return geometry_ ? geometry_->Cover(Offset(window)) : RegionCover::kPartly;
}

}  // namespace lumo
