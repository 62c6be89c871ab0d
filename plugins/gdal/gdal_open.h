#pragma once

#include "gdal_common/source.h"

namespace lumo::gdal {

/// Opens a raster for reading in the way in which blocks of it come fastest: TIFF files without
/// compression are read straight into the caller's memory, past GDAL's cache of blocks. Null, with
/// the fault set.
DatasetPtr OpenToRead(const Format& format, const Source& source);

}  // namespace lumo::gdal
