#pragma once

#include <algorithm>
#include <cmath>
#include <cpl_conv.h>
#include <cpl_string.h>
#include <limits>

#include "gdal_band_values.h"
#include "gdal_common/messages.h"
#include "gdal_no_data.h"
#include "gdal_reader.h"
#include "raster/block_strides.h"
#include "raster/level_reduction.h"
#include "raster/no_data_marker.h"
#include "raster/pixel_states.h"
#include "raster/pixel_value.h"
#include "raster/raster_details.h"

namespace lumo::gdal {

namespace detail {

/// Our histogram from GDAL's. A bin holds its lower edge, not its upper one.
template <typename T>
RasterBandHistogram<T> FromStored(unsigned band, const StoredHistogram& stored) {
  RasterBandHistogram<T> histogram;
  histogram.band = band;
  histogram.source = StatsSource::kNative;
  histogram.binCount = stored.counts.GetCount();
  histogram.binSize = (stored.highEdge - stored.lowEdge) / histogram.binCount;
  histogram.counts = stored.counts;
  double low = stored.lowEdge, high = stored.highEdge;
  if constexpr (std::is_integral_v<T>) {
    low = std::max(std::ceil(low), static_cast<double>(std::numeric_limits<T>::min()));
    high = std::min(std::ceil(high) - 1, static_cast<double>(std::numeric_limits<T>::max()));
  }
  histogram.min = ToPixel<T>(low).value_or(std::numeric_limits<T>::lowest());
  histogram.max = ToPixel<T>(high).value_or(std::numeric_limits<T>::max());
  return histogram;
}

template <typename T>
StoredHistogram ToStored(const RasterBandHistogram<T>& histogram) {
  StoredHistogram stored;
  stored.lowEdge = static_cast<double>(histogram.min);
  double width = histogram.binSize;
  if constexpr (std::is_integral_v<T>) {
    stored.lowEdge -= 0.5;
    const bool isCountedAsTold =
        histogram.source != StatsSource::kNative && histogram.bins == Form::kTold;
    if (isCountedAsTold) width = std::trunc(width);
  }
  stored.highEdge = stored.lowEdge + width * histogram.binCount;
  stored.counts = histogram.counts;
  return stored;
}

/// Gives GDAL's name of a resampling method.
inline const char* ResamplingName(std::int32_t method) {
  const LevelReduction reduction = ReductionOf(static_cast<lumo::PyramidResamplingMethod>(method));
  if (reduction == LevelReduction::kAverage) return "AVERAGE";
  if (reduction == LevelReduction::kMode) return "MODE";
  switch (static_cast<lumo::PyramidResamplingMethod>(method)) {
    case lumo::PyramidResamplingMethod::kLinear:
      return "BILINEAR";
    case lumo::PyramidResamplingMethod::kCubic:
      return "CUBIC";
    case lumo::PyramidResamplingMethod::kMajority:
      return "MODE";
    default:
      return "NEAREST";
  }
}

}  // namespace detail

template <typename T>
Reader<T>::Reader(RasterDataConnection* connection, OpenRaster& raster, const lumo::RasterDef& def)
    : PlainRasterReader<T>(connection), raster_(raster), def_(def) {
  for (unsigned band = 0; band < raster.Bands(); ++band) {
    const auto told = raster.IsNew() ? NoDataOf(def, band) : gdal::ReadNoData(raster.Band(band));
    noData_.push_back(told ? told->As<T>() : std::nullopt);
  }
  def_.noData.clear();
  for (unsigned band = 0; band < noData_.size(); ++band) {
    const std::optional<T>& value = noData_[band];
    if (!value) continue;
    if constexpr (std::is_arithmetic_v<T>) {
      def_.noData[band] = static_cast<double>(*value);
    } else {
      def_.noData[band] = static_cast<double>(value->real);
    }
    if constexpr (std::is_integral_v<T> && sizeof(T) == 8) {
      def_.metadata.Set(BandDetailPath(band, "NoDataValue"), String(std::to_string(*value)));
    }
  }
  alphaBand_ = raster.KeepsAlpha() ? raster.Bands() - 1 : raster.Bands();
}

template <typename T>
unsigned Reader<T>::Samples(unsigned level) {
  const RasterLevel* const found = raster_.FindLevel(level);
  return found != nullptr ? found->samples : 0;
}

template <typename T>
unsigned Reader<T>::Lines(unsigned level) {
  const RasterLevel* const found = raster_.FindLevel(level);
  return found != nullptr ? found->lines : 0;
}

template <typename T>
std::int32_t Reader<T>::PyramidResamplingMethod() {
  return PyramidExists() ? builtMethod_ : 0;
}

template <typename T>
std::int32_t Reader<T>::PyramidLevelMin() {
  return PyramidExists() ? static_cast<std::int32_t>(std::next(raster_.Levels().begin())->first)
                         : 0;
}

template <typename T>
std::int32_t Reader<T>::PyramidLevelMax() {
  return PyramidExists() ? static_cast<std::int32_t>(raster_.Levels().rbegin()->first) : 0;
}

template <typename T>
bool Reader<T>::PyramidBuild(std::int32_t levelMin, std::int32_t levelMax,
                             std::int32_t resamplingMethod, const TileDimensions&) {
  if (levelMin < 0 || levelMax < levelMin) return FailWith(raster_.Name(), "no levels asked for");
  if (!raster_.BuildOverviews(detail::ResamplingName(resamplingMethod),
                              static_cast<unsigned>(levelMin), static_cast<unsigned>(levelMax))) {
    return false;
  }
  builtMethod_ = resamplingMethod;
  areLevelsOld_ = false;
  return true;
}

template <typename T>
bool Reader<T>::PyramidRebuild() {
  if (!PyramidExists()) return FailWith(raster_.Name(), "has no reduced levels");
  TileDimensions tiles{};
  return PyramidBuild(PyramidLevelMin(), PyramidLevelMax(), builtMethod_, tiles);
}

template <typename T>
bool Reader<T>::PyramidRefresh() {
  return areLevelsOld_ ? PyramidRebuild() : raster_.FindLevelsAnew();
}

template <typename T>
bool Reader<T>::PyramidDelete() {
  return raster_.DeleteOverviews();
}

template <typename T>
std::int32_t Reader<T>::StatsMask() {
  return kHasStats ? lumo::StatsMask::Extended : lumo::StatsMask::None;
}

template <typename T>
bool Reader<T>::StatsExist(unsigned band) {
  return ReadStats(band).mask != lumo::StatsMask::None;
}

template <typename T>
RasterBandStats<T> Reader<T>::ReadStats(unsigned band) {
  RasterBandStats<T> stats;
  if constexpr (kHasStats) {
    if (!raster_.HasBand(band)) return stats;
    GDALRasterBandH const source = raster_.Band(band);
    const auto stored = ReadStoredStats(source);
    if (!stored) return stats;
    const bool allValid = std::is_integral_v<T> && (GDALGetMaskFlags(source) & GMF_ALL_VALID) != 0;
    stats = FromStored<T>(*stored, std::uint64_t{def_.samples} * def_.lines, allValid);
    stats.band = band;
  }
  return stats;
}

template <typename T>
bool Reader<T>::WriteStats(const Array<RasterBandStats<T>>& stats) {
  if constexpr (kHasStats) {
    raster_.NoteStatistics();
    return raster_.ChangeStored([&] {
      return std::all_of(stats.begin(), stats.end(), [&](const RasterBandStats<T>& band) {
        constexpr unsigned kWhole =
            StatsMask::Min | StatsMask::Max | StatsMask::Mean | StatsMask::Std;
        return !raster_.HasBand(band.band) || (band.mask & kWhole) != kWhole ||
               WriteStoredStats(raster_.Band(band.band), gdal::ToStored(band));
      });
    });
  }
  return false;
}

template <typename T>
Array<RasterBandHistogram<T>> Reader<T>::Histogram(unsigned band) {
  Array<RasterBandHistogram<T>> histograms;
  if constexpr (kHasStats) {
    if (!raster_.HasBand(band)) return histograms;
    const Messages messages;
    const auto stored = ReadStoredHistogram(raster_.Band(band));
    if (stored && histograms.Resize(ArrayDims(1))) {
      histograms[0] = detail::FromStored<T>(band, *stored);
    }
  }
  return histograms;
}

template <typename T>
bool Reader<T>::WriteHistogram(const Array<RasterBandHistogram<T>>& histograms) {
  if constexpr (kHasStats) {
    std::vector<const RasterBandHistogram<T>*> chosen(raster_.Bands());
    std::vector<bool> isAskedFor(raster_.Bands());
    for (const RasterBandHistogram<T>& histogram : histograms) {
      if (!raster_.HasBand(histogram.band) || histogram.source == StatsSource::kUnknown) continue;
      isAskedFor[histogram.band] = true;
      if (histogram.sign != HistogramSign::kBoth || histogram.binCount == 0) continue;
      // One that was counted goes before the one that the source holds already.
      const RasterBandHistogram<T>*& choice = chosen[histogram.band];
      if (choice == nullptr || choice->source == StatsSource::kNative) choice = &histogram;
    }
    for (unsigned band = 0; band < raster_.Bands(); ++band) {
      if (isAskedFor[band] && chosen[band] == nullptr) {
        return FailWith(raster_.Name(), "only histograms of both signs can be stored");
      }
    }
    return raster_.ChangeStored([&] {
      for (unsigned band = 0; band < raster_.Bands(); ++band) {
        if (chosen[band] == nullptr) continue;
        if (!WriteStoredHistogram(raster_.Band(band), detail::ToStored(*chosen[band]))) {
          return false;
        }
      }
      return true;
    });
  }
  return false;
}

template <typename T>
bool Reader<T>::HasNoDataValue(unsigned band) {
  return band < noData_.size() && noData_[band].has_value();
}

template <typename T>
T Reader<T>::NoDataValue(unsigned band) {
  return HasNoDataValue(band) ? *noData_[band] : T();
}

template <typename T>
bool Reader<T>::HasPalette(unsigned band) {
  return raster_.HasBand(band) && gdal::HasPalette(raster_.Band(band));
}

template <typename T>
lumo::Palette Reader<T>::Palette(unsigned band) {
  return HasPalette(band) ? ReadPalette(raster_.Band(band)) : lumo::Palette();
}

template <typename T>
bool Reader<T>::WritePalette(unsigned band, const lumo::Palette& palette) {
  return ChangePalette(band, &palette);
}

template <typename T>
bool Reader<T>::DeletePalette(unsigned band) {
  return ChangePalette(band, nullptr);
}

/// Into the file when it can be written, else beside it.
template <typename T>
bool Reader<T>::ChangePalette(unsigned band, const lumo::Palette* palette) {
  if (!raster_.HasBand(band)) return FailWith(raster_.Name(), "has no such band");
  if (raster_.CanWrite() && !raster_.OpenForUpdate()) return false;
  return raster_.ChangeStored([&] {
    if (!gdal::WritePalette(raster_.Band(band), palette)) return false;
    if (HasPalette(band) == (palette != nullptr)) return true;
    if (palette != nullptr) gdal::WritePalette(raster_.Band(band), nullptr);
    return FailWith(raster_.Name(), "the format keeps no such palette");
  });
}

template <typename T>
bool Reader<T>::ReadPixels(unsigned left, unsigned top, unsigned width, unsigned height,
                           const Array<unsigned>& bands, unsigned level, T* pixels,
                           unsigned char* state) {
  const BlockPlace place{left, top, width, height, bands, level};
  if (!raster_.Read(place, pixels)) return false;
  std::vector<std::optional<T>> values;
  for (const unsigned band : bands) values.push_back(noData_[band]);
  const NoDataMarker<T> marker(std::move(values), raster_.Interleave(), width, height);
  const std::uint64_t count = std::uint64_t{width} * height * bands.GetCount();
  if (marker.IsNeeded()) marker.Mark(0, count, pixels, state);
  return raster_.ReadMasks(place, state);
}

template <typename T>
bool Reader<T>::WritePixels(unsigned left, unsigned top, unsigned width, unsigned height,
                            const Array<unsigned>& bands, unsigned level, const T* pixels,
                            const unsigned char* state) {
  areLevelsOld_ = PyramidExists();
  const BlockPlace place{left, top, width, height, bands, level};
  // The mask goes first, since levels are made of pixels as they come.
  return (!raster_.IsNew() || raster_.ExcludeFromNew(place, FindUntold(place, pixels, state))) &&
         raster_.Write(place, pixels);
}

/// The pixels of a block that are not valid though neither a no-data value nor the alpha band says
/// so, as bytes that are not 0; empty when there is none.
template <typename T>
std::vector<unsigned char> Reader<T>::FindUntold(const BlockPlace& place, const T* pixels,
                                                 const unsigned char* state) const {
  const std::size_t plane = std::size_t{place.width} * place.height;
  const std::size_t bands = place.bands.GetCount(), count = plane * bands;
  if (AllValid(state, count)) return {};
  std::vector<std::optional<T>> values;
  for (const unsigned band : place.bands) values.push_back(noData_[band]);
  const NoDataMarker<T> marker(std::move(values), raster_.Interleave(), place.width, place.height);
  std::vector<unsigned char> told(marker.IsNeeded() ? count : 0);
  if (marker.IsNeeded()) marker.Mark(0, count, pixels, told.data());

  const BlockStrides strides(raster_.Interleave(), place.width, place.height, bands);
  const auto alphaAt = std::find(place.bands.begin(), place.bands.end(), alphaBand_);
  const bool hasAlpha = alphaAt != place.bands.end();
  const auto alpha = static_cast<std::size_t>(alphaAt - place.bands.begin());
  std::vector<unsigned char> untold(plane);
  bool isAny = false;
  // An alpha band is valid everywhere, and says of pixels where it is 0 that they are not.
  const auto isUntold = [&](std::size_t at, std::size_t band) {
    const std::size_t here = at + band * strides.band;
    return !IsValidState(state[here]) && (told.empty() || told[here] == 0) &&
           !(hasAlpha && (band == alpha || pixels[at + alpha * strides.band] == T{}));
  };
  // Runs of values whose bands lie together, or of one band.
  const bool isByPixel = strides.band == 1;
  const std::size_t inRun = isByPixel ? bands : 1, run = place.width * inRun;
  for (std::size_t band = 0; band < bands; band += inRun) {
    for (std::size_t y = 0; y < place.height; ++y) {
      const std::size_t first = y * strides.line;
      const unsigned char* const states = state + first + band * strides.band;
      for (std::size_t x = CountLeadingValid(states, run) / inRun; x < place.width; ++x) {
        if (IsValidState(states[x * inRun])) {
          x += CountLeadingValid(states + x * inRun, run - x * inRun) / inRun;
          if (x == place.width) break;
        }
        for (std::size_t i = 0; i < inRun && untold[y * place.width + x] == 0; ++i) {
          if (!isUntold(first + x * strides.pixel, band + i)) continue;
          untold[y * place.width + x] = 1;
          isAny = true;
        }
      }
    }
  }
  if (!isAny) untold.clear();
  return untold;
}

}  // namespace lumo::gdal
