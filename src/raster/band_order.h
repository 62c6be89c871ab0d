#pragma once

#include "raster/band_values.h"

// The numbers of bands of a view that shows bands of its parent in an order of its own: the order
// has the parent's band of each band of the view.

namespace lumo {

struct RasterDef;

/// The parent's band of a view's; the parent's first for one that the view doesn't have. Without an
/// order the bands are the same.
inline unsigned BandIn(const Array<unsigned>* order, unsigned band) {
  if (order == nullptr) return band;
  return band < order->GetCount() ? (*order)[band] : 0;
}

/// The parent's bands of several of a view's, by BandIn.
VEXG_EXPORT Array<unsigned> BandsIn(const Array<unsigned>& order, const Array<unsigned>& bands);

/// Turns the description of the parent into that of the view: bands, no-data values and metadata.
VEXG_EXPORT void ChooseBands(RasterDef& def, const Array<unsigned>& order);

namespace detail {

/// Turns an array that has an entry for each band of the parent into one for the bands of the view,
/// in place. Where it lacks an entry for one of them, the view doesn't have the statistic: `bit` is
/// taken out of `mask`.
VEXG_EXPORT void PairsOfView(Array<double>& values, unsigned& mask, unsigned bit,
                             const Array<unsigned>& order);

/// Turns an array that has an entry for each band of the view into one for the `bands` bands of its
/// parent, in place. The entries of bands that the view doesn't show come from `known`, the
/// parent's own; where that lacks one, the parent doesn't get the statistic.
VEXG_EXPORT void PairsOfParent(Array<double>& values, unsigned& mask, unsigned bit,
                               const Array<unsigned>& order, const Array<double>& known,
                               unsigned bands);

}  // namespace detail

/// Translates the parent's statistics of a band into those of the view's band `band`.
template <typename T>
RasterBandStats<T> StatsOfView(RasterBandStats<T> stats, const Array<unsigned>& order,
                               unsigned band) {
  stats.band = band;
  detail::PairsOfView(stats.sumXY, stats.mask, StatsMask::SumXY, order);
  detail::PairsOfView(stats.cov, stats.mask, StatsMask::Cov, order);
  return stats;
}

/// Translates the view's statistics of a band into those of the parent's, of which it has `known`
/// already.
/// @param bands  of the parent.
template <typename T>
RasterBandStats<T> StatsOfParent(RasterBandStats<T> stats, const Array<unsigned>& order,
                                 const RasterBandStats<T>& known, unsigned bands) {
  const auto knownOf = [&](unsigned bit, const Array<double>& values) {
    return (known.mask & bit) != 0 ? values : Array<double>();
  };
  stats.band = BandIn(&order, stats.band);
  detail::PairsOfParent(stats.sumXY, stats.mask, StatsMask::SumXY, order,
                        knownOf(StatsMask::SumXY, known.sumXY), bands);
  detail::PairsOfParent(stats.cov, stats.mask, StatsMask::Cov, order,
                        knownOf(StatsMask::Cov, known.cov), bands);
  return stats;
}

}  // namespace lumo
