#pragma once

#include "foundation/fault.h"
#include "orva_pixels.h"
#include "orva_reader.h"
#include "raster/no_data_marker.h"

namespace lumo::orva {

template <typename T>
Reader<T>::Reader(Connection* connection, BandValues<T> values)
    : RasterReader<T>(connection), file_(*connection->GetFile()), values_(std::move(values)) {
  for (const auto& [band, number] : file_.GetHeader().noData) ParseNumber(number, noData_[band]);
}

template <typename T>
bool Reader<T>::Fail(const char* what) const {
  SetFault(file_.Path() + ": " + what);
  return false;
}

/// Puts values into the header, and keeps them when that has worked.
template <typename T>
bool Reader<T>::Store(BandValues<T> values) {
  if (!file_.ChangeHeader([&](HeaderText& text) { values.Write(text); })) return false;
  values_ = std::move(values);
  return true;
}

template <typename T>
bool Reader<T>::DropStats() {
  if (values_.stats.empty() && values_.histograms.empty()) return true;
  BandValues<T> left;
  left.palettes = values_.palettes;
  return Store(std::move(left));
}

template <typename T>
std::int32_t Reader<T>::StatsMask() {
  unsigned mask = kHasStats ? StatsMask::Extended : StatsMask::None;
  for (const auto& [band, stats] : values_.stats) mask &= stats.mask;
  return static_cast<std::int32_t>(mask);
}

template <typename T>
RasterBandStats<T> Reader<T>::ReadStats(unsigned band) {
  const auto found = values_.stats.find(band);
  return found != values_.stats.end() ? found->second : RasterBandStats<T>();
}

template <typename T>
bool Reader<T>::WriteStats(const Array<RasterBandStats<T>>& stats) {
  if (!kHasStats) return Fail("complex pixels have no statistics");
  BandValues<T> changed = values_;
  for (const RasterBandStats<T>& band : stats) {
    if (band.band >= Bands()) return Fail("statistics of a band that isn't there");
    if (band.mask == 0) {
      changed.stats.erase(band.band);
    } else {
      changed.stats[band.band] = band;
    }
  }
  return Store(std::move(changed));
}

template <typename T>
Array<RasterBandHistogram<T>> Reader<T>::Histogram(unsigned band) {
  std::vector<RasterBandHistogram<T>> found;
  for (const RasterBandHistogram<T>& histogram : values_.histograms) {
    if (histogram.band == band) found.push_back(histogram);
  }
  Array<RasterBandHistogram<T>> result;
  if (!found.empty() && result.Resize(ArrayDims(static_cast<unsigned>(found.size())))) {
    std::move(found.begin(), found.end(), result.begin());
  }
  return result;
}

template <typename T>
bool Reader<T>::WriteHistogram(const Array<RasterBandHistogram<T>>& histograms) {
  if (!kHasStats) return Fail("complex pixels have no histograms");
  BandValues<T> changed = values_;
  changed.histograms.assign(histograms.begin(), histograms.end());
  for (const RasterBandHistogram<T>& histogram : changed.histograms) {
    if (histogram.band >= Bands()) return Fail("a histogram of a band that isn't there");
    if (histogram.counts.GetCount() != histogram.binCount)
      return Fail("a histogram without counts");
  }
  return Store(std::move(changed));
}

template <typename T>
T Reader<T>::NoDataValue(unsigned band) {
  const auto found = noData_.find(band);
  return found != noData_.end() ? found->second : T{};
}

template <typename T>
lumo::Palette Reader<T>::Palette(unsigned band) {
  const auto found = values_.palettes.find(band);
  return found != values_.palettes.end() ? found->second : lumo::Palette();
}

template <typename T>
bool Reader<T>::WritePalette(unsigned band, const lumo::Palette& palette) {
  if (band >= Bands()) return Fail("a palette of a band that isn't there");
  if (palette.GetCount() == 0) return DeletePalette(band);
  BandValues<T> changed = values_;
  changed.palettes[band] = palette;
  return Store(std::move(changed));
}

template <typename T>
bool Reader<T>::DeletePalette(unsigned band) {
  BandValues<T> changed = values_;
  return changed.palettes.erase(band) == 0 || Store(std::move(changed));
}

template <typename T>
bool Reader<T>::ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                           const Array<unsigned>& bands, unsigned level, T* pixels,
                           unsigned char* state) {
  const FlatBlock block(Layout(), left, top, width, height, bands);
  if (level != 0 || !block.IsInside()) return Fail("a block outside the raster");
  std::vector<std::optional<T>> values;
  for (const unsigned band : bands) {
    const auto found = noData_.find(band);
    values.push_back(found != noData_.end() ? std::optional(found->second) : std::nullopt);
  }
  const NoDataMarker<T> marker(std::move(values), Layout().interleave, width, height);
  return orva::ReadPixels(file_, block, pixels, [&](std::uint64_t first, std::uint64_t count) {
    marker.Mark(first, count, pixels + first, state + first);
  });
}

template <typename T>
bool Reader<T>::WritePixels(unsigned left, unsigned top, unsigned width, unsigned height,
                            const Array<unsigned>& bands, unsigned level, const T* pixels,
                            const unsigned char*) {
  const FlatBlock block(Layout(), left, top, width, height, bands);
  if (level != 0 || !block.IsInside()) return Fail("a block outside the raster");
  if (!file_.CanWrite()) return Fail("opened for reading only");
  return DropStats() && orva::WritePixels(file_, block, pixels);
}

}  // namespace lumo::orva
