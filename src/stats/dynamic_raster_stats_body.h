#pragma once

#include "commands/share_scope.h"
#include "foundation/fault.h"
#include "raster/raster_lines.h"
#include "stats/dynamic_raster_stats.h"
#include "stats/raster_stats_process.h"

namespace lumo {

/// A computation, with what its process works on.
template <typename T>
struct DynamicRasterStats<T>::Run {
  RasterIteratorPtr<T> iterator;
  RasterStatsPtr<T> basic;
  ExtendedRasterStatsPtr<T> extended;
  Pointer<ProcessBuilder<Process>> process;
  std::uint64_t writes = 0;  // Raster::WriteCount when it began

  const RasterStats<T>& Results() const { return extended ? *extended : *basic; }
};

template <typename T>
DynamicRasterStats<T>::DynamicRasterStats(Raster<T>* raster) : raster_(raster) {}

template <typename T>
DynamicRasterStats<T>::~DynamicRasterStats() {
  const std::lock_guard lock(lock_);
  if (!run_) return;
  run_->process->Abort();
  run_->process->WaitFinished();
}

/// True while a computation runs. One that has ended is taken over here, and what no longer holds
/// is dropped. Under the lock.
template <typename T>
bool DynamicRasterStats<T>::CheckRunning() const {
  DropStale();
  if (!run_) return false;
  if (!run_->process->IsFinished()) return true;
  const std::unique_ptr<Run> run = std::move(run_);
  wasOvertaken_ = run->writes != writes_;
  if (run->process->HasError()) {
    SetFault(run->process->GetFault());
  } else if (!wasOvertaken_) {
    TakeOver(*run);
  }
  return false;
}

template <typename T>
void DynamicRasterStats<T>::DropStale() const {
  const std::uint64_t writes = raster_->WriteCount();
  if (writes == writes_) return;
  entries_.clear();
  writes_ = writes;
}

template <typename T>
void DynamicRasterStats<T>::TakeOver(const Run& run) const {
  const RasterStats<T>& results = run.Results();
  const unsigned bands = raster_->Bands();
  // After an abort there are no results.
  if (results.BandCount() != bands || results.PixelCounts().GetCount() != bands) return;

  Entries entries(bands);
  for (unsigned band = 0; band < bands; ++band) {
    RasterBandStats<T>& entry = entries[band];
    entry = results.BandStats(band);
    if (!run.extended) continue;
    entry.mask = StatsMask::Extended;
    const auto row = [&](const Array<double>& matrix, Array<double>& into) {
      if (into.Resize(ArrayDims(bands))) {
        std::copy_n(matrix.GetData() + std::size_t{band} * bands, bands, into.begin());
      }
    };
    row(run.extended->SumXY(), entry.sumXY);
    row(run.extended->Cov(), entry.cov);
  }
  entries_ = std::move(entries);
}

/// The entry of the band, when it has all bits of the mask. Under the lock.
template <typename T>
const RasterBandStats<T>* DynamicRasterStats<T>::FindEntry(unsigned band, unsigned mask) const {
  for (const RasterBandStats<T>& entry : entries_) {
    if (entry.band == band) return (entry.mask & mask) == mask ? &entry : nullptr;
  }
  return nullptr;
}

template <typename T>
bool DynamicRasterStats<T>::StatsExist(unsigned band, unsigned mask) const {
  const std::lock_guard lock(lock_);
  CheckRunning();
  return FindEntry(band, mask) != nullptr;
}

template <typename T>
AsyncPtr DynamicRasterStats<T>::StatsBuild(const IPC& ipc) {
  const std::lock_guard lock(lock_);
  if (CheckRunning()) return {};
  auto run = std::make_unique<Run>();
  run->writes = writes_;
  wasOvertaken_ = false;
  const RasterPtr<T> raster(raster_, true);  // the raster outlives the run
  run->iterator.Reset(new RasterIteratorStream<T>(raster));
  if (!run->iterator->IsValid()) return {};
  if (ShareScope* const shares = ShareScope::Current()) {
    if (DoShare(*shares, *run, ipc)) TakeOver(*run);
    return {};
  }
  if (mode_ == lumo::StatsMode::kBasic) {
    run->basic.Reset(new RasterStats<T>);
    run->process.Reset(new RasterStatsProcess<T, RasterStats<T>>(run->iterator, run->basic, ipc));
  } else if (mode_ == lumo::StatsMode::kExtended) {
    run->extended.Reset(new ExtendedRasterStats<T>);
    run->process.Reset(
        new RasterStatsProcess<T, ExtendedRasterStats<T>>(run->iterator, run->extended, ipc));
  } else {
    return {};
  }
  if (!run->process->RunProcess(run->process->kInBackground)) return {};
  run_ = std::move(run);
  return run_->process;
}

/// Computes the statistics of a share, or joins those of all. @return false, with the fault set,
/// when that fails; nothing then holds.
template <typename T>
bool DynamicRasterStats<T>::DoShare(ShareScope& shares, Run& run, const IPC& ipc) const {
  const auto compute = [&](const auto& stats) {
    using Stats = std::remove_pointer_t<decltype(stats.Get())>;
    const auto& whole = static_cast<const RasterIteratorStream<T>&>(*run.iterator);
    if (shares.Joins()) return Join(shares, whole, *stats);
    stats->Reset(whole.BandCount());
    if (RasterIteratorShare<T>::IsEmpty(whole, shares.GetShare())) return stats->Finish();
    const RasterIteratorPtr<T> tiles(new RasterIteratorShare<T>(whole, shares.GetShare()));
    RasterStatsProcess<T, Stats> process(tiles, stats, ipc, &shares.Out());
    if (process.RunProcess(process.kHere)) return !ipc.abort->IsSet();
    SetFault(process.GetFault());
    return false;
  };
  if (mode_ == lumo::StatsMode::kExtended) {
    run.extended.Reset(new ExtendedRasterStats<T>);
    return compute(run.extended);
  }
  run.basic.Reset(new RasterStats<T>);
  return compute(run.basic);
}

/// Joins the statistics of all tiles, in their order: as the run over the whole does it.
template <typename T>
template <typename Stats>
bool DynamicRasterStats<T>::Join(ShareScope& shares, const BasicRasterIterator& whole,
                                 Stats& stats) const {
  stats.Reset(whole.BandCount());
  for (unsigned i = 0; i < shares.Count(); ++i) {
    const Share share{i, shares.Count()};
    const std::uint64_t rows = share.End(whole.Rows()) - share.Begin(whole.Rows());
    ShareReader* const in = shares.In(i);
    if (in == nullptr) return false;
    for (std::uint64_t tile = 0; tile < rows * whole.Columns(); ++tile) {
      Stats ofTile(whole.BandCount());
      if (ofTile.Restore(*in) && stats.Merge(ofTile)) continue;
      SetFault("the files of the shares don't hold the sums of all blocks");
      return false;
    }
  }
  return stats.Finish();
}

template <typename T>
AsyncPtr DynamicRasterStats<T>::StatsAsync() const {
  const std::lock_guard lock(lock_);
  return CheckRunning() ? AsyncPtr(run_->process) : AsyncPtr();
}

template <typename T>
void DynamicRasterStats<T>::SetStatsMode(lumo::StatsMode mode) {
  const std::lock_guard lock(lock_);
  if (CheckRunning()) return;
  if (mode_ == lumo::StatsMode::kBasic && mode == lumo::StatsMode::kExtended) entries_.clear();
  mode_ = mode;
}

template <typename T>
lumo::StatsMode DynamicRasterStats<T>::StatsMode() const {
  const std::lock_guard lock(lock_);
  CheckRunning();
  return mode_;
}

template <typename T>
void DynamicRasterStats<T>::SetBandStats(const RasterBandStats<T>& stats) {
  const std::lock_guard lock(lock_);
  if (CheckRunning()) return;
  for (RasterBandStats<T>& entry : entries_) {
    if (entry.band != stats.band) continue;
    entry = stats;
    return;
  }
  if (stats.band < raster_->Bands()) entries_.push_back(stats);
}

template <typename T>
RasterBandStats<T> DynamicRasterStats<T>::BandStats(unsigned band) const {
  const std::lock_guard lock(lock_);
  CheckRunning();
  if (const RasterBandStats<T>* const entry = FindEntry(band, StatsMask::None)) return *entry;
  RasterBandStats<T> none;
  none.band = band;
  return none;
}

/// `value(entry)` for the band, computed when its bit is missing; 0 when it stays missing.
template <typename T>
template <typename Value>
auto DynamicRasterStats<T>::Get(unsigned band, unsigned bit, const IPC& ipc, const Value& value) {
  using Result = decltype(value(RasterBandStats<T>()));
  const auto find = [&](Result& result) {
    const std::lock_guard lock(lock_);
    CheckRunning();
    const RasterBandStats<T>* const entry = FindEntry(band, bit);
    if (entry != nullptr) result = value(*entry);
    return entry != nullptr;
  };
  Result result{};
  if (find(result) || band >= raster_->Bands()) {
    ipc.progress->Update(1.0);
    return result;
  }
  constexpr unsigned kAttempts = 16;
  for (unsigned attempt = 0; attempt < kAttempts; ++attempt) {
    AsyncPtr run = StatsBuild(ipc);
    if (!run) run = StatsAsync();  // another getter's
    if (run) run->WaitFinished();
    if (find(result) || ipc.abort->IsSet() || !WasOvertaken()) return result;
  }
  SetFault("the pixels were written again and again while their statistics were computed");
  return result;
}

template <typename T>
bool DynamicRasterStats<T>::WasOvertaken() const {
  const std::lock_guard lock(lock_);
  return wasOvertaken_;
}

template <typename T>
std::uint64_t DynamicRasterStats<T>::PixelCount(unsigned band, const IPC& ipc) {
  return Get(band, StatsMask::Min, ipc, [](const auto& entry) { return entry.pixelCount; });
}

template <typename T>
StatValue<T> DynamicRasterStats<T>::StatOf(StatsMask::Code stat, unsigned band, unsigned otherBand,
                                           const IPC& ipc) {
  const bool isOfPair = (stat & StatsMask::Pairs) != 0;
  if (isOfPair && StatsMode() != lumo::StatsMode::kExtended) return {};
  return Get(band, stat, ipc, [=](const auto& entry) { return entry.ValueOf(stat, otherBand); });
}

}  // namespace lumo
