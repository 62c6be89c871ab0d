#pragma once

#include "raster/tile_functions.h"
#include "stats/raster_stats_process.h"
#include "tasks/task_errors.h"

namespace lumo {

/// The pixels of a strip that are worth a thread of their own: what it has to join afterwards is
/// little beside them.
template <typename T>
std::size_t LeastStripPixels(const RasterStats<T>& stats) {
  return LeastStripPixels(stats.BandCount());
}
template <typename T>
std::size_t LeastStripPixels(const ExtendedRasterStats<T>& /*stats*/) {
  return 2048;
}

/// Gives the statistics of a part of a tile: empty where it has another number of bands, or there
/// is no memory for them.
template <typename T, typename Stats>
struct ParallelRasterStatsAccumulate {
  unsigned bands;

  std::optional<Stats> operator()(const Tile<T>& tile, const TilePart& part) const {
    std::optional<Stats> stats(bands);
    const bool taken = tile.Bands() == bands && stats->Accumulate(tile, part.rowFrom, part.rowTo,
                                                                  part.columnFrom, part.columnTo);
    if (!taken) stats.reset();
    return stats;
  }
};

/// Joins statistics, and keeps those that come to the total.
template <typename Stats>
struct MergeAndKeep {
  const Stats* total;
  ShareWriter* kept;  // null for none

  bool operator()(Stats& left, const Stats& right) const {
    if (kept != nullptr && &left == total) right.Save(*kept);
    return left.Merge(right);
  }
};

/// Joins statistics.
struct MergeStats {
  template <typename Stats>
  bool operator()(Stats& left, const Stats& right) const {
    return left.Merge(right);
  }
};

/// The statistics of a tile, by all threads in strips that its size alone decides; empty after an
/// abort, and where there is no memory for them.
/// @param like  of as many bands; nothing is added to it.
template <typename T, typename Stats>
std::optional<Stats> StatsOfTile(const Stats& like, const Tile<T>& tile, const AbortFlag* abort) {
  const ParallelRasterStatsAccumulate<T, Stats> part{like.BandCount()};
  return ReduceStrips<Stats>(
      tile, LeastStripPixels(like), abort, [&](const TilePart& strip) { return part(tile, strip); },
      MergeStats());
}

template <typename T, typename Stats>
RasterStatsAccumulateTask<T, Stats>::RasterStatsAccumulateTask(ArgList& setup)
    : ConcurrentTask("RasterStatsAccumulateTask"), stats_(setup.Get(0)) {
  if (stats_.IsNull() || !stats_->IsValid()) SetErrorState(TaskErrorBadParams());
}

template <typename T, typename Stats>
RasterStatsAccumulateTask<T, Stats>::~RasterStatsAccumulateTask() {
  if (!HasError() && !IsAborted()) stats_->Finish();
}

template <typename T, typename Stats>
bool RasterStatsAccumulateTask<T, Stats>::Execute(ArgList& args) {
  if (HasError()) return false;
  const TilePtr<T> tile(args.Get(0));
  if (tile.IsNull() || !tile->IsValid()) {
    SetErrorState(TaskErrorBadArgs());
    return false;
  }
  const std::optional<Stats> ofTile = StatsOfTile(*stats_, *tile, GetAbortFlag());
  if (IsAborted() || (ofTile && stats_->Merge(*ofTile))) return true;
  SetErrorState(TaskError());
  return false;
}

template <typename T, typename Stats>
RasterStatsProcess<T, Stats>::RasterStatsProcess(const RasterIteratorPtr<T>& iterator,
                                                 const Pointer<Stats>& stats, const IPC& ipc,
                                                 ShareWriter* ofTile)
    : TileProcess("RasterStatsProcess", ipc), stats_(stats) {
  stats->Reset(iterator->BandCount());
  const std::tuple tiles{Read(iterator)};
  AddReduction(*this, "RasterStatsAccumulateTask", tiles, *stats_,
               ParallelRasterStatsAccumulate<T, Stats>{stats->BandCount()},
               MergeAndKeep<Stats>{stats_.Get(), ofTile}, LeastStripPixels(*stats));
  Close();
}

template <typename T, typename Stats>
void RasterStatsProcess<T, Stats>::Execute() {
  TileProcess::Execute();
  if (!HasError() && !IsAborted() && !stats_->Finish()) SetErrorState(AsyncErrorExecuteFailed());
}

}  // namespace lumo
