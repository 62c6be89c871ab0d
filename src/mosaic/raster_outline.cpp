#include "mosaic/raster_outline.h"

#include <cmath>

#include "georef/affine_link.h"

namespace lumo {

std::vector<std::array<double, 2>> OutlineIn(const GeoRef& other, const RasterDef& def) {
  constexpr unsigned kPieces = kOutlinePieces;
  const double corners[][2] = {{0, 0}, {1, 0}, {1, 1}, {0, 1}, {0, 0}};
  const auto shiftOf = [](const GeoRef& model) {
    return model.GetType() == GeoRef::kRpc ? 0.5 : 0.0;
  };
  Array<double> points{ArrayDims(4 * kPieces, 2)};
  double* at = points.begin();
  for (unsigned i = 0; i < 4 * kPieces; ++i) {
    const double part = double(i % kPieces) / kPieces;
    const auto& [fromX, fromY] = corners[i / kPieces];
    const auto& [toX, toY] = corners[i / kPieces + 1];
    *at++ = def.samples * (fromX + (toX - fromX) * part) - shiftOf(*def.geoRef);
    *at++ = def.lines * (fromY + (toY - fromY) * part) - shiftOf(*def.geoRef);
  }
  CarryPixels(*def.geoRef, other, points);
  std::vector<std::array<double, 2>> outline;
  for (unsigned i = 0; i + 1 < points.GetCount(); i += 2) {
    if (!std::isfinite(points[i]) || !std::isfinite(points[i + 1])) continue;
    outline.push_back({points[i] + shiftOf(other), points[i + 1] + shiftOf(other)});
  }
  return outline;
}

}  // namespace lumo
