#include "memory_connection.h"

#include <cstdio>

#include "georef/std_georef.h"
#include "memory_reader.h"
#include "raster/pixel_value.h"

namespace lumo::memory {
namespace {

GeoRefPtr MakeGeoRef(const Description& block) {
  if (block.pixelSizeX == 0 || block.pixelSizeY == 0) return {};
  auto* const grid = new StdGeoRef;
  GeoRefPtr owner(grid);
  grid->SetPixelSize(block.pixelSizeX, block.pixelSizeY);
  grid->SetTieMap(block.tieMapX, block.tieMapY);
  if (block.coordSys.find_first_not_of(' ') != std::string::npos) {
    CoordSys system;
    if (system.SetFromString(String(block.coordSys))) grid->SetCoordinateSystem(system);
  }
  return owner;
}

}  // namespace

bool Connection::Connect(const Array<String>& connStrings, const GeoRefPtr& geoRef,
                         const MetadataPtr& metadata) {
  Disconnect();
  Description block;
  if (!ReadDescription(connStrings, block)) return false;
  def_.samples = block.layout.samples;
  def_.lines = block.layout.lines;
  def_.bands = block.layout.bands;
  def_.interleave = block.layout.interleave;
  def_.dataType = block.dataType;
  def_.format = "MemoryRaster";
  def_.SetGeoRef(geoRef ? geoRef : MakeGeoRef(block));
  if (metadata) def_.metadata = *metadata;
  for (const auto& [band, value] : block.noData) {
    if (band < def_.bands && FitsPixel(def_.dataType, value)) def_.noData[band] = value;
  }
  connStrings_ = connStrings;
  block_ = std::move(block);
  return DispatchType(TwelveTypes{}, def_.dataType, [&]<typename T>() {
    dispatch_.Reset(new lumo::RasterReaderDispatch(RasterReaderPtr<T>(new Reader<T>(this))));
    return true;
  });
}

void Connection::Disconnect() {
  dispatch_.Reset(new lumo::RasterReaderDispatch);
  connStrings_ = Array<String>();
  block_ = Description();
  def_.Clear();
}

lumo::URI Connection::URI() {
  if (!IsConnected()) return lumo::URI();
  char address[32] = {};
  std::snprintf(address, sizeof address, "%p", block_.pixels);
  std::string text = "MemoryRaster ";
  text.append(block_.name).append(" ").append(address);
  for (std::size_t at = 0; (at = text.find(']', at)) != std::string::npos;) {
    text.replace(at, 1, "%5D");  // a URI travels in brackets
  }
  return lumo::URI(String(text));
}

}  // namespace lumo::memory
