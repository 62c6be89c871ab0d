#pragma once

#include <string>
#include <vector>

#include "viewer/viewed_raster.h"
#include "viewer/work_folder.h"

namespace lumo::host {

/// A ring of x and y of points, in pixels from the corner of the first one, the first point last
/// again.
using PixelRing = std::vector<std::pair<double, double>>;

/// The polygon as GeoJSON, on the map of the raster where it has a grid there: in its coordinate
/// system by the EPSG number, else in longitude and latitude. Without a grid it is in pixels.
/// Throws HostError for a polygon that can't be carried.
Json RegionAsGeoJson(const ViewedRaster& raster, const PixelRing& ring);

/// Computes the statistics of the pixels inside a polygon, as `vexg stats --region` does with the
/// same file: {"pixels", "bands"}. Throws HostError.
Json RegionStatistics(const ViewedRaster& raster, const Json& geoJson, WorkFolder& folder);

}  // namespace lumo::host
