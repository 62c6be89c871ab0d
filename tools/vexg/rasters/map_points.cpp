#include "rasters/map_points.h"

#include <cmath>

#include "georef/affine_link.h"
#include "georef/std_georef.h"
#include "verb.h"

namespace lumo::host {
namespace {

/// True for a model whose way from the map to pixels is exact for square pixels only.
bool IsRotatedOblong(const GeoRef& geoRef) {
  return geoRef.GetType() == GeoRef::kStd && geoRef.Rotation() != 0 &&
         std::abs(geoRef.PixelSizeX() - geoRef.PixelSizeY()) > 1e-9 * std::abs(geoRef.PixelSizeX());
}

}  // namespace

CoordSys ReadSystem(const std::string& option, const std::string& text) {
  CoordSys system;
  if (!system.SetFromString(String(text)) || system.Type() == 0) {
    throw HostError(kExitUsage, option + ": \"" + text +
                                    "\" is no coordinate system that can be used here; give WKT, "
                                    "\"EPSG:n\" or a PROJ string");
  }
  return system;
}

void MapToMap(const CoordSys& from, const CoordSys& to, Array<double>& points) {
  StdGeoRef first, second;
  first.SetCoordinateSystem(from);
  second.SetCoordinateSystem(to);
  first.MapToMap(points, second);
}

void MapToPixels(const GeoRef& geoRef, const CoordSys& from, Array<double>& points) {
  if (!from.IsEmpty()) MapToMap(from, geoRef.CoordinateSystem(), points);
  InvertPixelToMap(geoRef, points);
  ShiftPixels(points, -FirstPixel(geoRef));
}

void CheckMapToPixels(const GeoRef& geoRef, const CoordSys& from, const std::string& file,
                      const std::string& option) {
  if (IsRotatedOblong(geoRef)) {
    throw HostError(kExitFailed, file + ": " + option +
                                     ": the grid is rotated and its pixels are not square; the "
                                     "model has no exact way back to pixels");
  }
  if (!from.IsEmpty() && geoRef.CoordinateSystem().IsEmpty()) {
    throw HostError(kExitFailed, file + ": " + option + ": the raster has no coordinate system");
  }
}

double FirstPixel(const GeoRef& geoRef) {
  return geoRef.GetType() == GeoRef::kRpc ? -0.5 : 0.0;
}

void ShiftPixels(Array<double>& points, double by) {
  const unsigned width = points.GetExtent(1);
  for (unsigned i = 0; i + 1 < points.GetCount(); i += width) {
    points[i] += by;
    points[i + 1] += by;
  }
}

}  // namespace lumo::host
