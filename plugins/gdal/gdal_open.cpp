#include "gdal_open.h"

#include "gdal_common/setting.h"

namespace lumo::gdal {

DatasetPtr OpenToRead(const Format& format, const Source& source) {
  if (format.drivers.front() != "GTiff") return OpenDataset(source, format, GDAL_OF_RASTER);
  const Setting direct("GTIFF_DIRECT_IO", "YES");
  return OpenDataset(source, format, GDAL_OF_RASTER);
}

}  // namespace lumo::gdal
