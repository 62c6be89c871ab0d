#pragma once

#include "stats/raster_stats.h"

namespace lumo {

/// Statistics with the products and covariances between bands, which count the pixels that are
/// valid in both. Exists for TenTypes. Those of integers of up to 16 bits come from exact sums. Its
/// cost grows with the square of the bands, in time and in memory.
template <typename T>
class ExtendedRasterStats : public RasterStats<T> {
 public:
  static const unsigned TypeCode;

  explicit ExtendedRasterStats(unsigned bandCount = 0) { Reset(bandCount); }

  bool IsA(unsigned typeCode) const override {
    return typeCode == TypeCode || RasterStats<T>::IsA(typeCode);
  }
  bool IsValid() const override { return pairs_.IsValid() && RasterStats<T>::IsValid(); }

  // As those of RasterStats.
  void Reset(unsigned bandCount);
  bool Accumulate(const Tile<T>& tile, unsigned rowFrom, unsigned rowTo, unsigned columnFrom,
                  unsigned columnTo);
  bool Merge(const ExtendedRasterStats& other);
  void Save(ShareWriter& out) const;
  bool Restore(ShareReader& in);
  bool Finish();

  /// Sums of the products, bands by bands, symmetric; empty before Finish.
  const Array<double>& SumXY() const { return sumXY_; }
  /// Covariances of a sample, divided by n - 1, in the same shape; 0 for fewer than two pixels. On
  /// the diagonal stand the variances.
  const Array<double>& Cov() const { return cov_; }

 private:
  using PairAccumulator = std::conditional_t<std::is_integral_v<T> && sizeof(T) <= 2,
                                             ExactPairAccumulator, LargeStatsAccumulator2<T>>;
  class PairSums;

  Array<PairAccumulator> pairs_;  // bands by bands; those above the diagonal are used
  Array<double> sumXY_;
  Array<double> cov_;
};

template <typename T>
using ExtendedRasterStatsPtr = Pointer<ExtendedRasterStats<T>>;

VEXG_EXTERN(TEN, ExtendedRasterStats);

}  // namespace lumo
