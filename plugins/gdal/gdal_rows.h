#pragma once

#include <string>

#include "gdal_common/source.h"
#include "gdal_new_mask.h"
#include "raster/rows_files.h"

namespace lumo::gdal {

// Files that hold the lines of a raster which is being made, see CreationOptions::rows.
//
// Failure: false, with the fault set.

/// Finds whether one of the files has a mask of its own.
bool FindRowsMask(const RowsFiles& rows, bool& hasMask);

/// Takes the masks of the files.
bool TakeRowsMasks(const RowsFiles& rows, unsigned samples, NewMask& mask);

/// Shows the pixels and masks of the files in a VRT dataset of the size of the whole.
bool AddRowsToVrt(const RowsFiles& rows, GDALDatasetH dataset);

/// Gives the files of a finished VRT file the names that hold at its place.
bool NameRowsOfVrt(const RowsFiles& rows, const std::string& path);

}  // namespace lumo::gdal
