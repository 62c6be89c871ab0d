#pragma once

#include <gdal.h>

#include "raster/raster_def.h"

class GDALPamDataset;

namespace lumo::gdal {

/// Enters the details that a source has beside the fields of a RasterDef, see raster_details.h.
/// @param hasGrid  whether the source's grid has become a geo-reference.
void ReadDetails(GDALDatasetH dataset, bool hasGrid, Metadata& metadata);

/// Gives a new dataset the details of a definition that are not of the place, as far as it has room
/// for them.
void WriteBandDetails(GDALDatasetH dataset, const RasterDef& def);

/// True when a definition has details of the place.
bool HasPlaceDetails(const RasterDef& def);

/// Gives a dataset those of the place. False when GDAL refuses them.
bool WritePlaceDetails(GDALDatasetH dataset, const RasterDef& def);

/// Puts those that a file doesn't hold by itself into the file beside it.
bool CompleteDetails(GDALPamDataset& file, const RasterDef& def);

/// True for a raster whose last band GDAL takes for a mask when it is alpha.
bool GivesMask(const RasterDef& def);

/// True when a definition says that a band marks which pixels of the others are valid.
bool IsAlpha(const RasterDef& def, unsigned band);

/// True when the first three bands are red, green and blue.
bool IsInColors(const RasterDef& def);

}  // namespace lumo::gdal
