#pragma once

#include "platform/random_access_file.h"
#include "tiff_pixels.h"

namespace lumo::gdal {

/// Gives each block of a TIFF file its place, behind all that the file holds: the file is made long
/// enough, and its directory told. The layout's `start` is set.
///
/// False, with the file as it was, where the file isn't of the layout, of another machine's byte
/// order or has blocks already; false too when it can't be written.
/// Source: TIFF 6.0, sections 2, 8 and 15; the BigTIFF extension for files beyond 4 GiB.
bool PlaceBlocks(platform::RandomAccessFile& file, TiffLayout& layout);

}  // namespace lumo::gdal
