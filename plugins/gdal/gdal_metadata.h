#pragma once

#include <gdal.h>

#include "metadata/metadata.h"
#include "raster/raster_storage.h"

namespace lumo::gdal {

class OpenRaster;

/// Reads the metadata that GDAL has of a raster: its items as texts at "/GDAL/<domain>/<item>",
/// those of its default domain at "/GDAL/Items/<item>". Domains that hold documents, and those that
/// stand for something else of the raster, are left out. The details of raster_details.h and the
/// storage of raster_storage.h come with them.
/// @param hasGrid  whether the source's grid has become a geo-reference.
Metadata ReadMetadata(GDALDatasetH dataset, bool hasGrid);

/// Tells how the pixels of the first band lie in the file.
RasterStorage ReadStorage(GDALDatasetH dataset);

/// All metadata that GDAL has of a raster as texts, for a definition file to translate: the items
/// of the default domain at "Items/<item>" below "/GDAL/", those of others and of the camera at
/// "<domain>/<item>", those of a band, counted from 1, at "Bands/<band>/<item>"; "Description",
/// "Unit", "Scale" and "Offset" of all bands where one has them; size and place at "Raster/",
/// "CoordSys/" and "Grid/".
void CollectTexts(const OpenRaster& raster, MetadataContainer& texts);

}  // namespace lumo::gdal
