#pragma once

#include "raster/tile_process.h"
#include "stats/histogram_counter.h"
#include "stats/raster_stats.h"
#include "tasks/scratch_pool.h"

// Histograms are counted by a process that reads a raster and counts several of its tiles at once.
// T is one of TenTypes.
//
//     const RasterIteratorPtr<float> tiles(new RasterIteratorStream<float>(raster));
//     RasterHistogramProcess<float> process(tiles, histogram, ipc);
//     const bool well = process.RunProcess(process.kHere);

namespace lumo {

/// Counts the tile in slot 0, which stays. Setup arguments: the RasterHistogram<T> whose bins are
/// counted. When the task goes, it holds what was counted, also of a run that did not come to its
/// end.
template <typename T>
class RasterHistogramAccumulateTask final : public StatelessTask {
 public:
  explicit RasterHistogramAccumulateTask(ArgList& setup);
  ~RasterHistogramAccumulateTask() override;
  bool Execute(ArgList& args) override;

 private:
  RasterHistogramPtr<T> working_;
  ScratchPool<HistogramCounter<T>> counters_;  // nothing is shared while counting
};

/// Counts the histograms of the pixels that an iterator reads, whose bands are those of `working`.
template <typename T>
class RasterHistogramProcess final : public TileProcess<> {
 public:
  RasterHistogramProcess(const RasterIteratorPtr<T>& iterator, const RasterHistogramPtr<T>& working,
                         const IPC& ipc = {});
};

/// Takes the results of a RasterHistogramCallbackProcess that neither failed nor was aborted.
template <typename T>
class HistogramCallback {
 public:
  virtual ~HistogramCallback() = default;
  /// Called once, on the thread of the run, after its last tile.
  virtual void TakeResults(const RasterStatsPtr<T>& stats, const RasterHistogramPtr<T>& histogram,
                           HistogramSign sign) = 0;

 private:
  friend class ProcessBuilderCallback<Process, HistogramCallback>;
  void OnProcessEnd(ProcessBuilder<Process>& process);
};

/// RasterHistogramProcess that hands what it counted to an object, together with statistics that
/// were computed before.
template <typename T>
class RasterHistogramCallbackProcess final
    : public TileProcess<ProcessBuilderCallback<Process, HistogramCallback<T>>> {
 public:
  /// @param receiver  outlives the run.
  RasterHistogramCallbackProcess(const RasterIteratorPtr<T>& iterator,
                                 const RasterHistogramPtr<T>& working,
                                 const RasterStatsPtr<T>& stats, HistogramCallback<T>* receiver,
                                 const IPC& ipc = {});

  const RasterStatsPtr<T>& Stats() const { return stats_; }
  const RasterHistogramPtr<T>& Histogram() const { return working_; }

 private:
  RasterStatsPtr<T> stats_;
  RasterHistogramPtr<T> working_;
};

VEXG_EXTERN(TEN, RasterHistogramAccumulateTask);
VEXG_EXTERN(TEN, RasterHistogramProcess);
VEXG_EXTERN(TEN, HistogramCallback);
VEXG_EXTERN(TEN, RasterHistogramCallbackProcess);

}  // namespace lumo
