#pragma once

#include "stats/raster_stats_process.h"
#include "stats/tile_strips.h"
#include "tasks/parallel_ranges.h"

namespace lumo {

/// The pixels of a strip that are worth a thread of their own: what it has to join afterwards is
/// little beside them.
template <typename T>
std::size_t LeastStripPixels(const RasterStats<T>& stats) {
  constexpr std::size_t kValues = 16 * 1024;
  return kValues / std::max(stats.BandCount(), 1U) + 1;
}
template <typename T>
std::size_t LeastStripPixels(const ExtendedRasterStats<T>& /*stats*/) {
  return 2048;
}

/// The statistics of a tile, of as many bands as `total` has.
template <typename T, typename Stats>
class ParallelRasterStatsAccumulate final : public ArrayParallelReduce<Stats> {
 public:
  /// @param tile  outlives the loop, and so does `total`.
  ParallelRasterStatsAccumulate(const Tile<T>& tile, const Stats& total)
      : ParallelRasterStatsAccumulate(tile, total, TileStrips(tile, LeastStripPixels(total))) {}

  Stats Identity() override { return Stats(total_.BandCount()); }

  void Join(Stats& left, const Stats& right) override {
    if (!left.Merge(right)) this->Fail();
  }

  Stats Accumulate(unsigned begin, unsigned end) override {
    Stats part(total_.BandCount());
    for (unsigned i = begin; i < end && !this->Failed(); ++i) {
      const TilePart strip = strips_.Strip(i);
      if (!part.Accumulate(tile_, strip.rowFrom, strip.rowTo, strip.columnFrom, strip.columnTo)) {
        this->Fail();
      }
    }
    return part;
  }

 private:
  ParallelRasterStatsAccumulate(const Tile<T>& tile, const Stats& total, const TileStrips& strips)
      : ArrayParallelReduce<Stats>(strips.Count()), tile_(tile), total_(total), strips_(strips) {
    if (tile.Bands() != total.BandCount()) this->Fail();
  }

  const Tile<T>& tile_;
  const Stats& total_;
  const TileStrips strips_;
};

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
  ParallelRasterStatsAccumulate<T, Stats> loop(*tile, *stats_);
  Stats ofTile;
  RunParallelReduce(loop, ofTile, GetAbortFlag());
  const std::lock_guard lock(mergeLock_);
  if (!loop.HasError() && stats_->Merge(ofTile)) return true;
  SetErrorState(TaskError());
  return false;
}

template <typename T, typename Stats>
RasterStatsProcess<T, Stats>::RasterStatsProcess(const RasterIteratorPtr<T>& iterator,
                                                 const Pointer<Stats>& stats, const IPC& ipc)
    : ProcessBuilder("RasterStatsProcess", ipc) {
  stats->Reset(iterator->BandCount());
  Process& process = GetPipeline();
  const ArgID iteratorId = process.TakeSetupArg();
  const ArgID statsId = process.TakeSetupArg();
  const ArgID tile = process.TakeTokenArg();
  const bool placed =
      process.AddTask(0, TaskDescriptor(&read_, ArgIDs({tile}), ArgIDs({iteratorId}))) &&
      process.AddTask(1, TaskDescriptor(&accumulate_, ArgIDs({tile}), ArgIDs({statsId})));
  SetArg(iteratorId, iterator);
  SetArg(statsId, stats);
  process.SetTotalTokens(std::uint64_t{iterator->Columns()} * iterator->Rows());
  if (placed) SetBuilt();
}

}  // namespace lumo
