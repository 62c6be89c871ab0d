#pragma once

#include "regions/rasterized_geometry_roi.h"

namespace lumo {

/// A region that is carried to the grid of a raster from a grid or a coordinate system of its own.
class VEXG_EXPORT ProjectedROI : public RasterizedROI {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;

 protected:
  explicit ProjectedROI(const GeoRefPtr& geoRef) : RasterizedROI(0, 0, geoRef) {}
};

/// Shapes of another coordinate system than the raster's. Their vertices are carried; the edge
/// between two of them stays a straight line on the raster.
class VEXG_EXPORT ProjectedGeometryROI final : public ProjectedROI {
 public:
  static const unsigned TypeCode;
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
