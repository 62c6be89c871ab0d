#pragma once

#include <gdal.h>

#include "metadata/metadata.h"

namespace lumo::gdal {

/// What GDAL tells of a raster in words: its items as texts at "/GDAL/<domain>/<item>", those of
/// its default domain at "/GDAL/Items/<item>". Domains that hold documents, and those that stand
/// for something else of the raster, are left out.
Metadata ReadMetadata(GDALDatasetH dataset);

}  // namespace lumo::gdal
