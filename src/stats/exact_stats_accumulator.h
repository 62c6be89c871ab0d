#pragma once

#include "stats/large_stats_accumulator.h"

// Statistics of integers from exact sums. They have the same bits however the samples are divided
// among accumulators.

namespace lumo {

__extension__ using Int128 = __int128;
__extension__ using UInt128 = unsigned __int128;

/// The statistics of one band of integers of up to 32 bits. Takes 2^63 samples.
template <typename T>
struct ExactStatsAccumulator {
  std::uint64_t count = 0;  ///< samples
  Int128 sum = 0;
  UInt128 sum2 = 0;  ///< sum of the squares
  T min = std::numeric_limits<T>::max();
  T max = std::numeric_limits<T>::lowest();

  /// Takes in what another one has seen, in any order.
  void Merge(const ExactStatsAccumulator& other) {
    count += other.count;
    sum += other.sum;
    sum2 += other.sum2;
    min = std::min(min, other.min);
    max = std::max(max, other.max);
  }

  /// Calls `visit(number)` for each number that a merge takes in.
  template <typename Visit>
  void ForEachNumber(const Visit& visit) {
    visit(count), visit(sum), visit(sum2), visit(min), visit(max);
  }

  /// The same in the running form's terms, each with one or two roundings.
  LargeStatsAccumulator<T> ToLarge() const {
    LargeStatsAccumulator<T> large;
    if (count == 0) return large;
    // Around the integer m next to the mean, sums of squares are small and exact: they fit 128
    // bits, though steps on the way may wrap. The rest r is at most n/2, and the squares add up to
    // |r| at least, so that r * r / n takes away no more than half of them.
    const auto n = static_cast<Int128>(count);
    Int128 m = sum / n;
    Int128 rest = sum - m * n;
    if (2 * rest > n) ++m;
    if (2 * rest < -n) --m;
    rest = sum - m * n;
    const UInt128 squares =
        sum2 - 2 * static_cast<UInt128>(m) * static_cast<UInt128>(sum) +
        static_cast<UInt128>(m) * static_cast<UInt128>(m) * static_cast<UInt128>(n);
    const auto r = static_cast<double>(rest);
    const auto samples = static_cast<double>(count);
    large.count = count;
    large.sum = static_cast<double>(sum);
    large.sum2 = static_cast<double>(sum2);
    large.mean = static_cast<double>(m) + r / samples;
    large.s = static_cast<double>(squares) - r * r / samples;
    large.meanSq = large.sum2 / samples;
    large.min = min;
    large.max = max;
    return large;
  }
};

/// Sums over a pair of bands of integers of up to 16 bits. Takes 2^46 samples.
struct ExactPairAccumulator {
  std::uint64_t count = 0;  ///< pixels that are valid in both bands
  std::int64_t sumX = 0;
  std::int64_t sumY = 0;
  Int128 products = 0;  ///< sum of x * y

  /// Takes in what another one has seen, in any order.
  void Merge(const ExactPairAccumulator& other) {
    count += other.count;
    sumX += other.sumX;
    sumY += other.sumY;
    products += other.products;
  }
  /// Calls `visit(number)` for each number that a merge takes in.
  template <typename Visit>
  void ForEachNumber(const Visit& visit) {
    visit(count), visit(sumX), visit(sumY), visit(products);
  }
  /// Sum of the products x * y, rounded once.
  double SumXY() const { return static_cast<double>(products); }
  /// Sum of the products of the differences from both means, which n - 1 divides to the covariance.
  /// Needs a sample.
  double C() const {
    // With 2^46 samples both products fit 128 bits.
    const auto n = static_cast<Int128>(count);
    return static_cast<double>(n * products - Int128{sumX} * sumY) / static_cast<double>(count);
  }
};

}  // namespace lumo
