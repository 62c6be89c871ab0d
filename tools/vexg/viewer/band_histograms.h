#pragma once

#include <cstdint>
#include <vector>

#include "viewer/viewed_raster.h"

namespace lumo::host {

/// Counts the values of bands for the stretch of the page: {"level", "bands"}, the latter as
/// `vexg hist --json` has them. Of a large raster a reduced level is counted, which the page says.
/// Throws HostError.
Json CountBands(const ViewedRaster& raster, const std::vector<std::uint32_t>& bands);

}  // namespace lumo::host
