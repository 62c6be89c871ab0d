#pragma once

#include <cstdint>

#include "data/access_policy.h"
#include "data/data_manager.h"
#include "foundation/fault.h"
#include "georef/std_georef.h"
#include "views/sources/catalog_raster_ref.h"
#include "views/sources/memory_raster.h"

namespace lumo {

namespace detail {

/// The connection string of a block.
String MemoryConnectionText(const void* pixelData, const String& name, unsigned samples,
                            unsigned lines, unsigned bands, Interleave interleave,
                            unsigned dataType, const GeoRefPtr& geoRef);

/// An affine geo-reference from its parts.
GeoRefPtr MakeStdGeoRef(double pixelSizeX, double pixelSizeY, double tieX, double tieY,
                        const String& coordSys);

/// The connection string of its no-data values: "NODATA=<band>:<value>,<band>:<value>".
String MemoryNoDataText(const std::map<unsigned, double>& noData);

/// Opens the block; empty, with the fault set, when that can't be done.
template <typename T>
RasterPtr<T> OpenMemory(const String& name, T* pixelData, unsigned samples, unsigned lines,
                        unsigned bands, Interleave interleave, const GeoRefPtr& geoRef,
                        const std::map<unsigned, double>& noData = {}) {
  if (pixelData == nullptr) return {};
  if (bands > 0xFFFF) {
    SetFault("a memory raster has no more than 65535 bands");
    return {};
  }
  const String text = MemoryConnectionText(pixelData, name, samples, lines, bands, interleave,
                                           kDataTypeOf<T>, geoRef);
  Array<String> strings = ConnStrings({"MemoryRaster", text});
  if (!noData.empty() && strings.Resize(ArrayDims(3))) strings[2] = MemoryNoDataText(noData);
  const OwnMemoryScope own;
  return RasterPtr<T>(
      MakeReaderRaster(GetGlobalDataManager().Connect(strings, GeoRefPtr(), MetadataPtr())));
}

}  // namespace detail

template <typename T>
MemoryRaster<T>::MemoryRaster(const RasterPtr<T>& opened, const GeoRefPtr& geoRef)
    : ComputedRaster<T>(opened), geoRef_(CloneOf(geoRef)), valid_(bool(opened)) {
  if (geoRef_) geoRef_->SetDimensions(this->Samples(), this->Lines());
}

template <typename T>
MemoryRaster<T>::MemoryRaster(const String& name, T* pixelData, unsigned samples, unsigned lines,
                              unsigned bands, Interleave interleave, const GeoRefPtr& geoRef)
    : MemoryRaster(detail::OpenMemory(name, pixelData, samples, lines, bands, interleave, geoRef),
                   geoRef) {}

template <typename T>
MemoryRaster<T>::MemoryRaster(const String& name, T* pixelData, unsigned samples, unsigned lines,
                              unsigned bands, Interleave interleave, double pixelSizeX,
                              double pixelSizeY, double tieX, double tieY, const String& coordSys)
    : MemoryRaster(name, pixelData, samples, lines, bands, interleave,
                   detail::MakeStdGeoRef(pixelSizeX, pixelSizeY, tieX, tieY, coordSys)) {}

template <typename T>
MemoryRaster<T>::~MemoryRaster() {
  this->StopComputing();
}

template <typename T>
RasterDef MemoryRaster<T>::GetRasterDef() const {
  RasterDef def = ComputedRaster<T>::GetRasterDef();
  if (geoRef_) def.geoRef = CloneOf(geoRef_);
  return def;
}

template <typename T>
lumo::TileDimensions MemoryRaster<T>::TileDimensions() const {
  lumo::TileDimensions tiles;
  tiles.width = this->Samples();
  tiles.height = this->Lines();
  return tiles;
}

template <typename T>
AutoMemoryRaster<T>::AutoMemoryRaster(const String& name, unsigned samples, unsigned lines,
                                      unsigned bands, Interleave interleave,
                                      const GeoRefPtr& geoRef,
                                      const std::map<unsigned, double>& noData)
    : AutoMemoryRaster(name, Allocate(samples, lines, bands), samples, lines, bands, interleave,
                       geoRef, noData) {}

template <typename T>
AutoMemoryRaster<T>::AutoMemoryRaster(const String& name, Block block, unsigned samples,
                                      unsigned lines, unsigned bands, Interleave interleave,
                                      const GeoRefPtr& geoRef,
                                      const std::map<unsigned, double>& noData)
    : MemoryRaster<T>(
          detail::OpenMemory(name, block.get(), samples, lines, bands, interleave, geoRef, noData),
          geoRef),
      block_(std::move(block)) {}

/// A block for so many pixels; none, with the fault set, when there is no memory. All pixels are 0:
/// memory that was in use before may hold anything.
template <typename T>
typename AutoMemoryRaster<T>::Block AutoMemoryRaster<T>::Allocate(unsigned samples, unsigned lines,
                                                                  unsigned bands) {
  const double bytes = 1.0 * samples * lines * bands * sizeof(T);  // may be beyond any integer
  Block block;
  if (bytes > 0 && bytes < static_cast<double>(PTRDIFF_MAX)) {
    block.reset(static_cast<T*>(std::calloc(std::size_t{samples} * lines * bands, sizeof(T))));
  }
  if (!block) SetFault("there is no memory for the raster");
  return block;
}

template <typename T>
AutoMemoryRaster<T>::~AutoMemoryRaster() {
  this->StopComputing();
  this->ResetParent();  // before its block goes
}

template <typename T>
RasterDef AutoMemoryRaster<T>::GetRasterDef() const {
  RasterDef def = MemoryRaster<T>::GetRasterDef();
  if (this->IsValid()) def.format = "AutoMemoryRaster";
  return def;
}

}  // namespace lumo
