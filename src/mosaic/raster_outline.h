#pragma once

#include <array>
#include <vector>

#include "raster/raster_def.h"

namespace lumo {

/// Pieces into which each edge of a raster is cut by OutlineIn.
inline constexpr unsigned kOutlinePieces = 32;

/// The outline of a raster in the pixels of another one, counted from the corner of the first one.
/// Points that can't be carried are left out; there are 4 * kOutlinePieces otherwise.
std::vector<std::array<double, 2>> OutlineIn(const GeoRef& other, const RasterDef& def);

}  // namespace lumo
