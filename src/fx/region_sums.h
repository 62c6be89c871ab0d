#pragma once

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <limits>
#include <type_traits>

#include "stats/exact_stats_accumulator.h"
#include "stats/plane_kernels.h"

// Sums of the pixels of a region in one band. Of integers they are exact; of other numbers they are
// doubles, of values that a shift keeps small, and run line after line through a strip.

namespace lumo {

/// Sums up the pixels of a region over several strips.
template <typename T>
using RegionTotal =
    std::conditional_t<kExactStats<T>, ExactStatsAccumulator<T>, LargeStatsAccumulator<T>>;

/// The same within a strip. Values that aren't finite do not count.
template <typename T, bool kExact = kExactStats<T>>
struct RegionSums;

template <typename T>
struct RegionSums<T, true> {
  // One square of 32 bits already fills 64.
  using Squares = std::conditional_t<sizeof(T) <= 2, std::uint64_t, UInt128>;

  std::int64_t sum = 0;
  Squares squares = 0;
  std::uint32_t count = 0;
  T min = std::numeric_limits<T>::max();
  T max = std::numeric_limits<T>::lowest();

  void Add(T value) {
    using Wide = std::conditional_t<std::is_signed_v<T>, std::int64_t, std::uint64_t>;
    const auto wide = static_cast<Wide>(value);
    sum += static_cast<std::int64_t>(wide);
    squares += static_cast<Squares>(static_cast<std::uint64_t>(wide * wide));
    min = std::min(min, value);
    max = std::max(max, value);
  }
  void AddCount(std::uint32_t pixels) { count += pixels; }

  RegionTotal<T> Total() const {
    RegionTotal<T> total;
    total.count = count;
    total.sum = sum;
    total.sum2 = squares;
    total.min = min;
    total.max = max;
    return total;
  }
};

template <typename T>
struct RegionSums<T, false> {
  double shift = 0;  // the first value
  double sum = 0;    // of v - shift
  double squares = 0;
  std::uint32_t count = 0;
  T min = std::numeric_limits<T>::max();
  T max = std::numeric_limits<T>::lowest();

  void Add(T value) {
    if (!std::isfinite(value)) return;
    if (count++ == 0) shift = static_cast<double>(value);
    const double difference = static_cast<double>(value) - shift;
    sum += difference;
    squares += difference * difference;
    min = std::min(min, value);
    max = std::max(max, value);
  }
  void AddCount(std::uint32_t /*pixels*/) {}

  RegionTotal<T> Total() const {
    RegionTotal<T> total;
    if (count == 0) return total;
    const auto n = static_cast<double>(count);
    total.count = count;
    total.mean = shift + sum / n;
    total.s = std::max(squares - sum * sum / n, 0.0);
    total.min = min;
    total.max = max;
    return total;
  }
};

/// The values of a region in one band.
struct SpectralValues {
  double count = 0;
  double mean = 0;
  double deviation = 0;  ///< divided by n
  double min = 0;
  double max = 0;
};

template <typename T>
SpectralValues ValuesOf(const RegionTotal<T>& total) {
  if (total.count == 0) return {};
  const auto n = static_cast<double>(total.count);
  SpectralValues values{n, 0, 0, static_cast<double>(total.min), static_cast<double>(total.max)};
  if constexpr (kExactStats<T> && sizeof(T) <= 2) {
    // All of it fits 64 bits: n * sum2 - sum^2 is n^2 times the variance.
    constexpr std::uint64_t kFew = 1U << 15;
    if (total.count < kFew) {
      const auto count = static_cast<std::int64_t>(total.count);
      const auto sum = static_cast<std::int64_t>(total.sum);
      const std::int64_t spread = count * static_cast<std::int64_t>(total.sum2) - sum * sum;
      values.mean = static_cast<double>(sum) / n;
      values.deviation = std::sqrt(static_cast<double>(spread)) / n;
      return values;
    }
  }
  const LargeStatsAccumulator<T> large = total.ToLarge();
  values.mean = large.mean;
  if (large.s > 0) values.deviation = std::sqrt(large.s / n);
  return values;
}

/// Sums up the windows round the pixels of a region in one band.
struct TextureSums {
  enum : unsigned { kRange, kMean, kVariance, kEntropy, kEntropyOverN, kFigures };
  double sums[kFigures] = {};
  std::uint64_t count = 0;

  void Merge(const TextureSums& other) {
    for (unsigned i = 0; i < kFigures; ++i) sums[i] += other.sums[i];
    count += other.count;
  }
};

}  // namespace lumo
