#pragma once

#include <map>
#include <vector>

#include "gdal_common/source.h"

namespace lumo::gdal {

/// One resolution of a raster, the whole or a reduced one.
struct RasterLevel {
  unsigned samples = 0;
  unsigned lines = 0;
  std::vector<GDALRasterBandH> bands;
  GDALDatasetH dataset = nullptr;  ///< that has just these bands; null when there is none
};

/// Finds the whole, as level 0, and the reduced resolutions that follow each other without a gap
/// and that all bands have. Empty for no dataset.
std::map<unsigned, RasterLevel> FindLevels(GDALDatasetH dataset);

}  // namespace lumo::gdal
