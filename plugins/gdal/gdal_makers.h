#pragma once

#include <cpl_string.h>
#include <string>
#include <vector>

#include "gdal_common/source.h"
#include "raster/raster_def.h"

namespace lumo::gdal {

/// How the formats that can be made are made. What isn't here is only read: the drivers of GDAL
/// that are left out make a file that differs from what was written.
struct Maker {
  const char* driver;
  bool isCopied;        ///< written in one go
  const char* options;  ///< separated by blanks; those that keep every value
  bool roundsGrid = false;
  bool changesValues = false;  ///< a no-data value would not stay one
};

/// How files of a driver are made; null for one whose files are only read.
const Maker* FindMaker(const std::string& driver);

/// The options of a maker, as GDAL takes them.
CPLStringList OptionsOf(const Maker& maker);

/// Adds the options by which a TIFF file states the meaning of its bands. Without them GDAL takes
/// the fourth of four bands of bytes for alpha.
void AddMeaning(const RasterDef& def, CPLStringList& options);

/// True for a driver that takes a pixel type of signed bytes.
bool HoldsSignedBytes(GDALDriverH driver);

/// The part of a definition that a format keeps in any case.
RasterDef AsKept(const std::string& driver, const RasterDef& def);

/// True when not all bands have the same no-data value.
bool DiffersByBand(const RasterDef& def);

/// Gives the bands of a dataset their no-data values. False when the format refuses one.
bool SetNoData(GDALDatasetH dataset, const RasterDef& def);

/// The value of pixels that nobody writes, of a raster with one no-data value or none: that value
/// where pixels can hold it, else 0.
std::vector<unsigned char> FillValueOf(const RasterDef& def);

}  // namespace lumo::gdal
