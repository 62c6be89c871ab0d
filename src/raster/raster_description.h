#pragma once

#include <string>

#include "raster/raster.h"

namespace lumo {

/// Tells what a raster is, as a JSON object on one line. docs/c-door.md has its members.
VEXG_EXPORT std::string DescribeRaster(const BasicRaster& raster);

}  // namespace lumo
