#include "raster/raster_command.h"

#include "foundation/fault.h"

namespace lumo {

InputDeclaration RasterURIInput() {
  return {"URI", Presence::kRequired, ValueKind::kURI, "the raster"};
}

BasicRasterPtr RasterCommand::FindRaster(const char* name) const {
  const URI uri = Read<URI>(name);
  const BasicRasterPtr raster(CatalogFind(uri));
  if (raster && raster->IsValid()) return raster;
  SetFault(std::string(name) + ": no open raster [" + uri.ToUTF8() + "]");
  return {};
}

bool RasterCommand::CheckBands(const BasicRaster& raster, const Array<unsigned>& bands) {
  if (!bands.IsValid() || bands.GetCount() == 0) {
    SetFault(bands.IsValid() ? "no band is named" : "the bands are no integer array");
    return false;
  }
  for (const unsigned band : bands) {
    if (band < raster.Bands()) continue;
    SetFault("band " + std::to_string(band) + ": the raster has " + std::to_string(raster.Bands()) +
             ", counted from 0");
    return false;
  }
  return true;
}

}  // namespace lumo
