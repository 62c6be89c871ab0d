#pragma once

#include <algorithm>

#include "raster/block_strides.h"
#include "raster/no_data_marker.h"
#include "raster/pixel_states.h"
#include "raster/pixel_value.h"
#include "tiff/tiff_reader.h"

namespace lumo::tiff {

template <typename T>
Reader<T>::Reader(RasterDataConnection* connection, Source& source, const lumo::RasterDef& def)
    : PlainRasterReader<T>(connection), source_(source), def_(def) {
  if (!source.NoData()) return;
  noData_ = ToPixel<T>(*source.NoData());
  def_.noData.clear();
  for (unsigned band = 0; noData_ && band < def_.bands; ++band) {
    if constexpr (std::is_arithmetic_v<T>) def_.noData[band] = static_cast<double>(*noData_);
  }
}

/// GDAL's reader of the same file; null, with the fault set, when there is none.
template <typename T>
RasterReader<T>* Reader<T>::Inner() {
  const RasterDataConnectionPtr inner = source_.Inner();
  return inner ? inner->RasterReaderDispatch()->template Get<T>().Get() : nullptr;
}

/// The same for what changes the file.
template <typename T>
RasterReader<T>* Reader<T>::Changing() {
  hasChanged_ = true;
  return Inner();
}

template <typename T>
unsigned Reader<T>::Samples(unsigned level) {
  if (RasterReader<T>* const inner = Opened()) return inner->Samples(level);
  const auto at = source_.Levels().find(level);
  return at != source_.Levels().end() ? at->second.samples : 0;
}

template <typename T>
unsigned Reader<T>::Lines(unsigned level) {
  if (RasterReader<T>* const inner = Opened()) return inner->Lines(level);
  const auto at = source_.Levels().find(level);
  return at != source_.Levels().end() ? at->second.lines : 0;
}

template <typename T>
std::int32_t Reader<T>::PyramidResamplingMethod() {
  RasterReader<T>* const inner = Opened();
  return inner != nullptr ? inner->PyramidResamplingMethod() : 0;
}

template <typename T>
std::int32_t Reader<T>::PyramidLevelMin() {
  if (RasterReader<T>* const inner = Opened()) return inner->PyramidLevelMin();
  return PyramidExists() ? static_cast<std::int32_t>(std::next(source_.Levels().begin())->first)
                         : 0;
}

template <typename T>
std::int32_t Reader<T>::PyramidLevelMax() {
  if (RasterReader<T>* const inner = Opened()) return inner->PyramidLevelMax();
  return PyramidExists() ? static_cast<std::int32_t>(source_.Levels().rbegin()->first) : 0;
}

template <typename T>
bool Reader<T>::PyramidExists() {
  if (RasterReader<T>* const inner = Opened()) return inner->PyramidExists();
  return source_.Levels().size() > 1;
}

template <typename T>
bool Reader<T>::PyramidBuild(std::int32_t levelMin, std::int32_t levelMax,
                             std::int32_t resamplingMethod, const TileDimensions& tiles) {
  RasterReader<T>* const inner = Changing();
  return inner != nullptr && inner->PyramidBuild(levelMin, levelMax, resamplingMethod, tiles);
}

template <typename T>
bool Reader<T>::PyramidRebuild() {
  RasterReader<T>* const inner = Changing();
  return inner != nullptr && inner->PyramidRebuild();
}

template <typename T>
bool Reader<T>::PyramidDelete() {
  RasterReader<T>* const inner = Changing();
  return inner != nullptr && inner->PyramidDelete();
}

template <typename T>
bool Reader<T>::PyramidRefresh() {
  RasterReader<T>* const inner = Changing();
  return inner != nullptr && inner->PyramidRefresh();
}

template <typename T>
std::int32_t Reader<T>::StatsMask() {
  return std::is_arithmetic_v<T> ? lumo::StatsMask::Extended : lumo::StatsMask::None;
}

template <typename T>
bool Reader<T>::StatsExist(unsigned band) {
  if (RasterReader<T>* const inner = Opened()) return inner->StatsExist(band);
  return ReadStats(band).mask != lumo::StatsMask::None;
}

template <typename T>
RasterBandStats<T> Reader<T>::ReadStats(unsigned band) {
  if (RasterReader<T>* const inner = Opened()) return inner->ReadStats(band);
  RasterBandStats<T> stats;
  if constexpr (std::is_arithmetic_v<T>) {
    const auto stored = band < def_.bands ? source_.Stored().Stats(band) : std::nullopt;
    if (!stored) return stats;
    const std::optional<unsigned>& masking = source_.MaskingBand();
    const bool allValid = std::is_integral_v<T> && !source_.NoData() && !source_.HasMasks() &&
                          (!masking || band == *masking);
    stats = gdal::FromStored<T>(*stored, std::uint64_t{def_.samples} * def_.lines, allValid);
    stats.band = band;
  }
  return stats;
}

template <typename T>
bool Reader<T>::WriteStats(const Array<RasterBandStats<T>>& stats) {
  RasterReader<T>* const inner = CanWriteStats() ? Inner() : nullptr;
  return inner != nullptr && inner->WriteStats(stats);
}

template <typename T>
Array<RasterBandHistogram<T>> Reader<T>::Histogram(unsigned band) {
  RasterReader<T>* const inner = source_.Stored().HasHistograms() ? Inner() : Opened();
  return inner != nullptr ? inner->Histogram(band) : Array<RasterBandHistogram<T>>();
}

template <typename T>
bool Reader<T>::WriteHistogram(const Array<RasterBandHistogram<T>>& histograms) {
  RasterReader<T>* const inner = CanWriteHistogram() ? Inner() : nullptr;
  return inner != nullptr && inner->WriteHistogram(histograms);
}

template <typename T>
bool Reader<T>::HasPalette(unsigned band) {
  if (RasterReader<T>* const inner = Opened()) return inner->HasPalette(band);
  return band < def_.bands && source_.Colors().GetCount() != 0;
}

template <typename T>
lumo::Palette Reader<T>::Palette(unsigned band) {
  if (RasterReader<T>* const inner = Opened()) return inner->Palette(band);
  return HasPalette(band) ? source_.Colors() : lumo::Palette();
}

template <typename T>
bool Reader<T>::WritePalette(unsigned band, const lumo::Palette& palette) {
  RasterReader<T>* const inner = Changing();
  return inner != nullptr && inner->WritePalette(band, palette);
}

template <typename T>
bool Reader<T>::DeletePalette(unsigned band) {
  RasterReader<T>* const inner = Changing();
  return inner != nullptr && inner->DeletePalette(band);
}

template <typename T>
bool Reader<T>::IsInside(unsigned left, unsigned top, unsigned width, unsigned height,
                         const Array<unsigned>& bands, unsigned level) const {
  const auto at = source_.Levels().find(level);
  return at != source_.Levels().end() && width != 0 && height != 0 && bands.GetCount() != 0 &&
         std::uint64_t{left} + width <= at->second.samples &&
         std::uint64_t{top} + height <= at->second.lines &&
         std::all_of(bands.begin(), bands.end(), [&](unsigned band) { return band < def_.bands; });
}

template <typename T>
bool Reader<T>::ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                           const Array<unsigned>& bands, unsigned level, T* pixels,
                           unsigned char* state) {
  const Rect rect{left, top, width, height};
  std::vector<unsigned char> mask;
  const bool isRead = !hasChanged_ && IsInside(left, top, width, height, bands, level) &&
                      (!source_.HasMasks() || source_.ReadMask(rect, level, mask)) &&
                      ReadMasked(rect, bands, level, pixels, state);
  if (!isRead) {
    // GDAL says what is wrong, or reads what is of another kind.
    RasterReader<T>* const inner = Inner();
    return inner != nullptr &&
           inner->ReadPixels(left, top, width, height, bands, level, pixels, state);
  }
  MarkNoData(width, height, bands.GetCount(), def_.interleave, pixels, state);
  if (!mask.empty()) {
    const BlockStrides strides(def_.interleave, width, height, bands.GetCount());
    for (unsigned y = 0; y < height; ++y) {
      ExcludeMasked(&mask[std::size_t{y} * width], width, bands.GetCount(), strides,
                    PixelValueState::Masked, state + y * strides.line);
    }
  }
  return true;
}

template <typename T>
void Reader<T>::MarkNoData(unsigned width, unsigned height, unsigned bands, Interleave order,
                           const T* pixels, unsigned char* state) const {
  if (!noData_) return;
  const NoDataMarker<T> marker(std::vector<std::optional<T>>(bands, noData_), order, width, height);
  marker.Mark(0, std::uint64_t{width} * height * bands, pixels, state);
}

template <typename T>
std::optional<bool> Reader<T>::ReadOrdered(const SubRect& rect, const Array<unsigned>& bands,
                                           unsigned level, Interleave order, T* pixels,
                                           BlockStates& states) {
  const unsigned width = rect.Width(), height = rect.Height(), count = bands.GetCount();
  const bool isOrdered =
      order == def_.interleave || def_.interleave == Interleave::BIP || count == 1;
  const bool isRead = isOrdered && !source_.MaskingBand() && !source_.HasMasks() && !hasChanged_ &&
                      IsInside(rect.left, rect.top, width, height, bands, level) &&
                      source_.Read({rect.left, rect.top, width, height}, bands, level, order,
                                   reinterpret_cast<unsigned char*>(pixels));
  if (!isRead) return std::nullopt;
  if (!noData_) return true;
  unsigned char* const state = states.Make(order, width, height, count);
  if (state != nullptr) MarkNoData(width, height, count, order, pixels, state);
  return state != nullptr;
}

/// Reads a block, and marks where the masking band is 0, in the other bands. States are only
/// touched when all is read.
template <typename T>
bool Reader<T>::ReadMasked(const Rect& rect, const Array<unsigned>& bands, unsigned level,
                           T* pixels, unsigned char* state) {
  const auto read = [&](const Array<unsigned>& chosen, T* to) {
    return source_.Read(rect, chosen, level, def_.interleave, reinterpret_cast<unsigned char*>(to));
  };
  const std::optional<unsigned>& masking = source_.MaskingBand();
  const auto isOther = [&](unsigned band) { return band != *masking; };
  if (!masking || std::none_of(bands.begin(), bands.end(), isOther)) return read(bands, pixels);
  const unsigned count = bands.GetCount();
  const std::size_t area = std::size_t{rect.width} * rect.height;
  const bool isByPixel = def_.interleave == Interleave::BIP;
  const BlockStrides strides(def_.interleave, rect.width, rect.height, count);
  const auto* const at = std::find(bands.begin(), bands.end(), *masking);
  std::vector<T> more;
  const T* mask = pixels + static_cast<std::size_t>(at - bands.begin()) * strides.band;
  std::size_t maskStride = strides.pixel;
  if (at != bands.end() || !isByPixel) {
    if (!read(bands, pixels)) return false;
  }
  if (at == bands.end()) {
    // The pixels of a block are decoded once, with those of the mask among them.
    Array<unsigned> chosen(isByPixel ? bands : Array<unsigned>());
    const unsigned last = chosen.GetCount();
    chosen.Resize(ArrayDims(last + 1));
    chosen[last] = *masking;
    maskStride = last + 1;
    more.resize(area * maskStride);
    if (!read(chosen, more.data())) return false;
    mask = more.data() + last;
    for (std::size_t pixel = 0; isByPixel && pixel < area; ++pixel) {
      std::copy_n(&more[pixel * maskStride], count, pixels + pixel * count);
    }
  }
  for (unsigned i = 0; i < count; ++i) {
    if (!isOther(bands[i])) continue;
    unsigned char* byte = state + i * strides.band;
    const T* value = mask;
    for (std::size_t pixel = 0; pixel < area; ++pixel, value += maskStride, byte += strides.pixel) {
      if (*value == T()) SetState(*byte, PixelValueState::Masked, true);
    }
  }
  return true;
}

template <typename T>
bool Reader<T>::WritePixels(unsigned left, unsigned top, unsigned width, unsigned height,
                            const Array<unsigned>& bands, unsigned level, const T* pixels,
                            const unsigned char* state) {
  RasterReader<T>* const inner = Changing();
  return inner != nullptr &&
         inner->WritePixels(left, top, width, height, bands, level, pixels, state);
}

}  // namespace lumo::tiff
