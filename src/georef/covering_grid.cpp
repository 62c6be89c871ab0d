#include "georef/covering_grid.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace lumo {
namespace {

/// A net of points over a raster, its edges among them.
/// @param corner  the pixel coordinates of the first pixel's corner.
Array<double> NetOf(unsigned samples, unsigned lines, double corner) {
  constexpr unsigned kSteps = 40;
  Array<double> points{ArrayDims((kSteps + 1) * (kSteps + 1), 2)};
  double* at = points.GetData();
  for (unsigned j = 0; j <= kSteps; ++j) {
    for (unsigned i = 0; i <= kSteps; ++i) {
      *at++ = corner + samples * (static_cast<double>(i) / kSteps);
      *at++ = corner + lines * (static_cast<double>(j) / kSteps);
    }
  }
  return points;
}

}  // namespace

GeoRefPtr CoveringGrid(const GeoRef& source, const CoordSys& system, double pixelSize) {
  if (source.Samples() == 0 || source.Lines() == 0) return {};
  const GeoRefPtr grid(new StdGeoRef);
  grid->SetCoordinateSystem(system);
  Array<double> points =
      NetOf(source.Samples(), source.Lines(), source.GetType() == GeoRef::kRpc ? -0.5 : 0.0);
  source.PixelToMap(points);
  if (!source.CoordinateSystem().IsEqual(system)) source.MapToMap(points, *grid);
  MapRect rect{HUGE_VAL, HUGE_VAL, -HUGE_VAL, -HUGE_VAL};
  for (unsigned i = 0; i + 1 < points.GetCount(); i += 2) {
    if (!std::isfinite(points[i]) || !std::isfinite(points[i + 1])) continue;
    rect.minX = std::min(rect.minX, points[i]);
    rect.maxX = std::max(rect.maxX, points[i]);
    rect.minY = std::min(rect.minY, points[i + 1]);
    rect.maxY = std::max(rect.maxY, points[i + 1]);
  }
  const double width = rect.maxX - rect.minX, height = rect.maxY - rect.minY;
  if (!(width > 0 && height > 0)) return {};
  if (pixelSize == 0) {
    pixelSize = std::hypot(width, height) / std::hypot(source.Samples(), source.Lines());
  }
  const auto pixels = [&](double length) { return std::max(1.0, std::round(length / pixelSize)); };
  constexpr double kMost = std::numeric_limits<std::int32_t>::max();
  if (!(pixels(width) <= kMost && pixels(height) <= kMost)) return {};
  grid->SetTieMap(rect.minX, rect.maxY);
  grid->SetPixelSize(pixelSize, pixelSize);
  grid->SetDimensions(static_cast<unsigned>(pixels(width)), static_cast<unsigned>(pixels(height)));
  return grid;
}

}  // namespace lumo
