#pragma once

#include <array>

#include "georef/elevation_model.h"
#include "georef/georef_cache.h"

namespace lumo {

/// The fields of a rational polynomial camera in the order of the RPC00B form (STDI-0002,
/// appendix E): offsets and scales that normalise, then the coefficients of the four polynomials.
/// Lines and samples count from the centre of the first pixel; heights are metres above the
/// ellipsoid.
struct RpcCoefficients {
  /// The line offset of coefficients that were never set.
  static constexpr double kNeverSet = -1111100000.0;
  /// Terms of a cubic polynomial of three variables.
  static constexpr std::size_t kTerms = 20;
  using Polynomial = std::array<double, kTerms>;

  double lineOffset = kNeverSet;  ///< kNeverSet: there is no model yet
  double sampleOffset = 0;        ///< pixels
  double latitudeOffset = 0;      ///< degrees
  double longitudeOffset = 0;     ///< degrees
  double heightOffset = 0;        ///< metres
  double lineScale = 0;           ///< pixels
  double sampleScale = 0;         ///< pixels
  double latitudeScale = 0;       ///< degrees
  double longitudeScale = 0;      ///< degrees
  double heightScale = 0;         ///< metres
  Polynomial lineNumerator{};
  Polynomial lineDenominator{};
  Polynomial sampleNumerator{};
  Polynomial sampleDenominator{};
};

/// The rational polynomial camera model: ground to pixel by a quotient of cubic polynomials, pixel
/// to ground by iteration. It may follow an elevation model.
///
/// Points arrays may also have dimensions (points, 3), where the third column is a height in
/// metres: PixelToMap starts from it, and both directions leave there the height that they used.
/// Without it the height is that of the elevation model, else HEIGHT_OFF.
///
/// PixelToMap: where the rounds at one height run out, the last estimate stands; where those that
/// follow the terrain do, the point is (LONG_OFF, LAT_OFF). A point that is not a number, or at
/// which the model has no inverse, comes out as NaN. A model that was never set gives meaningless
/// numbers.
class VEXG_EXPORT RpcGeoRef : public GeoRef {
 public:
  static const unsigned TypeCode;

  RpcGeoRef();

  RpcGeoRef* Clone() const override { return new RpcGeoRef(*this); }
  bool PixelToMap(MapRect& rect) const override { return ConvertRect(rect, ToMap, *this); }
  bool PixelToMap(Array<double>& points) const override;
  bool PixelToMap(double x, double y, double& mapX, double& mapY) const override;
  bool MapToPixel(MapRect& rect) const override { return ConvertRect(rect, ToPixel, *this); }
  bool MapToPixel(Array<double>& points) const override;
  bool MapToPixel(double mapX, double mapY, double& x, double& y) const override;
  /// Also sets the pixel size to the extent over the size of the raster.
  void SetDimensions(unsigned samples, unsigned lines) override;
  /// Map y of the middle of the raster, computed at each call.
  double CenterLatitude(bool force = false) const override;
  Array<double> MapExtent(bool force = false) const override;
  GeoRefPtr SubRectGeoRef(const SubRect& rect) const override;
  GeoRefPtr ResampledGeoRef(double pixelSizeX, double pixelSizeY) const override;
  void Write(std::ostream& out) const override;
  void Read(std::istream& in) override;

  /// The camera of the whole scene, without the subset below.
  const RpcCoefficients& Coefficients() const { return rpc_; }
  /// Takes over a camera.
  void SetCoefficients(const RpcCoefficients& coefficients);

  /// The subset: see SetSubset.
  double SampleOffset() const { return sampleOffset_; }
  double LineOffset() const { return lineOffset_; }
  double SampleScale() const { return sampleScale_; }
  double LineScale() const { return lineScale_; }
  /// Origin of a subset, taken off the model's pixel, and the factors that come after that.
  void SetSubset(double sampleOffset, double lineOffset, double sampleScale, double lineScale);
  /// Divides samples and lines of all positions by two factors. The size of the raster stays.
  void Resample(double factorX, double factorY);

  /// The elevation model that heights are read from; empty for none.
  const ElevationModelPtr& Dem() const { return dem_; }
  /// Metres added to every height that is read.
  double DemHeightOffset() const { return demHeightOffset_; }
  /// @param heightOffset  metres, added to every height that is read.
  void SetDem(const ElevationModelPtr& dem, double heightOffset = 0);

  /// The system of the model's latitude and longitude, WGS 84 at first.
  const CoordSys& GroundCoordinateSystem() const { return groundCoordSys_; }
  /// Sets that system; positions are carried from it to CoordinateSystem().
  void SetGroundCoordinateSystem(const CoordSys& coordSys);

 protected:
 private:
  friend class StdRpcGeoRef;
  class Inverse;

  bool CanConvert(Array<double>& points) const;
  MapRect GroundExtent() const;
  void Divide(double factorX, double factorY);
  bool Carry(Array<double>& points, const CoordSys& from, const CoordSys& to) const;

  RpcCoefficients rpc_;
  double sampleOffset_ = 0;
  double lineOffset_ = 0;
  double sampleScale_ = 1.0;
  double lineScale_ = 1.0;
  double demHeightOffset_ = 0;
  ElevationModelPtr dem_;
  CoordSys groundCoordSys_;
  mutable GeoRefCache cache_;
};

using RpcGeoRefPtr = Pointer<RpcGeoRef>;

}  // namespace lumo
