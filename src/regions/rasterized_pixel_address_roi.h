#pragma once

#include "regions/pixel_address_roi_def.h"
#include "regions/rasterized_roi.h"

namespace lumo {

/// Addresses of pixels on the grid of a raster. Where the definition's grid is the raster's, they
/// are used as they stand; where it is that one moved, they are moved; else they are carried by a
/// ProjectedPixelAddressROI.
class VEXG_EXPORT RasterizedPixelAddressROI final : public RasterizedROI {
 public:
  static const unsigned TypeCode;
  RasterizedPixelAddressROI(const PixelAddressROIDefPtr& definition, unsigned samples,
                            unsigned lines, const GeoRefPtr& geoRef);
  bool IsA(unsigned typeCode) const override;

  bool HitTest(const Point2D<unsigned>& point, ROIHitInfoPtr& info) override;
  bool Mask(const SubRect& rect, Array<unsigned char>& mask, std::uint64_t& count) override;
  ROIDefPtr ROIDef() const override { return definition_; }

  bool Mark(RegionMarks& marks) override;
  RegionCover Cover(const RegionWindow& window) override;

  /// True when the grids differ by their origin alone.
  bool IsShifted() const { return shifted_; }
  /// True when the addresses are carried by a projected form.
  bool IsProjected() const { return projected_; }

 private:
  bool ToDefinition(const RegionWindow& window, RegionWindow& own) const;

  PixelAddressROIDefPtr definition_;
  bool shifted_ = false;
};

}  // namespace lumo
