#pragma once

#include <cpl_string.h>

#include "raster/raster_def.h"

namespace lumo::gdal {

/// Gives the bytes of all pixels of a raster, as a floating-point number: no size is too large for
/// it.
double BytesOf(const RasterDef& def);

/// True for a TIFF file whose blocks are packed, or lie in an order of its own.
bool IsPacked(const RasterDef& def);

/// Gives the word by which GDAL chooses the kind of a TIFF file.
const char* BigTiffWord(const RasterDef& def);

/// Adds the options of the order of bands and of the blocks of a TIFF file.
void AddLayout(const RasterDef& def, CPLStringList& options);

}  // namespace lumo::gdal
