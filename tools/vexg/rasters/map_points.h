#pragma once

#include <string>

#include "georef/georef.h"

namespace lumo::host {

/// The coordinate system that a text means. Throws HostError for none that can be used.
/// @param option  whose value it is.
CoordSys ReadSystem(const std::string& option, const std::string& text);

/// Carries points from one coordinate system to another, in place; what can't be carried becomes
/// what is not finite.
/// @param points  (points, 2) or (points, 3).
void MapToMap(const CoordSys& from, const CoordSys& to, Array<double>& points);

/// Carries points of a map to the pixels of a raster, counted from the corner of the first one
/// whatever the model, in place.
/// @param from  the system of the points; an empty one for the raster's own.
void MapToPixels(const GeoRef& geoRef, const CoordSys& from, Array<double>& points);

/// Throws HostError for a raster that such points can't be carried to.
/// @param file    what the user calls it.
/// @param option  that asks for it.
void CheckMapToPixels(const GeoRef& geoRef, const CoordSys& from, const std::string& file,
                      const std::string& option);

/// The coordinates that the model has for the corner of the first pixel.
double FirstPixel(const GeoRef& geoRef);

/// Adds a number to the first two coordinates of all points.
void ShiftPixels(Array<double>& points, double by);

}  // namespace lumo::host
