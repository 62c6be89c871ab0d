#pragma once

#include <string>

#include "raster/raster_def.h"

namespace lumo::gdal {

/// The name of the world file of a raster: the first and the last letter of its ending, and a w.
std::string WorldName(const std::string& path);

/// The text of a world file, six numbers on lines of their own; empty for a raster without a grid.
/// It counts from the middle of the first pixel.
std::string WorldText(const RasterDef& def);

}  // namespace lumo::gdal
