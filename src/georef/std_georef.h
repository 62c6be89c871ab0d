#pragma once

#include "georef/georef_cache.h"

namespace lumo {

/// An affine grid: pixels of one size, a tie point, and a rotation about it.
///
///     StdGeoRef grid;
///     grid.SetPixelSize(10, 10);
///     grid.SetTiePixel(0, 0);             // the upper left corner of the raster ...
///     grid.SetTieMap(500000, 5400000);    // ... lies here
///     grid.SetCoordinateSystem(utm);
///     grid.SetDimensions(samples, lines);
class VEXG_EXPORT StdGeoRef : public GeoRef {
 public:
  static const unsigned TypeCode;
  /// Radians of a degree by which rotations are computed: pi / 180 as single precision has it.
  static constexpr double kRadiansPerDegree = 0.0174532923847437;

  StdGeoRef() { type_ = kStd; }

  StdGeoRef* Clone() const override { return new StdGeoRef(*this); }
  bool PixelToMap(MapRect& rect) const override { return ConvertRect(rect, ToMap, *this); }
  bool PixelToMap(Array<double>& points) const override;
  bool PixelToMap(double x, double y, double& mapX, double& mapY) const override;
  bool MapToPixel(MapRect& rect) const override { return ConvertRect(rect, ToPixel, *this); }
  bool MapToPixel(Array<double>& points) const override;
  bool MapToPixel(double mapX, double mapY, double& x, double& y) const override;
  void SetDimensions(unsigned samples, unsigned lines) override;
  /// 40.0 while the raster has no size or a pixel size is 0; 0.0 without a coordinate system.
  double CenterLatitude(bool force = false) const override;
  Array<double> MapExtent(bool force = false) const override;
  GeoRefPtr SubRectGeoRef(const SubRect& rect) const override;
  GeoRefPtr ResampledGeoRef(double pixelSizeX, double pixelSizeY) const override;
  void Write(std::ostream& out) const override;
  void Read(std::istream& in) override;

 protected:
 private:
  /// The model as one affine map; the tie pixel is taken off before and the clamps come after it.
  struct Affine;
  bool CanConvert(Array<double>& points) const;

  mutable GeoRefCache cache_;
};

using StdGeoRefPtr = Pointer<StdGeoRef>;

}  // namespace lumo
