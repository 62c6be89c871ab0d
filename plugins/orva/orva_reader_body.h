#pragma once

#include <algorithm>

#include "data/merge_values.h"
#include "foundation/fault.h"
#include "orva/orva_pixels.h"
#include "orva/orva_reader.h"
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

/// Lets `change` change the values that the header has now, and keeps them when they are stored.
template <typename T>
template <typename F>
bool Reader<T>::Change(F&& change) {
  BandValues<T> changed;
  const bool stored = file_.ChangeHeader([&](Header& header) {
    std::string fault;
    if (!changed.Read(header, fault)) {
      SetFault(HeaderPath(file_.Path()) + ": " + fault);
      return false;
    }
    change(changed);
    changed.Write(header.text);
    return true;
  });
  if (stored) values_ = std::move(changed);
  return stored;
}

template <typename T>
bool Reader<T>::DropStats() {
  if (hasWrittenPixels_ && values_.stats.empty() && values_.histograms.empty()) return true;
  hasWrittenPixels_ = Change([](BandValues<T>& values) {
    values.stats.clear();
    values.histograms.clear();
  });
  return hasWrittenPixels_;
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
  for (const RasterBandStats<T>& band : stats) {
    if (band.band >= Bands()) return Fail("statistics of a band that isn't there");
  }
  return Change([&](BandValues<T>& values) { MergeStats(stats, values_.stats, values.stats); });
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
  for (const RasterBandHistogram<T>& histogram : histograms) {
    if (histogram.band >= Bands()) return Fail("a histogram of a band that isn't there");
    if (histogram.counts.GetCount() != histogram.binCount)
      return Fail("a histogram without counts");
  }
  return Change([&](BandValues<T>& values) {
    MergeHistograms(histograms, values_.histograms, values.histograms);
  });
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
  return Change([&](BandValues<T>& values) { values.palettes[band] = palette; });
}

template <typename T>
bool Reader<T>::DeletePalette(unsigned band) {
  return Change([&](BandValues<T>& values) { values.palettes.erase(band); });
}

template <typename T>
std::optional<bool> Reader<T>::ReadOrdered(const SubRect& rect, const Array<unsigned>& bands,
                                           unsigned level, Interleave order, T* pixels,
                                           BlockStates& /*states*/) {
  const bool isStraight = order == Layout().interleave || bands.GetCount() == 1;
  const auto hasNoData = [&](unsigned band) { return noData_.contains(band); };
  if (!isStraight || std::any_of(bands.begin(), bands.end(), hasNoData)) return std::nullopt;
  return ReadPixels(rect.left, rect.top, rect.Width(), rect.Height(), bands, level, pixels,
                    nullptr);  // which only marks no data
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
    if (marker.IsNeeded()) marker.Mark(first, count, pixels + first, state + first);
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
