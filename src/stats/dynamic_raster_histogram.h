#pragma once

#include <memory>
#include <mutex>
#include <vector>

#include "raster/raster.h"

namespace lumo {

class ShareScope;

/// The histograms of one raster: those at hand, and the run that counts one more. A raster that
/// shows pixels of its own holds one and leaves its operations on histograms to it.
///
///     const AsyncPtr run = histograms.CountHistogram(request, ipc);
///     if (!run) return false;  // another run goes on, or the request doesn't fit the raster
///     run->WaitFinished();
///     const Array<RasterBandHistogram<float>> all = histograms.BandHistogram(0);
///
/// A run reads the pixels of its bands once, in the background. Its histograms are taken over at
/// the next call of any operation, and join those at hand unless an equal one is there. So does
/// what a run had counted when it was aborted; one that failed leaves nothing.
///
/// Where a ShareScope lives on the thread that asks, a run is that of a share, or joins those of
/// all; it has ended when it was begun, and CountHistogram then gives nothing.
///
/// Those at hand hold for one Raster::WriteCount. Once pixels have been written they are gone, ones
/// entered by hand as well, and a run that was under way then leaves nothing.
///
/// Exists for TwelveTypes; for complex numbers it is empty, counts nothing and keeps nothing.
///
/// Ownership: the raster owns it and outlives it. It is to be one of the raster's last members: its
///            destructor aborts a run that goes on, which reads the raster to that moment.
/// Threads:   every operation may be called on any thread. The lock is never held while pixels are
///            read, but for a share.
template <typename T>
class DynamicRasterHistogram : public ErrorState,
                               public HistogramsByName<DynamicRasterHistogram<T>, T> {
 public:
  /// @param raster  owns this object, and is read by its runs.
  explicit DynamicRasterHistogram(Raster<T>* raster);
  /// Aborts a run that goes on, and waits for its end.
  ~DynamicRasterHistogram() override;
  DynamicRasterHistogram(const DynamicRasterHistogram&) = delete;
  DynamicRasterHistogram& operator=(const DynamicRasterHistogram&) = delete;

  /// Starts a run. Empty while a run goes on, for a band that the raster doesn't have, and when
  /// none could be started. See RasterHistogram for the bins.
  AsyncPtr CountHistogram(const HistogramRequest<T>& request, const IPC& ipc);
  /// The run that goes on now; empty when none does.
  AsyncPtr HistogramAsync() const;

  /// Enters a histogram by hand. Ignored while a run goes on, or when an equal one is at hand.
  void SetBandHistogram(const RasterBandHistogram<T>& histogram);
  /// Those at hand for the band, in the order in which they came; none while a run goes on.
  Array<RasterBandHistogram<T>> BandHistogram(unsigned band) const;

 private:
  struct Run;

  bool CheckRunning() const;
  bool DoShare(ShareScope& shares, Run& run, const IPC& ipc) const;
  void DropStale() const;
  void Append(const RasterBandHistogram<T>& histogram) const;

  mutable std::mutex lock_;  // guards all below
  Raster<T>* const raster_;
  mutable std::vector<RasterBandHistogram<T>> histograms_;
  mutable std::uint64_t writes_ = 0;  // the histograms hold for this Raster::WriteCount
  mutable std::unique_ptr<Run> run_;
};

/// The empty form for complex numbers.
template <typename T>
class DynamicRasterHistogram<Complex<T>>
    : public ErrorState, public HistogramsByName<DynamicRasterHistogram<Complex<T>>, Complex<T>> {
 public:
  explicit DynamicRasterHistogram(Raster<Complex<T>>* /*raster*/) {}

  AsyncPtr CountHistogram(const HistogramRequest<Complex<T>>& /*request*/, const IPC& /*ipc*/) {
    return {};
  }
  AsyncPtr HistogramAsync() const { return {}; }
  void SetBandHistogram(const RasterBandHistogram<Complex<T>>& /*histogram*/) {}
  Array<RasterBandHistogram<Complex<T>>> BandHistogram(unsigned /*band*/) const { return {}; }
};

template <typename T>
using DynamicRasterHistogramPtr = Pointer<DynamicRasterHistogram<T>>;

VEXG_EXTERN(TEN, DynamicRasterHistogram);

}  // namespace lumo
