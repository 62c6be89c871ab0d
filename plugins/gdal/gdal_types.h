#pragma once

#include <gdal.h>

#include "raster/pixel_types.h"

namespace lumo::gdal {

/// A pixel type in GDAL's terms. Signed bytes are bytes with a mark.
struct PixelType {
  GDALDataType type = GDT_Unknown;
  bool isSignedByte = false;
};

/// GDAL's type for a data type code; GDT_Unknown for a code without a pixel type.
PixelType PixelTypeOf(unsigned dataType);

/// The code of the type that holds the pixels of all bands without loss; complex integers are
/// widened to complex floating-point numbers. 0, with the fault set, when there is none.
unsigned CommonDataType(GDALDatasetH dataset, const std::string& name);

}  // namespace lumo::gdal
