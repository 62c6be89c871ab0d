#pragma once

#include <memory>
#include <mutex>
#include <vector>

#include "raster/raster.h"

namespace lumo {

class BasicRasterIterator;
class ShareScope;

/// The statistics of one raster: those at hand, and the computation that gives the rest. A raster
/// that shows pixels of its own holds one and leaves its operations on statistics to it.
///
/// A computation reads all pixels once, in the background, and gives all values of all bands. Its
/// result is taken over at the next call of any operation, and then replaces the earlier one. A
/// computation that was aborted, or failed, changes nothing.
///
/// Where a ShareScope lives on the thread that asks, a computation is that of a share, or joins
/// those of all, and has ended when it was begun.
///
/// The values at hand hold for one Raster::WriteCount. Once pixels have been written they are gone,
/// ones entered by hand as well, and a computation that was under way then gives nothing; a getter
/// that waits for it starts another one.
///
/// Exists for TwelveTypes; for complex numbers it is empty, computes nothing and keeps nothing.
///
/// Ownership: the raster owns it and outlives it. It is to be the raster's last member: its
///            destructor aborts a computation that goes on, which reads the raster to that moment.
/// Threads:   every operation may be called on any thread. The lock is never held while pixels are
///            read, but for a share, or while a getter waits.
/// Failure:   getters give 0, with the fault set.
template <typename T>
class DynamicRasterStats : public ErrorState,
                           public NumbersByName<DynamicRasterStats<T>>,
                           public ExtremesByName<DynamicRasterStats<T>, T> {
 public:
  /// @param raster  owns this object, and is read by its computations.
  explicit DynamicRasterStats(Raster<T>* raster);
  /// Aborts a computation that goes on, and waits for its end.
  ~DynamicRasterStats() override;
  DynamicRasterStats(const DynamicRasterStats&) = delete;
  DynamicRasterStats& operator=(const DynamicRasterStats&) = delete;

  /// True when all statistics of `mask`, bits of StatsMask, are at hand for the band.
  bool StatsExist(unsigned band, unsigned mask) const;
  /// Starts a computation in the current mode. Empty while one runs, or when none could be started.
  AsyncPtr StatsBuild(const IPC& ipc);
  /// The computation that runs now; empty when none does.
  AsyncPtr StatsAsync() const;

  /// Ignored while a computation runs. From the basic to the extended mode the values at hand go,
  /// so that the next getter computes everything.
  void SetStatsMode(lumo::StatsMode mode);
  lumo::StatsMode StatsMode() const;

  /// Enters the statistics of one band, in place of the earlier ones. Ignored while a computation
  /// runs, and for a band that the raster doesn't have.
  void SetBandStats(const RasterBandStats<T>& stats);
  /// The values at hand for the band; mask 0 when there are none.
  RasterBandStats<T> BandStats(unsigned band) const;

  /// The value at hand; else after a computation that is started here, or the one that runs, has
  /// ended. 0 when it is then still missing, and for SumXY and Cov in the basic mode. Min, Mean and
  /// the like ask it.
  StatValue<T> StatOf(StatsMask::Code stat, unsigned band, unsigned otherBand, const IPC& ipc);
  double NumberOf(StatsMask::Code stat, unsigned band, unsigned otherBand, const IPC& ipc) {
    return StatOf(stat, band, otherBand, ipc).number;
  }
  /// How many valid pixels the band has, computed when that isn't at hand. 0 on a failure.
  std::uint64_t PixelCount(unsigned band, const IPC& ipc);

 private:
  struct Run;
  using Entries = std::vector<RasterBandStats<T>>;

  bool CheckRunning() const;
  void DropStale() const;
  void TakeOver(const Run& run) const;
  bool DoShare(ShareScope& shares, Run& run, const IPC& ipc) const;
  template <typename Stats>
  bool Join(ShareScope& shares, const BasicRasterIterator& whole, Stats& stats) const;
  bool WasOvertaken() const;
  const RasterBandStats<T>* FindEntry(unsigned band, unsigned mask) const;
  template <typename Value>
  auto Get(unsigned band, unsigned bit, const IPC& ipc, const Value& value);

  mutable std::mutex lock_;  // guards all below
  Raster<T>* const raster_;
  lumo::StatsMode mode_ = lumo::StatsMode::kBasic;
  mutable Entries entries_;
  mutable std::uint64_t writes_ = 0;   // the entries hold for this Raster::WriteCount
  mutable bool wasOvertaken_ = false;  // by a write, the last computation
  mutable std::unique_ptr<Run> run_;
};

/// The empty form for complex numbers.
template <typename T>
class DynamicRasterStats<Complex<T>>
    : public ErrorState,
      public NumbersByName<DynamicRasterStats<Complex<T>>>,
      public ExtremesByName<DynamicRasterStats<Complex<T>>, Complex<T>> {
 public:
  explicit DynamicRasterStats(Raster<Complex<T>>* /*raster*/) {}

  bool StatsExist(unsigned /*band*/, unsigned /*mask*/) const { return false; }
  AsyncPtr StatsBuild(const IPC& /*ipc*/) { return {}; }
  AsyncPtr StatsAsync() const { return {}; }
  void SetStatsMode(lumo::StatsMode /*mode*/) {}
  lumo::StatsMode StatsMode() const { return lumo::StatsMode::kBasic; }
  void SetBandStats(const RasterBandStats<Complex<T>>& /*stats*/) {}
  RasterBandStats<Complex<T>> BandStats(unsigned band) const {
    RasterBandStats<Complex<T>> stats;
    stats.band = band;
    return stats;
  }
  std::uint64_t PixelCount(unsigned /*band*/, const IPC& /*ipc*/) { return 0; }
  StatValue<Complex<T>> StatOf(StatsMask::Code /*stat*/, unsigned /*band*/, unsigned /*otherBand*/,
                               const IPC& /*ipc*/) {
    return {};
  }
  double NumberOf(StatsMask::Code /*stat*/, unsigned /*band*/, unsigned /*otherBand*/,
                  const IPC& /*ipc*/) {
    return 0;
  }
};

template <typename T>
using DynamicRasterStatsPtr = Pointer<DynamicRasterStats<T>>;

VEXG_EXTERN(TEN, DynamicRasterStats);

}  // namespace lumo
