#pragma once

#include <string>

#include "georef/georef.h"
#include "mosaic/mosaic_file.h"

namespace lumo {

/// Holds what is wanted of the grid of a mosaic that has no raster to take it from.
struct MosaicGridWish {
  CoordSys system;       ///< empty: that of the first scene
  double pixelSize = 0;  ///< in units of the system; 0: about that of the first scene
};

/// The grid that shows all scenes, north up. Without wishes it is the first scene's own, where that
/// is a plain one, as large as all scenes need; the others are shifted against it by whole pixels
/// only where they lie so.
/// @param fault  [out] why there is none, one line.
/// @return null with the fault.
VEXG_EXPORT GeoRefPtr ChooseMosaicGrid(const std::vector<MosaicScene>& scenes,
                                       const MosaicGridWish& wish, std::string& fault);

}  // namespace lumo
