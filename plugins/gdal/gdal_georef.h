#pragma once

#include <gdal.h>

#include "georef/georef.h"

namespace lumo::gdal {

/// The model that a raster comes with: an affine grid, a camera, or both; empty when it has none.
/// A grid that no StdGeoRef is, because its axes stand at another angle than a right one, counts as
/// none.
GeoRefPtr ReadGeoRef(GDALDatasetH dataset);

/// Gives a new raster the model. False when GDAL refuses; it has then said why. An elevation model
/// stays behind.
bool WriteGeoRef(GDALDatasetH dataset, const GeoRef& model);

}  // namespace lumo::gdal
