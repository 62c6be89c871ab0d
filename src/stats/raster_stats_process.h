#pragma once

#include <mutex>

#include "raster/raster_tasks.h"
#include "stats/extended_raster_stats.h"
#include "tasks/process_builder.h"

// How statistics are computed: a process that reads a raster and takes its tiles in one after the
// other, each in parallel. T is one of TenTypes, Stats is RasterStats<T> or ExtendedRasterStats<T>.

namespace lumo {

/// Takes in the tile in slot 0, which stays. Setup arguments: the object that takes it. When the
/// task goes, with no error and no abort, the object is finished.
template <typename T, typename Stats>
class RasterStatsAccumulateTask final : public ConcurrentTask {
 public:
  explicit RasterStatsAccumulateTask(ArgList& setup);
  ~RasterStatsAccumulateTask() override;
  bool Execute(ArgList& args) override;

 private:
  Pointer<Stats> stats_;
  std::mutex mergeLock_;  // held for the one merge of a tile
};

/// Computes the statistics of all pixels that an iterator reads. The results are in `stats` when
/// it has ended well; after an abort or a failure they are of no use.
template <typename T, typename Stats>
class RasterStatsProcess final : public ProcessBuilder<Process> {
 public:
  /// @param stats  is reset for the bands of the iterator.
  RasterStatsProcess(const RasterIteratorPtr<T>& iterator, const Pointer<Stats>& stats,
                     const IPC& ipc = {});

 private:
  ManagedTask<RasterReadTask<T>> read_;
  ManagedTask<RasterStatsAccumulateTask<T, Stats>> accumulate_;
};

VEXG_EXTERN(TEN, RasterStatsAccumulateTask, RasterStats);
VEXG_EXTERN(TEN, RasterStatsAccumulateTask, ExtendedRasterStats);
VEXG_EXTERN(TEN, RasterStatsProcess, RasterStats);
VEXG_EXTERN(TEN, RasterStatsProcess, ExtendedRasterStats);

}  // namespace lumo
