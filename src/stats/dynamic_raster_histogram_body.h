#pragma once

#include <algorithm>

#include "commands/share_scope.h"
#include "foundation/fault.h"
#include "raster/raster_lines.h"
#include "stats/dynamic_raster_histogram.h"
#include "stats/raster_histogram_process.h"

namespace lumo {

/// A run, with what its process works on.
template <typename T>
struct DynamicRasterHistogram<T>::Run {
  RasterIteratorPtr<T> iterator;
  RasterHistogramPtr<T> working;
  Pointer<RasterHistogramProcess<T>> process;
  std::uint64_t writes = 0;  // Raster::WriteCount when it began
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

/// True while a run goes on. One that has ended is taken over here, and what no longer holds is
/// dropped. Under the lock.
template <typename T>
bool DynamicRasterHistogram<T>::CheckRunning() const {
  DropStale();
  if (!run_) return false;
  if (!run_->process->IsFinished()) return true;
  const std::unique_ptr<Run> run = std::move(run_);
  if (run->process->HasError()) {
    SetFault(run->process->GetFault());
    return false;
  }
  if (run->writes != writes_) {
    SetFault("the pixels were written while they were counted");
    return false;
  }
  const Array<unsigned>& bands = run->iterator->Bands();
  for (unsigned i = 0; i < bands.GetCount(); ++i) {
    Append(run->working->BandHistogram(i, bands[i]));
  }
  return false;
}

template <typename T>
void DynamicRasterHistogram<T>::DropStale() const {
  const std::uint64_t writes = raster_->WriteCount();
  if (writes == writes_) return;
  histograms_.clear();
  writes_ = writes;
}

/// Under the lock.
template <typename T>
void DynamicRasterHistogram<T>::Append(const RasterBandHistogram<T>& histogram) const {
  if (std::ranges::find(histograms_, histogram) == histograms_.end()) {
    histograms_.push_back(histogram);
  }
}

template <typename T>
AsyncPtr DynamicRasterHistogram<T>::CountHistogram(const HistogramRequest<T>& request,
                                                   const IPC& ipc) {
  const std::lock_guard lock(lock_);
  if (CheckRunning()) return {};
  auto run = std::make_unique<Run>();
  run->writes = writes_;
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
  const bool bySize = request.binSize > 0.0;
  run->working.Reset(bySize ? new RasterHistogram<T>(bands, forEach(request.binSize), mins, maxes,
                                                     request.sign, request.bins)
                            : new RasterHistogram<T>(bands, forEach(request.binCount), mins, maxes,
                                                     request.sign, request.bins));
  if (!run->working->IsValid()) {
    SetFault("there is no memory for so many bins");
    return {};
  }
  if (ShareScope* const shares = ShareScope::Current()) {
    const bool isDone = DoShare(*shares, *run, ipc);
    for (unsigned i = 0; isDone && i < bands; ++i) {
      Append(run->working->BandHistogram(i, run->iterator->Bands()[i]));
    }
    return {};
  }
  run->process.Reset(new RasterHistogramProcess<T>(run->iterator, run->working, ipc));
  if (!run->process->RunProcess(run->process->kInBackground)) return {};
  run_ = std::move(run);
  return run_->process;
}

/// Counts a share, or joins the counts of all. @return false, with the fault set, when that fails.
template <typename T>
bool DynamicRasterHistogram<T>::DoShare(ShareScope& shares, Run& run, const IPC& ipc) const {
  RasterHistogram<T>& counts = *run.working;
  if (shares.Joins()) {
    bool isWhole = counts.FillBins();
    std::vector<unsigned long long> more;
    for (unsigned i = 0; i < shares.Count(); ++i) {
      ShareReader* const in = shares.In(i);
      if (in == nullptr) return false;
      for (unsigned band = 0; isWhole && band < counts.BandCount(); ++band) {
        more.resize(counts.BinCount(band));
        isWhole = in->GetAll(more.data(), more.size());
        for (std::size_t bin = 0; isWhole && bin < more.size(); ++bin) {
          counts.Counts(band)[bin] += more[bin];
        }
      }
    }
    if (!isWhole) SetFault("the files of the shares don't hold the counts of all bins");
    return isWhole;
  }
  const auto& whole = static_cast<const RasterIteratorStream<T>&>(*run.iterator);
  if (RasterIteratorShare<T>::IsEmpty(whole, shares.GetShare())) {
    if (!counts.FillBins()) return false;
  } else {
    const RasterIteratorPtr<T> tiles(new RasterIteratorShare<T>(whole, shares.GetShare()));
    RasterHistogramProcess<T> process(tiles, run.working, ipc);
    if (!process.RunProcess(process.kHere)) {
      SetFault(process.GetFault());
      return false;
    }
    if (ipc.abort->IsSet()) return false;
  }
  for (unsigned band = 0; band < counts.BandCount(); ++band) {
    shares.Out().PutAll(counts.Counts(band), counts.BinCount(band));
  }
  return true;
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
