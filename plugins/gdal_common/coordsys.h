#pragma once

#include <ogr_srs_api.h>

#include "georef/coordsys.h"

namespace lumo::gdal {

/// The coordinate system that GDAL's object describes; empty for null, and where no plug-in reads
/// it. A transform to WGS 84 that changes nothing, as some formats always have it, is dropped where
/// the datum is known.
CoordSys ReadCoordSys(OGRSpatialReferenceH reference);

/// GDAL's object for a coordinate system, which the caller releases with OSRRelease; null for the
/// empty system, and for a text that GDAL can't read.
OGRSpatialReferenceH MakeSpatialReference(const CoordSys& system);

}  // namespace lumo::gdal
