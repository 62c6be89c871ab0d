#pragma once

#include <filesystem>

#include "data/data_manager.h"
#include "views/sources/catalog_raster_ref.h"
#include "views/sources/temp_raster.h"

namespace lumo {

namespace detail {

/// A description of no more than this.
inline RasterDef TempDef(unsigned samples, unsigned lines, unsigned bands,
                         const GeoRefPtr& geoRef) {
  RasterDef def;
  def.samples = samples;
  def.lines = lines;
  def.bands = bands;
  def.SetGeoRef(geoRef);
  return def;
}

}  // namespace detail

template <typename T>
typename TempRaster<T>::Made TempRaster<T>::Make(const Context& context, RasterDef def) {
  def.interleave = Interleave::BIP;
  def.dataType = kDataTypeOf<T>;
  def.format = "ORVA";
  def.tileWidth = def.tileHeight = 0;
  Made made;
  made.fileName = TempFileName(context.WorkingDirectory(), "tmpraster", "");
  if (made.fileName.GetLength() == 0) return made;
  made.raster = RasterPtr<T>(MakeReaderRaster(
      GetGlobalDataManager().CreateRaster(ConnStrings({def.format, made.fileName}), def)));
  return made;
}

template <typename T>
TempRaster<T>::TempRaster(const Made& made)
    : ComputedRaster<T>(made.raster), fileName_(made.fileName), valid_(bool(made.raster)) {}

template <typename T>
TempRaster<T>::TempRaster(const Context& context, const RasterDef& def)
    : TempRaster(Make(context, def)) {}

template <typename T>
TempRaster<T>::TempRaster(const Context& context, unsigned samples, unsigned lines, unsigned bands,
                          const GeoRefPtr& geoRef)
    : TempRaster(context, detail::TempDef(samples, lines, bands, geoRef)) {}

template <typename T>
TempRaster<T>::TempRaster(unsigned samples, unsigned lines, unsigned bands, const GeoRefPtr& geoRef)
    : TempRaster(Context(), samples, lines, bands, geoRef) {}

template <typename T>
TempRaster<T>::~TempRaster() {
  this->StopComputing();
  this->ResetParent();  // closes the file, whose header is written then
  if (keepFile_ || fileName_.GetLength() == 0) return;
  const std::string path = fileName_.ToUTF8();
  std::error_code gone;
  std::filesystem::remove(path, gone);
  std::filesystem::remove(path + ".hdr", gone);
}

template <typename T>
URI TempRaster<T>::GetURI() const {
  return valid_ ? this->Parent()->GetURI() : this->DefaultURI("TempRaster");
}

}  // namespace lumo
