#pragma once

#include <string>
#include <vector>

#include "gdal_common/source.h"

namespace lumo::gdal {

// Reduced levels of a raster, as GDAL builds them. Failure: false, with the fault set.

/// Builds levels where GDAL puts those of an open dataset, and reads them back.
/// @param method   by GDAL's name.
/// @param factors  by which the levels are smaller.
bool BuildOverviews(GDALDatasetH dataset, const char* method, const std::vector<int>& factors,
                    const std::string& name);

/// Builds the levels of a raster that is only read, which come into a file beside it. They are made
/// under a temporary name and compared with the raster; a file of older levels stays as it is until
/// then, and for good when something fails.
bool BuildOverviewsBeside(const Source& source, const Format& format, const char* method,
                          const std::vector<int>& factors);

/// True when a file with levels lies beside a raster.
bool HasLevelFile(const std::string& raster);

}  // namespace lumo::gdal
