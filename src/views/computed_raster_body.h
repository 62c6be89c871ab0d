#pragma once

#include <cassert>

#include "views/computed_raster.h"

namespace lumo {

template <typename T>
ComputedRaster<T>::ComputedRaster(const RasterPtr<T>& parent, StatsOf statsOf)
    : RasterView<T>(parent), statsOf_(statsOf) {
  if (statsOf_ == StatsOf::kParent) return;
  stats_.Reset(new DynamicRasterStats<T>(this));
  histogram_.Reset(new DynamicRasterHistogram<T>(this));
}

template <typename T>
ComputedRaster<T>::~ComputedRaster() {
  assert(!stats_ && !histogram_);  // the derived class has said StopComputing
}

template <typename T>
void ComputedRaster<T>::StopComputing() {
  histogram_ = DynamicRasterHistogramPtr<T>();
  stats_ = DynamicRasterStatsPtr<T>();
}

/// Gives the result of `own(statistics)`, 0 or empty once they have stopped; or that of `parents()`
/// where they are the parent's.
template <typename T>
template <typename Own, typename Parents>
auto ComputedRaster<T>::OfStats(const Own& own, const Parents& parents) const {
  using Result = decltype(own(*stats_));
  if (statsOf_ == StatsOf::kParent) return parents();
  return stats_ ? own(*stats_) : Result();
}
template <typename T>
template <typename Own, typename Parents>
auto ComputedRaster<T>::OfHistogram(const Own& own, const Parents& parents) const {
  using Result = decltype(own(*histogram_));
  if (statsOf_ == StatsOf::kParent) return parents();
  return histogram_ ? own(*histogram_) : Result();
}

template <typename T>
bool ComputedRaster<T>::StatsExist(unsigned band, unsigned mask) const {
  return OfStats([&](auto& stats) { return stats.StatsExist(band, mask); },
                 [&] { return RasterView<T>::StatsExist(band, mask); });
}

template <typename T>
AsyncPtr ComputedRaster<T>::StatsBuild(const IPC& ipc) {
  return OfStats([&](auto& stats) { return stats.StatsBuild(ipc); },
                 [&] { return RasterView<T>::StatsBuild(ipc); });
}

template <typename T>
AsyncPtr ComputedRaster<T>::StatsAsync() const {
  return OfStats([&](auto& stats) { return stats.StatsAsync(); },
                 [&] { return RasterView<T>::StatsAsync(); });
}

template <typename T>
void ComputedRaster<T>::SetStatsMode(lumo::StatsMode mode) {
  OfStats([&](auto& stats) { return stats.SetStatsMode(mode); },
          [&] { return RasterView<T>::SetStatsMode(mode); });
}

template <typename T>
lumo::StatsMode ComputedRaster<T>::StatsMode() const {
  return OfStats([&](auto& stats) { return stats.StatsMode(); },
                 [&] { return RasterView<T>::StatsMode(); });
}

template <typename T>
bool ComputedRaster<T>::WriteStats() {
  return statsOf_ == StatsOf::kParent && RasterView<T>::WriteStats();
}

template <typename T>
void ComputedRaster<T>::SetBandStats(const RasterBandStats<T>& stats) {
  OfStats([&](auto& own) { return own.SetBandStats(stats); },
          [&] { return RasterView<T>::SetBandStats(stats); });
}

template <typename T>
RasterBandStats<T> ComputedRaster<T>::BandStats(unsigned band) const {
  return OfStats([&](auto& stats) { return stats.BandStats(band); },
                 [&] { return RasterView<T>::BandStats(band); });
}

template <typename T>
StatValue<T> ComputedRaster<T>::StatOf(StatsMask::Code stat, unsigned band, unsigned otherBand,
                                       const IPC& ipc) {
  return OfStats([&](auto& stats) { return stats.StatOf(stat, band, otherBand, ipc); },
                 [&] { return RasterView<T>::StatOf(stat, band, otherBand, ipc); });
}

template <typename T>
AsyncPtr ComputedRaster<T>::HistogramAsync() const {
  return OfHistogram([&](auto& histogram) { return histogram.HistogramAsync(); },
                     [&] { return RasterView<T>::HistogramAsync(); });
}

template <typename T>
bool ComputedRaster<T>::WriteHistogram() {
  return statsOf_ == StatsOf::kParent && RasterView<T>::WriteHistogram();
}

template <typename T>
void ComputedRaster<T>::SetBandHistogram(const RasterBandHistogram<T>& histogram) {
  OfHistogram([&](auto& own) { return own.SetBandHistogram(histogram); },
              [&] { return RasterView<T>::SetBandHistogram(histogram); });
}

template <typename T>
Array<RasterBandHistogram<T>> ComputedRaster<T>::BandHistogram(unsigned band) const {
  return OfHistogram([&](auto& histogram) { return histogram.BandHistogram(band); },
                     [&] { return RasterView<T>::BandHistogram(band); });
}

template <typename T>
AsyncPtr ComputedRaster<T>::CountHistogram(const HistogramRequest<T>& request, const IPC& ipc) {
  return OfHistogram([&](auto& histogram) { return histogram.CountHistogram(request, ipc); },
                     [&] { return RasterView<T>::CountHistogram(request, ipc); });
}

}  // namespace lumo
