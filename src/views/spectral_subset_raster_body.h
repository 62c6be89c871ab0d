#pragma once

#include <algorithm>
#include <vector>

#include "raster/raster_details.h"
#include "views/spectral_subset_raster.h"

namespace lumo {

template <typename T>
SpectralSubsetRaster<T>::SpectralSubsetRaster(const RasterPtr<T>& parent,
                                              const Array<unsigned>& bands)
    : RasterView<T>(parent) {
  if (!parent) return;
  map_ = bands;
  if (map_.GetCount() == 0) return;
  def_ = parent->GetRasterDef();
  const auto noData = def_.noData;
  def_.noData.clear();
  def_.bands = map_.GetCount();
  for (unsigned band = 0; band < def_.bands; ++band) {
    const auto value = noData.find(map_[band]);
    if (value != noData.end()) def_.noData[band] = value->second;
  }
  ChooseBandDetails(def_.metadata, map_);
}

template <typename T>
Array<unsigned> SpectralSubsetRaster<T>::InParent(const Array<unsigned>& bands) const {
  Array<unsigned> mapped(bands.GetDims());
  for (unsigned i = 0; i < bands.GetCount(); ++i) mapped[i] = InParent(bands[i]);
  return mapped;
}

template <typename T>
bool SpectralSubsetRaster<T>::StatsExist(unsigned band, unsigned mask) const {
  return RasterView<T>::StatsExist(InParent(band), mask);
}

template <typename T>
bool SpectralSubsetRaster<T>::HasNoDataValue(unsigned band) const {
  return RasterView<T>::HasNoDataValue(InParent(band));
}

template <typename T>
T SpectralSubsetRaster<T>::NoDataValue(unsigned band) const {
  return RasterView<T>::NoDataValue(InParent(band));
}

template <typename T>
bool SpectralSubsetRaster<T>::HasPalette(unsigned band) const {
  return RasterView<T>::HasPalette(InParent(band));
}

template <typename T>
PalettePtr SpectralSubsetRaster<T>::Palette(unsigned band) const {
  return RasterView<T>::Palette(InParent(band));
}

template <typename T>
bool SpectralSubsetRaster<T>::WritePalette(unsigned band, const PalettePtr& palette) {
  return RasterView<T>::WritePalette(InParent(band), palette);
}

template <typename T>
bool SpectralSubsetRaster<T>::DeletePalette(unsigned band) {
  return RasterView<T>::DeletePalette(InParent(band));
}

namespace detail {

/// Takes a statistic between bands out of `mask` and empties its array.
inline void DropPairs(Array<double>& values, unsigned& mask, unsigned bit) {
  values = Array<double>();
  mask &= ~bit;
}

/// Carries the entries of a band's array from the parent to a view of its bands `map`. Without an
/// entry for one of them the view doesn't have the statistic.
inline void PairsOfView(Array<double>& values, unsigned& mask, unsigned bit,
                        const Array<unsigned>& map) {
  if ((mask & bit) == 0) return;
  Array<double> ofView{ArrayDims(map.GetCount())};
  for (unsigned band = 0; band < map.GetCount(); ++band) {
    if (map[band] >= values.GetCount()) return DropPairs(values, mask, bit);
    ofView[band] = values[map[band]];
  }
  values = ofView;
}

/// Carries the entries of a band's array from the view to its parent. Those of bands that the view
/// doesn't show are `known`, what the parent has already; where that lacks one, it gets none.
inline void PairsOfParent(Array<double>& values, unsigned& mask, unsigned bit,
                          const Array<unsigned>& map, const Array<double>& known, unsigned bands) {
  if ((mask & bit) == 0) return;
  Array<double> ofParent{ArrayDims(bands)};
  std::vector<bool> isThere(bands);
  for (unsigned band = 0; band < bands; ++band) {
    isThere[band] = band < known.GetCount();
    ofParent[band] = isThere[band] ? known[band] : 0.0;
  }
  for (unsigned i = 0; i < std::min(values.GetCount(), map.GetCount()); ++i) {
    if (map[i] >= bands) continue;
    ofParent[map[i]] = values[i];
    isThere[map[i]] = true;
  }
  if (std::ranges::count(isThere, false) != 0) return DropPairs(values, mask, bit);
  values = ofParent;
}

}  // namespace detail

template <typename T>
void SpectralSubsetRaster<T>::SetBandStats(const RasterBandStats<T>& stats) {
  if (!this->Parent()) return;
  RasterBandStats<T> mapped = stats;
  mapped.band = InParent(stats.band);
  const unsigned bands = this->Parent()->Bands();
  const RasterBandStats<T> known = RasterView<T>::BandStats(mapped.band);
  const auto knownOf = [&](unsigned bit, const Array<double>& values) {
    return (known.mask & bit) != 0 ? values : Array<double>();
  };
  detail::PairsOfParent(mapped.sumXY, mapped.mask, StatsMask::SumXY, map_,
                        knownOf(StatsMask::SumXY, known.sumXY), bands);
  detail::PairsOfParent(mapped.cov, mapped.mask, StatsMask::Cov, map_,
                        knownOf(StatsMask::Cov, known.cov), bands);
  RasterView<T>::SetBandStats(mapped);
}

template <typename T>
RasterBandStats<T> SpectralSubsetRaster<T>::BandStats(unsigned band) const {
  RasterBandStats<T> stats = RasterView<T>::BandStats(InParent(band));
  stats.band = band;
  detail::PairsOfView(stats.sumXY, stats.mask, StatsMask::SumXY, map_);
  detail::PairsOfView(stats.cov, stats.mask, StatsMask::Cov, map_);
  return stats;
}

template <typename T>
T SpectralSubsetRaster<T>::Min(unsigned band, const IPC& ipc) {
  return RasterView<T>::Min(InParent(band), ipc);
}

template <typename T>
T SpectralSubsetRaster<T>::Max(unsigned band, const IPC& ipc) {
  return RasterView<T>::Max(InParent(band), ipc);
}

template <typename T>
double SpectralSubsetRaster<T>::Mean(unsigned band, const IPC& ipc) {
  return RasterView<T>::Mean(InParent(band), ipc);
}

template <typename T>
double SpectralSubsetRaster<T>::Std(unsigned band, const IPC& ipc) {
  return RasterView<T>::Std(InParent(band), ipc);
}

template <typename T>
double SpectralSubsetRaster<T>::Sum(unsigned band, const IPC& ipc) {
  return RasterView<T>::Sum(InParent(band), ipc);
}

template <typename T>
double SpectralSubsetRaster<T>::Sum2(unsigned band, const IPC& ipc) {
  return RasterView<T>::Sum2(InParent(band), ipc);
}

template <typename T>
double SpectralSubsetRaster<T>::RMS(unsigned band, const IPC& ipc) {
  return RasterView<T>::RMS(InParent(band), ipc);
}

template <typename T>
double SpectralSubsetRaster<T>::SumXY(unsigned band, unsigned otherBand, const IPC& ipc) {
  return RasterView<T>::SumXY(InParent(band), InParent(otherBand), ipc);
}

template <typename T>
double SpectralSubsetRaster<T>::Cov(unsigned band, unsigned otherBand, const IPC& ipc) {
  return RasterView<T>::Cov(InParent(band), InParent(otherBand), ipc);
}

template <typename T>
void SpectralSubsetRaster<T>::SetBandHistogram(const RasterBandHistogram<T>& histogram) {
  RasterBandHistogram<T> mapped = histogram;
  mapped.band = InParent(histogram.band);
  RasterView<T>::SetBandHistogram(mapped);
}

template <typename T>
Array<RasterBandHistogram<T>> SpectralSubsetRaster<T>::BandHistogram(unsigned band) const {
  auto histograms = RasterView<T>::BandHistogram(InParent(band));
  for (RasterBandHistogram<T>& histogram : histograms) histogram.band = band;
  return histograms;
}

template <typename T>
AsyncPtr SpectralSubsetRaster<T>::HistogramByBinSize(T lower, T upper, double binSize,
                                                     const Array<unsigned>& bands,
                                                     HistogramSign sign, const IPC& ipc) {
  const Array<unsigned> mapped = bands.GetCount() != 0 ? InParent(bands) : map_;
  return RasterView<T>::HistogramByBinSize(lower, upper, binSize, mapped, sign, ipc);
}

template <typename T>
AsyncPtr SpectralSubsetRaster<T>::HistogramByBinCount(T lower, T upper, unsigned binCount,
                                                      const Array<unsigned>& bands,
                                                      HistogramSign sign, const IPC& ipc) {
  const Array<unsigned> mapped = bands.GetCount() != 0 ? InParent(bands) : map_;
  return RasterView<T>::HistogramByBinCount(lower, upper, binCount, mapped, sign, ipc);
}

template <typename T>
AsyncPtr SpectralSubsetRaster<T>::HistogramAllBands(T lower, T upper, unsigned binCount,
                                                    HistogramSign sign, const IPC& ipc) {
  return RasterView<T>::HistogramByBinCount(lower, upper, binCount, map_, sign, ipc);
}

template <typename T>
AsyncPtr SpectralSubsetRaster<T>::CountHistogram(const HistogramRequest<T>& request,
                                                 const IPC& ipc) {
  HistogramRequest<T> mapped = request;
  mapped.bands = request.bands.GetCount() != 0 ? InParent(request.bands) : map_;
  return RasterView<T>::CountHistogram(mapped, ipc);
}

template <typename T>
RasterPtr<T> SpectralSubsetRaster<T>::PyramidLevel(unsigned level) {
  const RasterPtr<T> reduced = RasterView<T>::PyramidLevel(level);
  return reduced ? RasterPtr<T>(new SpectralSubsetRaster(reduced, map_)) : RasterPtr<T>();
}

template <typename T>
bool SpectralSubsetRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                         Interleave interleave, Array<T>& pixels,
                                         Array<unsigned char>& state) {
  return RasterView<T>::GetSubRect(rect, InParent(bands), interleave, pixels, state);
}

template <typename T>
bool SpectralSubsetRaster<T>::PutSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                         Interleave interleave, Array<T>& pixels,
                                         Array<unsigned char>& state) {
  return RasterView<T>::PutSubRect(rect, InParent(bands), interleave, pixels, state);
}

}  // namespace lumo
