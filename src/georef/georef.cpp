#include "georef/georef.h"

#include <algorithm>
#include <cmath>

#include "georef/carry_points.h"
#include "georef/georef_cache.h"
#include "georef/georef_text.h"
#include "georef/std_rpc_georef.h"

namespace lumo {
namespace {

constexpr double kSizeTolerance = 1e-6;

bool Differ(double a, double b) {
  return std::abs(a - b) > kSizeTolerance;
}

bool IsPairs(const Array<double>& points) {
  return points.GetRank() == 2 && points.GetExtent(1) == 2;
}

double RoundHalfUp(double value) {
  return std::floor(value + 0.5);
}

/// The pixels by which an extent is sampled: the four edges and the two diagonals.
Array<double> ExtentSamples(unsigned samples, unsigned lines) {
  const auto tenthLines = static_cast<unsigned>(RoundHalfUp(lines * 0.1));
  const auto tenthSamples = static_cast<unsigned>(RoundHalfUp(samples * 0.1));
  const unsigned step = std::max({tenthLines, tenthSamples, 1U});
  const unsigned n = std::max({samples / step, lines / step, 1U});
  const unsigned sx = samples / n;
  const unsigned sy = lines / n;

  Array<double> points{ArrayDims(6 * n + 4, 2)};
  double* next = points.begin();
  const auto add = [&next](double x, double y) {
    *next++ = x;
    *next++ = y;
  };
  for (const unsigned y : {0U, lines}) {
    for (unsigned i = 0; i < n; ++i) add(i * sx, y);
    add(samples, y);
  }
  for (const unsigned x : {0U, samples}) {
    for (unsigned i = 0; i < n; ++i) add(x, i * sy);
    add(x, lines);
  }
  for (unsigned i = 0; i < n; ++i) add(i * sx, i * sy);
  for (unsigned i = 0; i < n; ++i) add(sx * (n - i), i * sy);
  return points;
}

}  // namespace

bool GeoRef::IsEqual(const GeoRefPtr& other, std::uint32_t flags) const {
  if (other.IsNull() || type_ != other->type_) return false;
  if (Differ(rotation_, other->rotation_)) return false;
  if ((flags & kSkipPixelSize) == 0 &&
      (Differ(pixelSizeX_, other->pixelSizeX_) || Differ(pixelSizeY_, other->pixelSizeY_))) {
    return false;
  }
  if ((flags & kSkipTiePoint) == 0 &&
      (tieMapX_ != other->tieMapX_ || tieMapY_ != other->tieMapY_ ||
       tiePixelX_ != other->tiePixelX_ || tiePixelY_ != other->tiePixelY_)) {
    return false;
  }
  return coordSys_.IsEqual(other->coordSys_);
}

bool GeoRef::PixelToPixel(Array<double>& points, const GeoRef& other) const {
  if (!IsPairs(points)) return false;
  bool carried = PixelToMap(points);
  if (!coordSys_.IsEqual(other.coordSys_)) carried = MapToMap(points, other) && carried;
  const bool placed = other.MapToPixel(points);
  if (!placed || carried) return placed;
  MarkUncarried(points);
  return false;
}

bool GeoRef::MapToMap(Array<double>& points, const GeoRef& other) const {
  if (!IsPairs(points)) return false;
  return CarryPoints(points, coordSys_, other.coordSys_, [this] { return MapExtent(); });
}

bool GeoRef::IsA(unsigned typeCode) const {
  switch (typeCode) {
    case kStd:
      return dynamic_cast<const StdGeoRef*>(this) != nullptr;
    case kRpc:
      return dynamic_cast<const RpcGeoRef*>(this) != nullptr;
    case kStdRpc:
      return dynamic_cast<const StdRpcGeoRef*>(this) != nullptr;
    default:
      return false;
  }
}

void GeoRef::SetPixelSize(double x, double y) {
  pixelSizeX_ = x;
  pixelSizeY_ = y;
  Changed();
}

void GeoRef::SetTieMap(double x, double y) {
  tieMapX_ = x;
  tieMapY_ = y;
  Changed();
}

void GeoRef::SetTiePixel(double x, double y) {
  tiePixelX_ = x;
  tiePixelY_ = y;
  Changed();
}

void GeoRef::SetRotation(double degrees) {
  rotation_ = degrees;
  Changed();
}

void GeoRef::SetCoordinateSystem(const CoordSys& coordSys) {
  coordSys_ = coordSys;
  Changed();
}

void GeoRef::Changed() {
  if (samples_ == 0 || lines_ == 0) return;
  MapExtent(true);
  CenterLatitude(true);
}

Array<double> GeoRef::CachedExtent(GeoRefCache& cache, bool force) const {
  if (force) cache.SetExtent({});
  if (!cache.HasExtent() && samples_ != 0 && lines_ != 0) cache.SetExtent(SampleExtent());
  return cache.ExtentArray();
}

bool GeoRef::ConvertRect(MapRect& rect, bool (*convert)(const GeoRef&, Array<double>&),
                         const GeoRef& model) {
  double corners[] = {rect.minX, rect.minY, rect.maxX, rect.maxY};
  Array<double> points(corners, ArrayDims(2, 2));
  const bool converted = convert(model, points);
  rect = {std::min(corners[0], corners[2]), std::min(corners[1], corners[3]),
          std::max(corners[0], corners[2]), std::max(corners[1], corners[3])};
  return converted;
}

bool GeoRef::ConvertPoint(double x, double y, double& outX, double& outY,
                          bool (*convert)(const GeoRef&, Array<double>&), const GeoRef& model) {
  double point[] = {x, y};
  Array<double> points(point, ArrayDims(1, 2));
  const bool converted = convert(model, points);
  outX = point[0];
  outY = point[1];
  return converted;
}

MapRect GeoRef::SampleExtent() const {
  Array<double> points = ExtentSamples(samples_, lines_);
  PixelToMap(points);
  MapRect extent;
  bool first = true;
  for (unsigned i = 0; i + 1 < points.GetCount(); i += 2) {
    const double x = points[i];
    const double y = points[i + 1];
    if (!std::isfinite(x) || !std::isfinite(y)) continue;
    if (first) extent = {x, y, x, y};
    first = false;
    extent = {std::min(extent.minX, x), std::min(extent.minY, y), std::max(extent.maxX, x),
              std::max(extent.maxY, y)};
  }
  return extent;
}

GeoRefPtr CloneOf(const GeoRefPtr& source) {
  return source.IsNull() ? GeoRefPtr() : GeoRefPtr(source->Clone());
}

}  // namespace lumo
