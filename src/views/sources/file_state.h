#pragma once

#include <string>

#include "data/data_connection.h"

namespace lumo {

/// The size of the file behind a source and the time of its last change, as they were just before
/// it was opened, in a text that a pyramid file keeps: it belongs to a raster while that has the
/// same. No text for a source that is no file.
VEXG_EXPORT std::string FileStateOf(RasterDataConnection& source);

/// Why a pyramid file is not that of a raster, in words that follow its name; no text when it is.
/// A file that keeps no state of its raster's must not be older than that.
VEXG_EXPORT std::string FindMismatch(RasterDataConnection& source, RasterDataConnection& pyramid);

}  // namespace lumo
