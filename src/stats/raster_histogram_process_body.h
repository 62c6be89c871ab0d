#pragma once

#include "foundation/fault.h"
#include "stats/histogram_counter.h"
#include "stats/raster_histogram_process.h"
#include "stats/tile_strips.h"
#include "tasks/parallel_ranges.h"

namespace lumo {

template <typename T>
typename HistogramCounterPool<T>::Counter HistogramCounterPool<T>::Take(
    const RasterHistogram<T>& working) {
  {
    const std::lock_guard lock(lock_);
    if (!counters_.empty()) {
      Counter counter = std::move(counters_.back());
      counters_.pop_back();
      return counter;
    }
  }
  return std::make_unique<HistogramCounter<T>>(working);
}

template <typename T>
void HistogramCounterPool<T>::Return(Counter counter) {
  const std::lock_guard lock(lock_);
  counters_.push_back(std::move(counter));
}

template <typename T>
bool HistogramCounterPool<T>::JoinInto(RasterHistogram<T>& working) {
  const std::lock_guard lock(lock_);
  bool joined = true;
  for (const Counter& counter : counters_) joined = working.Join(counter->Finish()) && joined;
  counters_.clear();
  return joined;
}

/// Counts the strips of a tile.
template <typename T>
class ParallelRasterHistogramAccumulate final : public ArrayParallelFor {
 public:
  /// All outlive the loop.
  ParallelRasterHistogramAccumulate(const Tile<T>& tile, const RasterHistogram<T>& working,
                                    HistogramCounterPool<T>& counters)
      : ParallelRasterHistogramAccumulate(tile, working, counters,
                                          TileStrips(tile, kLeastValues / tile.Bands() + 1)) {}

  void Body(unsigned begin, unsigned end) override {
    if (Failed()) return;
    auto counter = counters_.Take(working_);
    for (unsigned i = begin; i < end; ++i) {
      if (!counter->Count(tile_, strips_.Strip(i))) Fail();
    }
    counters_.Return(std::move(counter));
  }

 private:
  static constexpr std::size_t kLeastValues = 16 * 1024;

  ParallelRasterHistogramAccumulate(const Tile<T>& tile, const RasterHistogram<T>& working,
                                    HistogramCounterPool<T>& counters, const TileStrips& strips)
      : ArrayParallelFor(strips.Count()),
        tile_(tile),
        working_(working),
        counters_(counters),
        strips_(strips) {}

  const Tile<T>& tile_;
  const RasterHistogram<T>& working_;
  HistogramCounterPool<T>& counters_;
  const TileStrips strips_;
};

template <typename T>
RasterHistogramAccumulateTask<T>::RasterHistogramAccumulateTask(ArgList& setup)
    : ConcurrentTask("RasterHistogramAccumulateTask"), working_(setup.Get(0)) {
  if (working_.IsNull() || !working_->FillBins()) SetErrorState(TaskErrorBadParams());
}

template <typename T>
RasterHistogramAccumulateTask<T>::~RasterHistogramAccumulateTask() {
  if (working_) counters_.JoinInto(*working_);
}

template <typename T>
bool RasterHistogramAccumulateTask<T>::Execute(ArgList& args) {
  if (HasError()) return false;
  const TilePtr<T> tile(args.Get(0));
  if (tile.IsNull() || !tile->IsValid()) {
    SetErrorState(TaskErrorBadArgs());
    return false;
  }
  ParallelRasterHistogramAccumulate<T> loop(*tile, *working_, counters_);
  RunParallelFor(loop, 0, GetAbortFlag());
  if (!loop.HasError()) return true;
  if (!working_->CanCount()) SetFault("the upper bound is below the lower one");
  SetErrorState(TaskError());
  return false;
}

namespace detail {

/// Places the stages of a process that reads (setup argument 0) and counts (setup argument 1).
inline bool PlaceReadAndCount(Process& process, TaskFactory& read, TaskFactory& count) {
  const ArgID iterator = process.TakeSetupArg();
  const ArgID working = process.TakeSetupArg();
  const ArgID tile = process.TakeTokenArg();
  return process.AddTask(0, TaskDescriptor(&read, ArgIDs({tile}), ArgIDs({iterator}))) &&
         process.AddTask(1, TaskDescriptor(&count, ArgIDs({tile}), ArgIDs({working})));
}

}  // namespace detail

template <typename T>
RasterHistogramProcess<T>::RasterHistogramProcess(const RasterIteratorPtr<T>& iterator,
                                                  const RasterHistogramPtr<T>& working,
                                                  const IPC& ipc)
    : ProcessBuilder("RasterHistogramProcess", ipc) {
  const bool placed = detail::PlaceReadAndCount(GetPipeline(), read_, accumulate_);
  SetArg(0, iterator);
  SetArg(1, working);
  GetPipeline().SetTotalTokens(std::uint64_t{iterator->Columns()} * iterator->Rows());
  if (placed) SetBuilt();
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
    : ProcessBuilderCallback<Process, HistogramCallback<T>>("RasterHistogramCallbackProcess",
                                                            receiver, ipc),
      stats_(stats),
      working_(working) {
  const bool placed = detail::PlaceReadAndCount(this->GetPipeline(), read_, accumulate_);
  this->SetArg(0, iterator);
  this->SetArg(1, working);
  this->GetPipeline().SetTotalTokens(std::uint64_t{iterator->Columns()} * iterator->Rows());
  if (placed) this->SetBuilt();
}

}  // namespace lumo
