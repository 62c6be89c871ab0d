#pragma once

#include "regions/rasterized_geometry_roi.h"

namespace lumo {

/// A region that is carried to the grid of a raster from a grid or a coordinate system of its own:
/// the base of those that differ in how they are carried. It has no size of its own.
class VEXG_EXPORT ProjectedROI : public RasterizedROI {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;

 protected:
  explicit ProjectedROI(const GeoRefPtr& geoRef) : RasterizedROI(0, 0, geoRef) {}
};

/// Shapes of another coordinate system than the raster's. Their vertices are carried; the edge
/// between two of them stays a straight line on the raster.
///
/// Ownership: shares the shapes of the definition. ROIDef() is not that definition but one of the
///            shapes as they are carried.
/// Threads:   as RasterizedROI.
/// Cost:      that of RasterizedGeometryROI, and of carrying each vertex.
/// Failure:   Mask and Mark give false, with a fault text, for shapes that can't be carried.
class VEXG_EXPORT ProjectedGeometryROI final : public ProjectedROI {
 public:
  static const unsigned TypeCode;
  /// @param definition  of the shapes, and by which rules they become pixels; not empty.
  /// @param geoRef      the grid of the raster, to whose coordinate system they are carried.
  ProjectedGeometryROI(const GeometryROIDefPtr& definition, const GeoRefPtr& geoRef);
  bool IsA(unsigned typeCode) const override;

  bool HitTest(const Point2D<unsigned>& point, ROIHitInfoPtr& info) override {
    return region_->HitTest(point, info);
  }
  bool Mask(const SubRect& rect, Array<unsigned char>& mask, std::uint64_t& count) override {
    return region_->Mask(rect, mask, count);
  }
  ROIDefPtr ROIDef() const override { return shown_; }

  bool Mark(RegionMarks& marks) override { return region_->Mark(marks); }
  RegionCover Cover(const RegionWindow& window) override { return region_->Cover(window); }

 private:
  GeometryROIDefPtr shown_;  // on a ProjectedGeometry
  RasterizedGeometryROIPtr region_;
};

}  // namespace lumo
