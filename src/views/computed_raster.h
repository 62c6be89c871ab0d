#pragma once

#include "raster/raster_view.h"
#include "stats/dynamic_raster_histogram.h"
#include "stats/dynamic_raster_stats.h"

namespace lumo {

/// A raster whose statistics and histograms are its own, computed from the pixels that it shows:
/// the base of the sources, and of the views that show other pixels than their parent. It stores
/// none of them. Everything else goes to the parent. Exists for TwelveTypes.
///
/// A class derived from it says StopComputing() first in its destructor: a computation that goes on
/// reads the raster, which has to be whole until it has stopped.
///
///     template <typename T>
///     class NegatedRaster final : public ComputedRaster<T> {
///      public:
///       explicit NegatedRaster(const RasterPtr<T>& parent) : ComputedRaster<T>(parent) {}
///       ~NegatedRaster() override { this->StopComputing(); }
///       bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
///                       Array<T>& pixels, Array<unsigned char>& state) override;
///     };
///
/// A view that in one of its forms shows the statistics of its parent says so to the constructor:
/// the operations on statistics and histograms then go to the parent like everything else.
template <typename T>
class ComputedRaster : public RasterView<T> {
 public:
  /// Says whether the raster gives statistics and histograms of its own or the parent's.
  enum class StatsOf { kThis, kParent };

  explicit ComputedRaster(const RasterPtr<T>& parent = {}, StatsOf statsOf = StatsOf::kThis);
  ~ComputedRaster() override;

  bool StatsExist(unsigned band, unsigned mask) const override;
  AsyncPtr StatsBuild(const IPC& ipc) override;
  AsyncPtr StatsAsync() const override;
  void SetStatsMode(lumo::StatsMode mode) override;
  lumo::StatsMode StatsMode() const override;
  bool WriteStats() override;
  void SetBandStats(const RasterBandStats<T>& stats) override;
  RasterBandStats<T> BandStats(unsigned band) const override;
  StatValue<T> StatOf(StatsMask::Code stat, unsigned band, unsigned otherBand,
                      const IPC& ipc) override;

  AsyncPtr HistogramAsync() const override;
  bool WriteHistogram() override;
  void SetBandHistogram(const RasterBandHistogram<T>& histogram) override;
  Array<RasterBandHistogram<T>> BandHistogram(unsigned band) const override;
  AsyncPtr CountHistogram(const HistogramRequest<T>& request, const IPC& ipc) override;

 protected:
  /// Ends the computations that go on; nothing is at hand, or can be computed, from then on.
  void StopComputing();

  /// The raster's own statistics; null where they are the parent's, or have stopped.
  DynamicRasterStats<T>* Stats() const { return stats_.Get(); }
  DynamicRasterHistogram<T>* Histogram() const { return histogram_.Get(); }

 private:
  template <typename Own, typename Parents>
  auto OfStats(const Own& own, const Parents& parents) const;
  template <typename Own, typename Parents>
  auto OfHistogram(const Own& own, const Parents& parents) const;

  const StatsOf statsOf_;
  DynamicRasterStatsPtr<T> stats_;
  DynamicRasterHistogramPtr<T> histogram_;
};

VEXG_EXTERN(TWELVE, ComputedRaster);

}  // namespace lumo
