#pragma once

#include <string>
#include <vector>

#include "gdal_band_values.h"
#include "raster/raster_def.h"

namespace lumo::gdal {

/// Compares what a raster file says of itself with what it is to say. What its format has no room
/// for, or keeps too coarsely, goes into the file beside it in which GDAL keeps such things
/// (".aux.xml"). False when GDAL fails; it has then said why.
/// @param histograms  of the bands, as many as there are or none.
bool CompleteBeside(const std::string& path, const std::string& driver, const RasterDef& def,
                    const std::vector<std::optional<StoredHistogram>>& histograms);

}  // namespace lumo::gdal
