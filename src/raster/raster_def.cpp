#include "raster/raster_def.h"

namespace lumo {

RasterDef::RasterDef(const RasterDef& other)
    : noData(other.noData),
      samples(other.samples),
      lines(other.lines),
      bands(other.bands),
      tileWidth(other.tileWidth),
      tileHeight(other.tileHeight),
      interleave(other.interleave),
      dataType(other.dataType),
      format(other.format),
      geoRef(CloneOf(other.geoRef)),
      metadata(other.metadata),
      creation(other.creation) {
  std::copy(std::begin(other.sourceFields), std::end(other.sourceFields), std::begin(sourceFields));
}

RasterDef& RasterDef::operator=(const RasterDef& other) {
  if (this != &other) *this = RasterDef(other);
  return *this;
}

void RasterDef::SetGeoRef(const GeoRefPtr& source) {
  geoRef = CloneOf(source);
  if (!geoRef.IsNull()) geoRef->SetDimensions(samples, lines);
}

void RasterDef::SetNoData(unsigned band, bool has) {
  if (has) {
    noData.try_emplace(band, 0.0);
  } else {
    noData.erase(band);
  }
}

}  // namespace lumo
