#pragma once

#include <gdal.h>
#include <optional>

namespace lumo::gdal {

/// The no-data value of a band as a number; one of 64 bits is rounded.
std::optional<double> ReadNoData(GDALRasterBandH band);

/// Gives a band a no-data value. One that no pixel of 64 bits can hold is left out. False when GDAL
/// refuses.
bool WriteNoData(GDALRasterBandH band, double value);

/// The same into the file beside the raster's, whatever the raster's format would do.
bool WriteNoDataBeside(GDALRasterBandH band, double value);

/// True for one number, and for NaN and NaN.
bool IsSameNumber(double a, double b);

}  // namespace lumo::gdal
