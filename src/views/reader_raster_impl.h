#pragma once

#include <algorithm>

#include "foundation/fault.h"
#include "views/reader_raster.h"

namespace lumo {

template <typename T>
ReaderRaster<T>::ReaderRaster(const RasterReaderPtr<T>& reader,
                              const RasterDataConnectionPtr& connection,
                              const RasterReaderPtr<T>& pyramidReader,
                              const RasterDataConnectionPtr& pyramidConnection)
    : connection_(connection),
      pyramidConnection_(pyramidConnection),
      reader_(reader),
      pyramidReader_(pyramidReader) {
  if (!reader_) return;
  if (!pyramidReader_ && !pyramidConnection_ && connection_) {
    const Array<String> strings = connection_->ConnectionStrings();
    if (strings.GetCount() == 2 && FindFormatName(strings) == "Pyramid") {
      pyramidReader_ = reader_;
      pyramidConnection_ = connection_;
    }
  }
  const RasterDef def = reader_->RasterDef();
  if (pyramidReader_ && pyramidReader_->CanInheritNoDataValues()) {
    pyramidReader_->InheritNoDataValues(def);
  }
  if (connection_) uri_ = connection_->URI();
  samples_ = def.samples;
  lines_ = def.lines;
  bands_ = def.bands;
  tiles_.width = def.tileWidth;
  tiles_.height = def.tileHeight;
}

template <typename T>
ReaderRaster<T>::~ReaderRaster() = default;

template <typename T>
URI ReaderRaster<T>::GetURI() const {
  return uri_.GetLength() != 0 ? uri_ : this->DefaultURI("ReaderRaster");
}

template <typename T>
bool ReaderRaster<T>::CanWrite() const {
  return reader_ && reader_->CanWritePixels(0);
}

template <typename T>
RasterDef ReaderRaster<T>::GetRasterDef() const {
  return reader_ ? reader_->RasterDef() : RasterDef();
}

/// True when `call` is true for the pyramid's reader, or else for the source's.
template <typename T>
template <typename Call>
bool ReaderRaster<T>::AnyReader(const Call& call) const {
  return (pyramidReader_ && call(*pyramidReader_)) || (reader_ && call(*reader_));
}

template <typename T>
bool ReaderRaster<T>::PyramidExists() const {
  return AnyReader([](auto& reader) { return reader.PyramidExists(); });
}

template <typename T>
PyramidDef ReaderRaster<T>::GetPyramidDef() const {
  PyramidDef def;
  def.canBuild = true;
  AnyReader([&](auto& reader) {
    if (!reader.PyramidExists()) return false;
    def.pyramidType = static_cast<PyramidType>(reader.PyramidType());
    def.resamplingMethod = static_cast<PyramidResamplingMethod>(reader.PyramidResamplingMethod());
    def.levelMin = static_cast<unsigned>(reader.PyramidLevelMin());
    def.levelMax = static_cast<unsigned>(reader.PyramidLevelMax());
    return true;
  });
  return def;
}

template <typename T>
bool ReaderRaster<T>::PyramidDelete() {
  return pyramidReader_ && pyramidReader_->PyramidDelete();
}

template <typename T>
bool ReaderRaster<T>::PyramidRefresh() {
  return pyramidReader_ && pyramidReader_->PyramidRefresh();
}

template <typename T>
bool ReaderRaster<T>::StatsExist(unsigned band, unsigned mask) const {
  return AnyReader([&](auto& reader) {
    return reader.StatsExist(band) && (static_cast<unsigned>(reader.StatsMask()) & mask) == mask;
  });
}

template <typename T>
RasterBandStats<T> ReaderRaster<T>::BandStats(unsigned band) const {
  RasterBandStats<T> stats;
  AnyReader([&](auto& reader) {
    if (!reader.StatsExist(band)) return false;
    stats = reader.ReadStats(band);
    return true;
  });
  return stats;
}

template <typename T>
bool ReaderRaster<T>::HasNoDataValue(unsigned band) const {
  return reader_ && reader_->HasNoDataValue(band);
}

template <typename T>
T ReaderRaster<T>::NoDataValue(unsigned band) const {
  return reader_ ? reader_->NoDataValue(band) : T();
}

template <typename T>
bool ReaderRaster<T>::HasPalette(unsigned band) const {
  return reader_ && reader_->HasPalette(band);
}

template <typename T>
PalettePtr ReaderRaster<T>::Palette(unsigned band) const {
  if (!HasPalette(band)) return {};
  return PalettePtr(new lumo::Palette(reader_->Palette(band)));
}

template <typename T>
bool ReaderRaster<T>::WritePalette(unsigned band, const PalettePtr& palette) {
  return reader_ && palette && reader_->WritePalette(band, *palette);
}

template <typename T>
bool ReaderRaster<T>::DeletePalette(unsigned band) {
  return reader_ && reader_->DeletePalette(band);
}

/// True when a block lies inside the raster.
template <typename T>
bool ReaderRaster<T>::Holds(const SubRect& rect, const Array<unsigned>& bands) const {
  const bool inside =
      rect.left <= rect.right && rect.top <= rect.bottom && rect.right < samples_ &&
      rect.bottom < lines_ &&
      std::all_of(bands.begin(), bands.end(), [&](unsigned band) { return band < bands_; });
  if (!inside) SetFault(uri_.ToUTF8() + ": the block asked for isn't inside the raster");
  return inside;
}

template <typename T>
bool ReaderRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                 Interleave interleave, Array<T>& pixels,
                                 Array<unsigned char>& state) {
  if (!reader_ || !Holds(rect, bands)) return false;
  const std::lock_guard lock(pixelLock_);
  return reader_->ReadBlock(rect, bands, 0, interleave, pixels, state);
}

template <typename T>
bool ReaderRaster<T>::PutSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                 Interleave interleave, Array<T>& pixels,
                                 Array<unsigned char>& state) {
  if (!reader_ || !Holds(rect, bands) || !CanWrite()) return false;
  const std::lock_guard lock(pixelLock_);
  return reader_->WriteBlock(rect, bands, 0, interleave, pixels, state);
}

}  // namespace lumo
