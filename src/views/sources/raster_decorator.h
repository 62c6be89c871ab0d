#pragma once

#include "data/data_connection.h"
#include "raster/raster.h"

namespace lumo {

/// Makes the raster that is to stand for a source in place of the plain one on its reader: a kind
/// of raster of a floor above, such as a mosaic, that sources of one format are.
/// @param plain  the raster on the reader; stays open below the one that is made, or goes.
/// @param uri    in place of the source's, unless empty.
/// @return empty, with the fault set, when it can't be made.
using RasterDecorator = BasicRasterPtr (*)(const BasicRasterPtr& plain,
                                           RasterDataConnection& source, const URI& uri);

/// Has `decorate` make the rasters of a format. Called at load, once for a format.
VEXG_EXPORT bool RegisterRasterDecorator(const String& format, RasterDecorator decorate);

/// Finds who makes the rasters of a format; null for those that stay plain.
VEXG_EXPORT RasterDecorator FindRasterDecorator(const String& format);

}  // namespace lumo
