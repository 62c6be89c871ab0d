#pragma once

#include "foundation/fault.h"
#include "stats/histogram_counter.h"
#include "stats/raster_histogram_process.h"
#include "tasks/task_errors.h"

namespace lumo {

/// Counts a part of a tile with a counter of its own.
template <typename T>
struct ParallelRasterHistogramAccumulate {
  const RasterHistogram<T>& working;
  ScratchPool<HistogramCounter<T>>& counters;

  bool operator()(const Tile<T>& tile, const TilePart& part) const {
    return counters.Borrow(working)->Count(tile, part);
  }
};

template <typename T>
RasterHistogramAccumulateTask<T>::RasterHistogramAccumulateTask(ArgList& setup)
    : StatelessTask("RasterHistogramAccumulateTask"), working_(setup.Get(0)) {
  if (working_.IsNull() || !working_->FillBins()) SetErrorState(TaskErrorBadParams());
}

template <typename T>
RasterHistogramAccumulateTask<T>::~RasterHistogramAccumulateTask() {
  for (const auto& counter : counters_.TakeAll()) working_->Join(counter->Finish());
}

template <typename T>
bool RasterHistogramAccumulateTask<T>::Execute(ArgList& args) {
  const TilePtr<T> tile(args.Get(0));
  if (HasError() || tile.IsNull() || !tile->IsValid()) return false;
  const ParallelRasterHistogramAccumulate<T> count{*working_, counters_};
  const bool counted = ForEachStrip(*tile, LeastStripPixels(tile->Bands()), GetAbortFlag(),
                                    [&](const TilePart& part) { return count(*tile, part); });
  if (!counted && !working_->CanCount()) SetFault("the upper bound is below the lower one");
  return counted;
}

namespace detail {

/// Places the stages of a process that reads and counts.
template <typename T, typename Base>
void PlaceReadAndCount(TileProcess<Base>& process, const RasterIteratorPtr<T>& iterator,
                       const RasterHistogramPtr<T>& working) {
  const TileSlot<T> tile = process.Read(iterator);
  process.template AddTask<RasterHistogramAccumulateTask<T>>(ArgIDs({tile.id}), working);
  process.Close();
}

}  // namespace detail

template <typename T>
RasterHistogramProcess<T>::RasterHistogramProcess(const RasterIteratorPtr<T>& iterator,
                                                  const RasterHistogramPtr<T>& working,
                                                  const IPC& ipc)
    : TileProcess("RasterHistogramProcess", ipc) {
  detail::PlaceReadAndCount(*this, iterator, working);
}

template <typename T>
void HistogramCallback<T>::OnProcessEnd(ProcessBuilder<Process>& process) {
  if (process.HasError()) return;
  const auto& run = static_cast<RasterHistogramCallbackProcess<T>&>(process);
  TakeResults(run.Stats(), run.Histogram(), run.Histogram()->Sign());
}

template <typename T>
RasterHistogramCallbackProcess<T>::RasterHistogramCallbackProcess(
    const RasterIteratorPtr<T>& iterator, const RasterHistogramPtr<T>& working,
    const RasterStatsPtr<T>& stats, HistogramCallback<T>* receiver, const IPC& ipc)
    : TileProcess<ProcessBuilderCallback<Process, HistogramCallback<T>>>(
          "RasterHistogramCallbackProcess", receiver, ipc),
      stats_(stats),
      working_(working) {
  detail::PlaceReadAndCount(*this, iterator, working);
}

}  // namespace lumo
