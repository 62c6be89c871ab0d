#pragma once

#include <string>

#include "mosaic/mosaic_file.h"
#include "mosaic/mosaic_raster.h"

namespace lumo {

/// Reads a definition and compares its scenes with their files: of one that has changed the header
/// is read anew, of others nothing is opened.
/// @return false, with the fault, one line, when the definition can't be read, or a scene isn't
///         there, can't be opened, or doesn't go with the others any more.
VEXG_EXPORT bool LoadMosaic(const std::string& path, MosaicDocument& document, std::string& fault);

/// Makes the raster of a definition. What the commands of mosaics put into its definition, and
/// keep, is stored in the file.
/// @param path   of the definition file.
/// @param plain  the raster on the source of the file, by which pyramids are built; may be empty.
/// @param uri    of the raster.
VEXG_EXPORT BasicRasterPtr MakeMosaicRaster(const std::string& path, const MosaicDocument& document,
                                            const BasicRasterPtr& plain, const URI& uri);

}  // namespace lumo
