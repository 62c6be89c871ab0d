#pragma once

#include <cassert>

#include "views/computed_raster.h"

namespace lumo {

template <typename T>
ComputedRaster<T>::ComputedRaster(const RasterPtr<T>& parent)
    : RasterView<T>(parent),
      stats_(new DynamicRasterStats<T>(this)),
      histogram_(new DynamicRasterHistogram<T>(this)) {}

template <typename T>
ComputedRaster<T>::~ComputedRaster() {
  assert(!stats_ && !histogram_);  // the derived class has said StopComputing
}

template <typename T>
void ComputedRaster<T>::StopComputing() {
  histogram_ = DynamicRasterHistogramPtr<T>();
  stats_ = DynamicRasterStatsPtr<T>();
}

template <typename T>
bool ComputedRaster<T>::StatsExist(unsigned band, unsigned mask) const {
  return stats_ && stats_->StatsExist(band, mask);
}

template <typename T>
AsyncPtr ComputedRaster<T>::StatsBuild(const IPC& ipc) {
  return stats_ ? stats_->StatsBuild(ipc) : AsyncPtr();
}

template <typename T>
AsyncPtr ComputedRaster<T>::StatsAsync() const {
  return stats_ ? stats_->StatsAsync() : AsyncPtr();
}

template <typename T>
void ComputedRaster<T>::SetStatsMode(lumo::StatsMode mode) {
  if (stats_) stats_->SetStatsMode(mode);
}

template <typename T>
lumo::StatsMode ComputedRaster<T>::StatsMode() const {
  return stats_ ? stats_->StatsMode() : lumo::StatsMode::kBasic;
}

template <typename T>
void ComputedRaster<T>::SetBandStats(const RasterBandStats<T>& stats) {
  if (stats_) stats_->SetBandStats(stats);
}

template <typename T>
RasterBandStats<T> ComputedRaster<T>::BandStats(unsigned band) const {
  return stats_ ? stats_->BandStats(band) : RasterBandStats<T>();
}

template <typename T>
T ComputedRaster<T>::Min(unsigned band, const IPC& ipc) {
  return stats_ ? stats_->Min(band, ipc) : T();
}

template <typename T>
T ComputedRaster<T>::Max(unsigned band, const IPC& ipc) {
  return stats_ ? stats_->Max(band, ipc) : T();
}

template <typename T>
double ComputedRaster<T>::Mean(unsigned band, const IPC& ipc) {
  return stats_ ? stats_->Mean(band, ipc) : 0.0;
}

template <typename T>
double ComputedRaster<T>::Std(unsigned band, const IPC& ipc) {
  return stats_ ? stats_->Std(band, ipc) : 0.0;
}

template <typename T>
double ComputedRaster<T>::Sum(unsigned band, const IPC& ipc) {
  return stats_ ? stats_->Sum(band, ipc) : 0.0;
}

template <typename T>
double ComputedRaster<T>::Sum2(unsigned band, const IPC& ipc) {
  return stats_ ? stats_->Sum2(band, ipc) : 0.0;
}

template <typename T>
double ComputedRaster<T>::RMS(unsigned band, const IPC& ipc) {
  return stats_ ? stats_->RMS(band, ipc) : 0.0;
}

template <typename T>
double ComputedRaster<T>::SumXY(unsigned band, unsigned otherBand, const IPC& ipc) {
  return stats_ ? stats_->SumXY(band, otherBand, ipc) : 0.0;
}

template <typename T>
double ComputedRaster<T>::Cov(unsigned band, unsigned otherBand, const IPC& ipc) {
  return stats_ ? stats_->Cov(band, otherBand, ipc) : 0.0;
}

template <typename T>
AsyncPtr ComputedRaster<T>::HistogramAsync() const {
  return histogram_ ? histogram_->HistogramAsync() : AsyncPtr();
}

template <typename T>
void ComputedRaster<T>::SetBandHistogram(const RasterBandHistogram<T>& histogram) {
  if (histogram_) histogram_->SetBandHistogram(histogram);
}

template <typename T>
Array<RasterBandHistogram<T>> ComputedRaster<T>::BandHistogram(unsigned band) const {
  return histogram_ ? histogram_->BandHistogram(band) : Array<RasterBandHistogram<T>>();
}

template <typename T>
AsyncPtr ComputedRaster<T>::HistogramByBinSize(T lower, T upper, double binSize,
                                               const Array<unsigned>& bands, HistogramSign sign,
                                               const IPC& ipc) {
  return histogram_ ? histogram_->HistogramByBinSize(lower, upper, binSize, bands, sign, ipc)
                    : AsyncPtr();
}

template <typename T>
AsyncPtr ComputedRaster<T>::HistogramByBinCount(T lower, T upper, unsigned binCount,
                                                const Array<unsigned>& bands, HistogramSign sign,
                                                const IPC& ipc) {
  return histogram_ ? histogram_->HistogramByBinCount(lower, upper, binCount, bands, sign, ipc)
                    : AsyncPtr();
}

template <typename T>
AsyncPtr ComputedRaster<T>::HistogramAllBands(T lower, T upper, unsigned binCount,
                                              HistogramSign sign, const IPC& ipc) {
  return histogram_ ? histogram_->HistogramAllBands(lower, upper, binCount, sign, ipc) : AsyncPtr();
}

}  // namespace lumo
