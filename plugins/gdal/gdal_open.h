#pragma once

#include "gdal_common/source.h"

namespace lumo::gdal {

/// Opens a raster for reading in the way in which blocks of it come fastest. Null, with the fault
/// set.
///
/// TIFF files without compression are read straight into the caller's memory, past GDAL's cache of
/// blocks. Those with large compressed blocks are decoded by several threads at once, which go past
/// the cache too; `isThreaded` is then set.
DatasetPtr OpenToRead(const Format& format, const Source& source, bool& isThreaded);

}  // namespace lumo::gdal
