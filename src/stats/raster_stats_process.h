#pragma once

#include "raster/tile_process.h"
#include "stats/extended_raster_stats.h"

// Statistics are computed by a process that reads a raster, takes in several of its tiles at once,
// and joins their results in their order. T is one of TenTypes, Stats is RasterStats<T> or
// ExtendedRasterStats<T>.
//
//     const RasterIteratorPtr<float> tiles(new RasterIteratorStream<float>(raster));
//     const RasterStatsPtr<float> stats(new RasterStats<float>);
//     RasterStatsProcess<float, RasterStats<float>> process(tiles, stats, ipc);
//     if (process.RunProcess(process.kHere)) Use(stats->Means());

namespace lumo {

/// The stage of another process that takes in the tile in slot 0 on the way, which stays. Setup
/// arguments: the object that takes it. When the task goes, with no error and no abort, the object
/// is finished.
template <typename T, typename Stats>
class RasterStatsAccumulateTask final : public ConcurrentTask {
 public:
  explicit RasterStatsAccumulateTask(ArgList& setup);
  ~RasterStatsAccumulateTask() override;
  bool Execute(ArgList& args) override;

 private:
  Pointer<Stats> stats_;
};

/// Computes the statistics of all pixels that an iterator reads. The results are in `stats` when
/// it has ended well; after an abort or a failure they are of no use.
template <typename T, typename Stats>
class RasterStatsProcess final : public TileProcess<> {
 public:
  /// @param stats   is reset for the bands of the iterator.
  /// @param ofTile  gets the sums of each tile, in their order; null for none.
  RasterStatsProcess(const RasterIteratorPtr<T>& iterator, const Pointer<Stats>& stats,
                     const IPC& ipc = {}, ShareWriter* ofTile = nullptr);
  void Execute() override;

 private:
  Pointer<Stats> stats_;
};

VEXG_EXTERN(TEN, RasterStatsAccumulateTask, RasterStats);
VEXG_EXTERN(TEN, RasterStatsAccumulateTask, ExtendedRasterStats);
VEXG_EXTERN(TEN, RasterStatsProcess, RasterStats);
VEXG_EXTERN(TEN, RasterStatsProcess, ExtendedRasterStats);

}  // namespace lumo
