#pragma once

#include <algorithm>

#include "data/mt_connection.h"
#include "foundation/fault.h"
#include "raster/raster_details.h"
#include "views/pyramid_raster_impl.h"
#include "views/sources/file_state.h"
#include "views/sources/reader_raster.h"

namespace lumo {

template <typename T>
ReaderRaster<T>::ReaderRaster(const RasterReaderPtr<T>& reader,
                              const RasterDataConnectionPtr& connection,
                              const RasterReaderPtr<T>& pyramidReader,
                              const RasterDataConnectionPtr& pyramidConnection, const URI& uri)
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
    RasterDef told = def;
    told.metadata = Metadata();
    const std::string state = connection_ ? FileStateOf(*connection_) : std::string();
    if (!state.empty()) told.metadata.Set(FileStatePath(), String(state));
    pyramidReader_->InheritNoDataValues(told);
  }
  uri_ = uri;
  if (connection_ && uri_.GetLength() == 0) uri_ = connection_->URI();
  samples_ = def.samples;
  lines_ = def.lines;
  bands_ = def.bands;
  tiles_.width = def.tileWidth;
  tiles_.height = def.tileHeight;
  if (pyramidReader_ && connection_ && pyramidConnection_) {
    pyramid_.Reset(new DynamicRasterPyramid<T>(
        reader_, connection_, pyramidReader_, pyramidConnection_,
        [](const auto&... sources) { return RasterPtr<T>(new ReaderRaster(sources...)); }));
  }
}

template <typename T>
ReaderRaster<T>::~ReaderRaster() {
  pyramid_ = DynamicRasterPyramidPtr<T>();
  this->StopComputing();
}

template <typename T>
URI ReaderRaster<T>::GetURI() const {
  return uri_.GetLength() != 0 ? uri_ : this->DefaultURI("ReaderRaster");
}

template <typename T>
bool ReaderRaster<T>::IsUpToDate() const {
  auto* const proxy = dynamic_cast<MtRasterDataConnection*>(connection_.Get());
  if (proxy == nullptr) return true;
  const SourceStamp opened = proxy->Stamp();
  return written_ ? opened.HasSameFiles() : opened.IsCurrent();
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

/// The same over readers whose stored statistics hold for the pixels as they are.
template <typename T>
template <typename Call>
bool ReaderRaster<T>::AnyReaderWithStats(const Call& call) const {
  const std::uint64_t writes = WriteCount();
  return AnyReader([&](auto& reader) { return reader.StatsHoldFor() == writes && call(reader); });
}

template <typename T>
bool ReaderRaster<T>::HistogramsHold(const RasterReaderPtr<T>& reader) const {
  return reader && reader->HistogramsHoldFor() == WriteCount();
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
AsyncPtr ReaderRaster<T>::PyramidBuild(const PyramidDef& def, const lumo::TileDimensions& tiles,
                                       const AsyncCallbackPtr& callback) {
  if (pyramid_) return pyramid_->PyramidBuild(def, tiles, callback);
  SetFault(uri_.ToUTF8() + ": the raster was opened without a pyramid");
  return {};
}

template <typename T>
AsyncPtr ReaderRaster<T>::PyramidAsync() const {
  return pyramid_ ? pyramid_->PyramidAsync() : AsyncPtr();
}

template <typename T>
RasterPtr<T> ReaderRaster<T>::PyramidLevel(unsigned level) {
  if (pyramidReader_ && pyramidReader_->PyramidExists()) {
    return RasterPtr<T>(new PyramidRasterImpl<T>(*this, pyramidReader_, pyramidConnection_, level));
  }
  if (reader_ && reader_->PyramidExists()) {
    return RasterPtr<T>(new PyramidRasterImpl<T>(*this, reader_, connection_, level));
  }
  return {};
}

template <typename T>
RasterPtr<T> ReaderRaster<T>::StoredPyramidLevel(unsigned level) {
  if (!pyramidReader_) return {};
  return RasterPtr<T>(new PyramidRasterImpl<T>(*this, pyramidReader_, pyramidConnection_, level));
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
  return ComputedRaster<T>::StatsExist(band, mask) ||
         (pyramid_ && pyramid_->StatsExist(band, mask)) || AnyReaderWithStats([&](auto& reader) {
           return (static_cast<unsigned>(reader.StatsMask()) & mask) == mask &&
                  reader.StatsExist(band) && (reader.ReadStats(band).mask & mask) == mask;
         });
}

template <typename T>
RasterBandStats<T> ReaderRaster<T>::BandStats(unsigned band) const {
  RasterBandStats<T> stats = ComputedRaster<T>::BandStats(band);
  if (stats.mask != StatsMask::None) return stats;
  if (pyramid_) stats = pyramid_->BandStats(band);
  if (stats.mask != StatsMask::None) return stats;
  AnyReaderWithStats([&](auto& reader) {
    if (!reader.StatsExist(band)) return false;
    stats = reader.ReadStats(band);
    return true;
  });
  stats.band = band;
  return stats;
}

template <typename T>
StatValue<T> ReaderRaster<T>::StatOf(StatsMask::Code stat, unsigned band, unsigned otherBand,
                                     const IPC& ipc) {
  const std::lock_guard lock(statsLock_);
  if (StatsExist(band, stat)) {
    const RasterBandStats<T> stats = BandStats(band);
    if ((stats.mask & stat) != 0) {
      ipc.progress->Update(1.0);
      return stats.ValueOf(stat, otherBand);
    }
  }
  return ComputedRaster<T>::StatOf(stat, band, otherBand, ipc);
}

template <typename T>
bool ReaderRaster<T>::WriteStats() {
  const std::uint64_t writes = WriteCount();
  Array<RasterBandStats<T>> all{ArrayDims(bands_)};
  for (unsigned band = 0; band < all.GetCount(); ++band) all[band] = BandStats(band);
  return StoreIn(&RasterReader<T>::CanWriteStats, [&](auto& reader) {
    if (!reader.WriteStats(all)) return false;
    // A source that did not take away what isn't given has it of other pixels, perhaps.
    const bool hasOthers = std::any_of(all.begin(), all.end(), [&](const auto& stats) {
      return stats.mask == StatsMask::None && reader.StatsExist(stats.band);
    });
    if (!hasOthers) reader.SetStatsHoldFor(writes);
    return true;
  });
}

template <typename T>
Array<RasterBandHistogram<T>> ReaderRaster<T>::BandHistogram(unsigned band) const {
  Array<RasterBandHistogram<T>> merged;
  if constexpr (std::is_arithmetic_v<T>) {  // complex numbers have none
    const auto join = [&](const Array<RasterBandHistogram<T>>& histograms) {
      for (const RasterBandHistogram<T>& histogram : histograms) {
        const bool counts = histogram.band == band && histogram.source != StatsSource::kUnknown;
        if (!counts || std::find(merged.begin(), merged.end(), histogram) != merged.end()) continue;
        const unsigned at = merged.GetCount();
        if (merged.Resize(ArrayDims(at + 1))) merged[at] = histogram;
      }
    };
    if (HistogramsHold(pyramidReader_)) join(pyramidReader_->Histogram(band));
    join(ComputedRaster<T>::BandHistogram(band));
    if (HistogramsHold(reader_)) join(reader_->Histogram(band));
  }
  return merged;
}

template <typename T>
bool ReaderRaster<T>::WriteHistogram() {
  const std::uint64_t writes = WriteCount();
  Array<RasterBandHistogram<T>> all;
  for (unsigned band = 0; band < bands_; ++band) {
    for (const RasterBandHistogram<T>& histogram : BandHistogram(band)) {
      const unsigned at = all.GetCount();
      if (all.Resize(ArrayDims(at + 1))) all[at] = histogram;
    }
  }
  const bool hasStale =
      (reader_ && !HistogramsHold(reader_)) || (pyramidReader_ && !HistogramsHold(pyramidReader_));
  if (all.GetCount() == 0 && !hasStale) return true;
  return StoreIn(&RasterReader<T>::CanWriteHistogram, [&](auto& reader) {
    if (!reader.WriteHistogram(all)) return false;
    reader.SetHistogramsHoldFor(writes);
    return true;
  });
}

/// Stores something in the source and in the pyramid's file, as far as they can; having nowhere to
/// store is no failure.
template <typename T>
template <typename Can, typename Store>
bool ReaderRaster<T>::StoreIn(const Can& can, const Store& store) {
  written_ = true;
  for (const RasterReaderPtr<T>& reader : {reader_, pyramidReader_}) {
    if (reader && ((*reader).*can)() && !store(*reader)) return false;
  }
  return true;
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
  written_ = true;
  return reader_ && palette && reader_->WritePalette(band, *palette);
}

template <typename T>
bool ReaderRaster<T>::DeletePalette(unsigned band) {
  written_ = true;
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
bool ReaderRaster<T>::GetBlock(const SubRect& rect, const Array<unsigned>& bands,
                               Interleave interleave, Array<T>& pixels, BlockStates& states) {
  if (!reader_ || !Holds(rect, bands)) return false;
  const std::lock_guard lock(pixelLock_);
  return reader_->ReadBlock(rect, bands, 0, interleave, pixels, states);
}

template <typename T>
bool ReaderRaster<T>::PutSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                 Interleave interleave, Array<T>& pixels,
                                 Array<unsigned char>& state) {
  if (!reader_ || !Holds(rect, bands) || !CanWrite()) return false;
  written_ = true;
  const std::uint64_t before = WriteCount();
  bool isWritten = false;
  {
    const std::lock_guard lock(pixelLock_);
    isWritten = reader_->WriteBlock(rect, bands, 0, interleave, pixels, state);
  }
  if (WriteCount() != before) DropStatsOfPyramid();
  return isWritten;
}

/// Takes what the pyramid's file stores of the pixels before a write out of it, once. Where that
/// can't be done it is not given all the same.
template <typename T>
void ReaderRaster<T>::DropStatsOfPyramid() {
  constexpr std::uint64_t kNone = UINT64_MAX;  // a number of writes that there never is
  if (!pyramidReader_ || pyramidReader_.Get() == reader_.Get() ||
      (pyramidReader_->StatsHoldFor() == kNone && pyramidReader_->HistogramsHoldFor() == kNone)) {
    return;
  }
  pyramidReader_->SetStatsHoldFor(kNone);
  pyramidReader_->SetHistogramsHoldFor(kNone);
  bool hasStats = false, hasHistograms = false;
  Array<RasterBandStats<T>> none{ArrayDims(bands_)};
  for (unsigned band = 0; band < none.GetCount(); ++band) {
    none[band].band = band;
    hasStats = hasStats || pyramidReader_->StatsExist(band);
    hasHistograms = hasHistograms || pyramidReader_->Histogram(band).GetCount() != 0;
  }
  if (hasStats && pyramidReader_->CanWriteStats()) pyramidReader_->WriteStats(none);
  if (hasHistograms && pyramidReader_->CanWriteHistogram()) pyramidReader_->WriteHistogram({});
}

}  // namespace lumo
