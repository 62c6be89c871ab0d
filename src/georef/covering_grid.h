#pragma once

#include "georef/std_georef.h"

namespace lumo {

/// The grid of a coordinate system that shows all of a raster, with square pixels and the raster's
/// upper left corner of all at pixel (0, 0).
/// @param source     the raster's model, with its size set.
/// @param pixelSize  in units of the system; 0 keeps the number of pixels along the diagonal.
/// @return null when no part of the raster can be carried to the system, or the grid would have
///         more than 2^31 - 1 samples or lines. Parts that can't be carried are left out.
VEXG_EXPORT GeoRefPtr CoveringGrid(const GeoRef& source, const CoordSys& system,
                                   double pixelSize = 0);

}  // namespace lumo
