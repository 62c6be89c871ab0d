#pragma once

#include <string>

#include "raster/raster_def.h"

namespace lumo::gdal {

/// Compares what a raster file says of itself with what it is to say. What its format has no room
/// for, or keeps too coarsely, goes into the file beside it in which GDAL keeps such things
/// (".aux.xml"). False when GDAL fails; it has then said why.
bool CompleteBeside(const std::string& path, const std::string& driver, const RasterDef& def);

/// True when two no-data values are the same, NaN too.
bool IsSameNumber(double a, double b);

}  // namespace lumo::gdal
