#pragma once

#include <string>

#include "georef/georef.h"
#include "viewer/job_door.h"

namespace lumo::host {

/// Shapes that the viewer draws at most; of a larger file the first ones are shown, which the page
/// says.
inline constexpr unsigned kMostShapes = 20000;

/// Reads the shapes of all layers of a vector file, as a FeatureCollection of GeoJSON in pixels of
/// a raster, from the corner of the first one, with "layer" and the fields as properties, and
/// "more", true where shapes were left out. Shapes that can't be carried to the raster are left out
/// too. Throws HostError.
/// @param grid  of the raster; empty for shapes in pixels.
Json ReadViewedShapes(const std::string& file, const GeoRefPtr& grid);

/// Reads the footprints and seams of a mosaic likewise.
/// @param work  a vector file that may be made for it, and is left there.
Json ReadMosaicShapes(JobDoor& door, const std::string& mosaic, const GeoRefPtr& grid,
                      const std::string& work);

}  // namespace lumo::host
