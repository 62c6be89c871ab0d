#pragma once

#include "regions/rasterized_geometry.h"
#include "regions/rasterized_roi.h"

namespace lumo {

/// Shapes on the grid of a raster. Where their coordinate system is another than the raster's, they
/// are shown in that by a ProjectedGeometryROI.
///
/// Threads, failure and cost: as those of RasterizedGeometry, which finds the pixels.
class VEXG_EXPORT RasterizedGeometryROI final : public RasterizedROI {
 public:
  static const unsigned TypeCode;
  /// @param definition     of the shapes, which it shares, and by which rules they become pixels.
  /// @param samples,lines  size of the raster, where it has no geo-reference.
  /// @param geoRef         of the grid, with its size; null for one of pixels.
  RasterizedGeometryROI(const GeometryROIDefPtr& definition, unsigned samples, unsigned lines,
                        const GeoRefPtr& geoRef);
  bool IsA(unsigned typeCode) const override;

  bool HitTest(const Point2D<unsigned>& point, ROIHitInfoPtr& info) override;
  /// As RasterizedROI::Mask, but a mask of the rectangle's size keeps its marks, and `count` is the
  /// number of those that are new.
  bool Mask(const SubRect& rect, Array<unsigned char>& mask, std::uint64_t& count) override;
  ROIDefPtr ROIDef() const override { return definition_; }

  bool Mark(RegionMarks& marks) override;
  RegionCover Cover(const RegionWindow& window) override;

 private:
  GeometryROIDefPtr definition_;
  RasterizedGeometryPtr geometry_;
};

using RasterizedGeometryROIPtr = Pointer<RasterizedGeometryROI>;

}  // namespace lumo
