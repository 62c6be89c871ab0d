#pragma once

#include <algorithm>

#include "foundation/fault.h"
#include "stats/dynamic_raster_histogram.h"
#include "stats/raster_histogram_process.h"

namespace lumo {

/// What a run is to count: with a bin size above 0 by that, else by the bin count.
template <typename T>
struct DynamicRasterHistogram<T>::Request {
  T lower;
  T upper;
  double binSize;
  unsigned binCount;
  Array<unsigned> bands;  // none: all
  HistogramSign sign;
};

/// A run, with what its process works on.
template <typename T>
struct DynamicRasterHistogram<T>::Run {
  RasterIteratorPtr<T> iterator;
  RasterHistogramPtr<T> working;
  Pointer<RasterHistogramProcess<T>> process;
};

template <typename T>
DynamicRasterHistogram<T>::DynamicRasterHistogram(Raster<T>* raster) : raster_(raster) {}

template <typename T>
DynamicRasterHistogram<T>::~DynamicRasterHistogram() {
  const std::lock_guard lock(lock_);
  if (!run_) return;
  run_->process->Abort();
  run_->process->WaitFinished();
}

/// True while a run goes on. One that has ended is taken over here. Under the lock.
template <typename T>
bool DynamicRasterHistogram<T>::CheckRunning() const {
  if (!run_) return false;
  if (!run_->process->IsFinished()) return true;
  const std::unique_ptr<Run> run = std::move(run_);
  if (run->process->HasError()) {
    SetFault(run->process->GetFault());
    return false;
  }
  const Array<unsigned>& bands = run->iterator->Bands();
  for (unsigned i = 0; i < bands.GetCount(); ++i) {
    Append(run->working->BandHistogram(i, bands[i]));
  }
  return false;
}

/// Under the lock.
template <typename T>
void DynamicRasterHistogram<T>::Append(const RasterBandHistogram<T>& histogram) const {
  if (std::ranges::find(histograms_, histogram) == histograms_.end()) {
    histograms_.push_back(histogram);
  }
}

template <typename T>
AsyncPtr DynamicRasterHistogram<T>::Start(const Request& request, const IPC& ipc) {
  const std::lock_guard lock(lock_);
  if (CheckRunning()) return {};
  auto run = std::make_unique<Run>();
  const RasterPtr<T> raster(raster_, true);  // the raster outlives the run
  run->iterator.Reset(request.bands.GetCount() == 0
                          ? new RasterIteratorStream<T>(raster)
                          : new RasterIteratorStream<T>(raster, request.bands));
  if (!run->iterator->IsValid()) return {};
  const unsigned bands = run->iterator->BandCount();
  const auto forEach = [bands](auto value) {
    Array<decltype(value)> values{ArrayDims(bands)};
    std::fill(values.begin(), values.end(), value);
    return values;
  };
  const Array<T> mins = forEach(request.lower);
  const Array<T> maxes = forEach(request.upper);
  run->working.Reset(
      request.binSize > 0.0
          ? new RasterHistogram<T>(bands, forEach(request.binSize), mins, maxes, request.sign)
          : new RasterHistogram<T>(bands, forEach(request.binCount), mins, maxes, request.sign));
  if (!run->working->IsValid()) {
    SetFault("there is no memory for so many bins");
    return {};
  }
  run->process.Reset(new RasterHistogramProcess<T>(run->iterator, run->working, ipc));
  if (!run->process->RunProcess(run->process->kInBackground)) return {};
  run_ = std::move(run);
  return run_->process;
}

template <typename T>
AsyncPtr DynamicRasterHistogram<T>::HistogramByBinSize(T lower, T upper, double binSize,
                                                       const Array<unsigned>& bands,
                                                       HistogramSign sign, const IPC& ipc) {
  return Start({lower, upper, binSize, 0, bands, sign}, ipc);
}

template <typename T>
AsyncPtr DynamicRasterHistogram<T>::HistogramByBinCount(T lower, T upper, unsigned binCount,
                                                        const Array<unsigned>& bands,
                                                        HistogramSign sign, const IPC& ipc) {
  return Start({lower, upper, 0, binCount, bands, sign}, ipc);
}

template <typename T>
AsyncPtr DynamicRasterHistogram<T>::HistogramAllBands(T lower, T upper, unsigned binCount,
                                                      HistogramSign sign, const IPC& ipc) {
  return Start({lower, upper, 0, binCount, {}, sign}, ipc);
}

template <typename T>
AsyncPtr DynamicRasterHistogram<T>::HistogramAsync() const {
  const std::lock_guard lock(lock_);
  return CheckRunning() ? AsyncPtr(run_->process) : AsyncPtr();
}

template <typename T>
void DynamicRasterHistogram<T>::SetBandHistogram(const RasterBandHistogram<T>& histogram) {
  const std::lock_guard lock(lock_);
  if (!CheckRunning()) Append(histogram);
}

template <typename T>
Array<RasterBandHistogram<T>> DynamicRasterHistogram<T>::BandHistogram(unsigned band) const {
  const std::lock_guard lock(lock_);
  if (CheckRunning()) return {};
  const auto ofBand = [band](const auto& histogram) { return histogram.band == band; };
  Array<RasterBandHistogram<T>> list{
      ArrayDims(static_cast<unsigned>(std::ranges::count_if(histograms_, ofBand)))};
  if (list.IsValid()) std::ranges::copy_if(histograms_, list.begin(), ofBand);
  return list;
}

}  // namespace lumo
