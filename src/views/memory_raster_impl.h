#pragma once

#include <cstdint>
#include <new>

#include "data/access_policy.h"
#include "data/data_manager.h"
#include "foundation/fault.h"
#include "georef/std_georef.h"
#include "views/catalog_raster_ref.h"
#include "views/memory_raster.h"

namespace lumo {

namespace detail {

/// The connection string of a block.
String MemoryConnectionText(const void* pixelData, const String& name, unsigned samples,
                            unsigned lines, unsigned bands, Interleave interleave,
                            unsigned dataType, const GeoRefPtr& geoRef);

/// An affine geo-reference from its parts.
GeoRefPtr MakeStdGeoRef(double pixelSizeX, double pixelSizeY, double tieX, double tieY,
                        const String& coordSys);

/// Opens the block; empty, with the fault text told, when that can't be done.
template <typename T>
RasterPtr<T> OpenMemory(const String& name, T* pixelData, unsigned samples, unsigned lines,
                        unsigned bands, Interleave interleave, const GeoRefPtr& geoRef) {
  if (pixelData == nullptr) return {};
  if (bands > 0xFFFF) {
    SetFault("a memory raster has no more than 65535 bands");
    return {};
  }
  const String text = MemoryConnectionText(pixelData, name, samples, lines, bands, interleave,
                                           kDataTypeOf<T>, geoRef);
  const OwnMemoryScope own;
  return RasterPtr<T>(MakeReaderRaster(GetGlobalDataManager().Connect(
      ConnStrings({"MemoryRaster", text}), GeoRefPtr(), MetadataPtr())));
}

/// A block for so many pixels; none, with the fault told, when there is no memory.
template <typename T>
std::unique_ptr<T[]> AllocateBlock(unsigned samples, unsigned lines, unsigned bands) {
  const double bytes = 1.0 * samples * lines * bands * sizeof(T);  // may be beyond any integer
  std::unique_ptr<T[]> block;
  if (bytes > 0 && bytes < static_cast<double>(PTRDIFF_MAX)) {
    block.reset(new (std::nothrow) T[std::size_t{samples} * lines * bands]);
  }
  if (!block) SetFault("there is no memory for the raster");
  return block;
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
                                      const GeoRefPtr& geoRef)
    : AutoMemoryRaster(name, detail::AllocateBlock<T>(samples, lines, bands), samples, lines, bands,
                       interleave, geoRef) {}

template <typename T>
AutoMemoryRaster<T>::AutoMemoryRaster(const String& name, std::unique_ptr<T[]> block,
                                      unsigned samples, unsigned lines, unsigned bands,
                                      Interleave interleave, const GeoRefPtr& geoRef)
    : MemoryRaster<T>(name, block.get(), samples, lines, bands, interleave, geoRef),
      block_(std::move(block)) {}

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
