#include <cstdio>

#include "views/sources/memory_raster_body.h"

namespace lumo {

namespace detail {

String MemoryConnectionText(const void* pixelData, const String& name, unsigned samples,
                            unsigned lines, unsigned bands, Interleave interleave,
                            unsigned dataType, const GeoRefPtr& geoRef) {
  const bool placed = !geoRef.IsNull();
  char numbers[512];
  std::snprintf(numbers, sizeof(numbers),
                ";SAMPLES=%u;LINES=%u;BANDS=%u;INTERLEAVE=%d;PIXELTYPE=%u;PIXELSIZE=%.9f,%.9f;"
                "TIEPTMAP=%.9f,%.9f;COORDSYS=",
                samples, lines, bands, static_cast<int>(interleave), dataType,
                placed ? geoRef->PixelSizeX() : 0.0, placed ? geoRef->PixelSizeY() : 0.0,
                placed ? geoRef->TieMapX() : 0.0, placed ? geoRef->TieMapY() : 0.0);
  char address[32];
  std::snprintf(address, sizeof(address), "PIXELDATA=%p;NAME=", pixelData);
  String coordSys;
  if (placed) geoRef->CoordinateSystem().ToString(coordSys);
  if (coordSys.GetLength() == 0) coordSys = " ";
  return std::string(address).append(name.ToUTF8()).append(numbers).append(coordSys.ToUTF8());
}

String MemoryNoDataText(const std::map<unsigned, double>& noData) {
  std::string text = "NODATA=";
  for (const auto& [band, value] : noData) {
    if (text.back() != '=') text += ',';
    text.append(std::to_string(band)).append(":").append(FormatValue(value).ToUTF8());
  }
  return String(text);
}

GeoRefPtr MakeStdGeoRef(double pixelSizeX, double pixelSizeY, double tieX, double tieY,
                        const String& coordSys) {
  const GeoRefPtr made(new StdGeoRef);
  made->SetPixelSize(pixelSizeX, pixelSizeY);
  made->SetTieMap(tieX, tieY);
  CoordSys system;
  if (coordSys.GetLength() != 0 && system.SetFromString(coordSys)) {
    made->SetCoordinateSystem(system);
  }
  return made;
}

}  // namespace detail

VEXG_INSTANCES(EIGHT, MemoryRaster);
VEXG_INSTANCES(EIGHT, AutoMemoryRaster);

}  // namespace lumo
