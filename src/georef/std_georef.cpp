#include "georef/std_georef.h"

#include <algorithm>
#include <cmath>
#include <cstddef>

#include "georef/georef_text.h"
#include "platform/vector_clones.h"

namespace lumo {

const unsigned StdGeoRef::TypeCode = kStd;

/// The fields that a conversion needs. The body of each loop stands in it, so that the array form,
/// which is compiled for vectors, and the form for one point are the same arithmetic.
struct StdGeoRef::Affine {
  explicit Affine(const StdGeoRef& model)
      : sizeX(model.pixelSizeX_),
        sizeY(model.pixelSizeY_),
        mapX(model.tieMapX_),
        mapY(model.tieMapY_),
        pixelX(model.tiePixelX_),
        pixelY(model.tiePixelY_),
        rotates(model.rotation_ != 0) {
    if (!rotates) return;
    cosine = std::cos(model.rotation_ * kRadiansPerDegree);
    sine = std::sin(model.rotation_ * kRadiansPerDegree);
  }

  void ToMap(double* xy, std::size_t count) const {
    rotates ? RotatedToMap(*this, xy, count) : PlainToMap(*this, xy, count);
  }
  void ToPixel(double* xy, std::size_t count) const {
    rotates ? RotatedToPixel(*this, xy, count) : PlainToPixel(*this, xy, count);
  }

  static void PlainToMap(Affine m, double* xy, std::size_t count);
  static void RotatedToMap(Affine m, double* xy, std::size_t count);
  static void PlainToPixel(Affine m, double* xy, std::size_t count);
  static void RotatedToPixel(Affine m, double* xy, std::size_t count);

  double sizeX, sizeY, mapX, mapY, pixelX, pixelY;
  double cosine = 1;
  double sine = 0;
  bool rotates;
};

VEXG_VECTOR_CLONES
void StdGeoRef::Affine::PlainToMap(Affine m, double* xy, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) {
    xy[2 * i] = (xy[2 * i] - m.pixelX) * m.sizeX + m.mapX;
    xy[2 * i + 1] = (xy[2 * i + 1] - m.pixelY) * -m.sizeY + m.mapY;
  }
}

VEXG_VECTOR_CLONES
void StdGeoRef::Affine::RotatedToMap(Affine m, double* xy, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) {
    const double x = xy[2 * i] - m.pixelX;
    const double y = xy[2 * i + 1] - m.pixelY;
    xy[2 * i] = x * m.cosine * m.sizeX + m.mapX + y * m.sine * m.sizeY;
    xy[2 * i + 1] = x * m.sine * m.sizeX + m.mapY - y * m.cosine * m.sizeY;
  }
}

VEXG_VECTOR_CLONES
void StdGeoRef::Affine::PlainToPixel(Affine m, double* xy, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) {
    xy[2 * i] = (xy[2 * i] - m.mapX) / m.sizeX + m.pixelX;
    xy[2 * i + 1] = (xy[2 * i + 1] - m.mapY) / -m.sizeY + m.pixelY;
  }
}

VEXG_VECTOR_CLONES
void StdGeoRef::Affine::RotatedToPixel(Affine m, double* xy, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) {
    const double a = (xy[2 * i] - m.mapX) / m.sizeX;
    const double b = (m.mapY - xy[2 * i + 1]) / m.sizeY;
    xy[2 * i] = a * m.cosine - b * m.sine + m.pixelX;
    xy[2 * i + 1] = a * m.sine + b * m.cosine + m.pixelY;
  }
}

bool StdGeoRef::CanConvert(Array<double>& points) const {
  const bool fits = points.GetRank() == 2 && points.GetExtent(1) == 2;
  if (fits && pixelSizeX_ != 0 && pixelSizeY_ != 0) return true;
  std::fill(points.begin(), points.end(), 0.0);
  return false;
}

bool StdGeoRef::PixelToMap(Array<double>& points) const {
  if (!CanConvert(points)) return false;
  Affine(*this).ToMap(points.GetData(), points.GetExtent(0));
  const bool clampX = tieMapX_ <= -180;
  const bool clampY = tieMapY_ >= 90;
  if ((clampX || clampY) && coordSys_.Type() == 1) {
    for (unsigned i = 0; i + 1 < points.GetCount(); i += 2) {
      if (clampX && points[i] > 180) points[i] = 180;
      if (clampY && points[i + 1] < -90) points[i + 1] = -90;
    }
  }
  return true;
}

bool StdGeoRef::PixelToMap(double x, double y, double& mapX, double& mapY) const {
  return ConvertPoint(x, y, mapX, mapY, ToMap, *this);
}

bool StdGeoRef::MapToPixel(Array<double>& points) const {
  if (!CanConvert(points)) return false;
  Affine(*this).ToPixel(points.GetData(), points.GetExtent(0));
  return true;
}

bool StdGeoRef::MapToPixel(double mapX, double mapY, double& x, double& y) const {
  return ConvertPoint(mapX, mapY, x, y, ToPixel, *this);
}

void StdGeoRef::SetDimensions(unsigned samples, unsigned lines) {
  samples_ = samples;
  lines_ = lines;
  Changed();
}

double StdGeoRef::CenterLatitude(bool force) const {
  constexpr double kDefaultLatitude = 40.0;
  if (force) cache_.SetCenterLatitude(GeoRefCache::kNoLatitude);
  if (cache_.CenterLatitude() != GeoRefCache::kNoLatitude) return cache_.CenterLatitude();
  if (samples_ == 0 || lines_ == 0 || pixelSizeX_ == 0 || pixelSizeY_ == 0) {
    return kDefaultLatitude;
  }
  double latitude = 0.0;
  if (coordSys_.Type() != 0) {
    double x = 0, y = 0, longitude = 0;
    PixelToMap(samples_ / 2, lines_ / 2, x, y);
    coordSys_.MapToGeo(x, y, longitude, latitude);
  }
  cache_.SetCenterLatitude(latitude);
  return latitude;
}

Array<double> StdGeoRef::MapExtent(bool force) const {
  return CachedExtent(cache_, force);
}

GeoRefPtr StdGeoRef::SubRectGeoRef(const SubRect& rect) const {
  StdGeoRef* const part = Clone();
  const GeoRefPtr owner(part);
  PixelToMap(rect.left, rect.top, part->tieMapX_, part->tieMapY_);
  part->SetDimensions(rect.Width(), rect.Height());
  return owner;
}

GeoRefPtr StdGeoRef::ResampledGeoRef(double pixelSizeX, double pixelSizeY) const {
  StdGeoRef* const resampled = Clone();
  const GeoRefPtr owner(resampled);
  PixelToMap(0, 0, resampled->tieMapX_, resampled->tieMapY_);
  resampled->tiePixelX_ = 0;
  resampled->tiePixelY_ = 0;
  resampled->pixelSizeX_ = pixelSizeX;
  resampled->pixelSizeY_ = pixelSizeY;
  resampled->SetDimensions(samples_, lines_);
  return owner;
}

void StdGeoRef::Write(std::ostream& out) const {
  cache_.Write(out);
  GeoRef::Write(out);
}

void StdGeoRef::Read(std::istream& in) {
  cache_.Read(in);
  GeoRef::Read(in);
}

}  // namespace lumo
