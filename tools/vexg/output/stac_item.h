#pragma once

#include <string>
#include <vector>

#include "foundation/color.h"
#include "output/json_number.h"
#include "output/keeping.h"

namespace lumo::host {

/// The raster that a STAC item tells of.
struct StacRaster {
  std::string file;  ///< its name, without a folder
  bool isCog = false;
  RasterContents contents;
  std::vector<Palette> palettes;  ///< of the bands; without colours where one has none
  std::vector<std::vector<std::string>> categories;  ///< names of values of the bands, from 0 on
};

/// The name of the item of a raster file: its own with the ending `.stac.json`, beside it.
std::string StacNameOf(const std::string& file);

/// Makes a STAC item (SpatioTemporal Asset Catalog 1.0.0) with the extensions projection 1.1,
/// raster 1.1 and, where a band has names of its values, classification 1.1.
///
/// Its time is that of the items TIFFTAG_DATETIME or ACQUISITIONDATETIME of the raster, as far as
/// they can be read, else that of its making. Without a known place, or
/// across the 180th meridian, its geometry is null.
Json StacItemOf(const StacRaster& raster);

}  // namespace lumo::host
