#pragma once

#include "georef/georef.h"
#include "tiff/tiff_image.h"

namespace lumo::tiff {

/// Where a raster lies, as its file says.
struct Place {
  GeoRefPtr geoRef;    ///< empty where the file says nothing
  int rasterType = 0;  ///< 1 pixels are areas, 2 points; 0 not told
};

/// Reads the place of a raster. Nothing for what isn't a grid along the axes, without a coordinate
/// system or in one that the EPSG registry has.
std::optional<Place> FindPlace(const File& file, const Image& image);

}  // namespace lumo::tiff
