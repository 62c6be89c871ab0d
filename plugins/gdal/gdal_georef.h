#pragma once

#include <array>
#include <cpl_string.h>
#include <gdal.h>

#include "georef/georef.h"

namespace lumo::gdal {

/// The model that a raster comes with: an affine grid, a camera, or both; empty when it has none.
/// A grid that no StdGeoRef is, because its axes stand at another angle than a right one, counts as
/// none.
/// @param hasSystem  whether a grid gets its coordinate system, which takes long to find out.
GeoRefPtr ReadGeoRef(GDALDatasetH dataset, bool hasSystem = true);

/// GDAL's six numbers of an affine grid.
using GridTransform = std::array<double, 6>;

/// The grid of a model. False when it has none.
bool GridOf(const GeoRef& model, GridTransform& transform);

/// The camera of a model, as GDAL's items of the domain "RPC"; none when it has no camera. An
/// elevation model stays behind.
CPLStringList CameraItemsOf(const GeoRef& model);

/// Gives a new raster the model. False when GDAL refuses; it has then said why.
bool WriteGeoRef(GDALDatasetH dataset, const GeoRef& model);

}  // namespace lumo::gdal
