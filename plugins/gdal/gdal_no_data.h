#pragma once

#include <gdal.h>
#include <optional>

#include "raster/no_data_number.h"

namespace lumo::gdal {

/// The no-data value that a band declares.
std::optional<NoDataNumber> ReadNoData(GDALRasterBandH band);

/// Gives a band a no-data value. One that no pixel of 64 bits can hold is left out. False when GDAL
/// refuses.
bool WriteNoData(GDALRasterBandH band, const NoDataNumber& value);

/// The same into the file beside the raster's, whatever the raster's format would do.
bool WriteNoDataBeside(GDALRasterBandH band, const NoDataNumber& value);

}  // namespace lumo::gdal
