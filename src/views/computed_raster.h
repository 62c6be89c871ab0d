#pragma once

#include "raster/raster_view.h"
#include "stats/dynamic_raster_histogram.h"
#include "stats/dynamic_raster_stats.h"

namespace lumo {

/// A raster whose statistics and histograms are its own, computed from the pixels that it shows:
/// the base of the sources, and of the views that show other pixels than their parent. It stores
/// none of them. Everything else goes to the parent. Exists for TwelveTypes.
///
/// A class derived from it says StopComputing() first in its destructor: what is being computed
/// reads the raster, which has to be whole until it has stopped.
///
/// A view that in one of its forms shows the statistics of its parent says so to the constructor:
/// the operations on statistics and histograms then go to the parent like everything else.
template <typename T>
class ComputedRaster : public RasterView<T> {
 public:
  /// Whose statistics and histograms the raster gives.
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
  /// Ends what is being computed; nothing is at hand, or can be computed, from then on.
  void StopComputing();

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
