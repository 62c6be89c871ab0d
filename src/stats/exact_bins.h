#pragma once

#include <algorithm>
#include <cmath>
#include <limits>
#include <type_traits>

#include "stats/exact_stats_accumulator.h"

// The number and the size of the bins of the exact form.

namespace lumo::detail {

/// The number of integers from `lower` to `upper`, both counted; below 1 when `upper` is smaller.
template <typename T>
Int128 ValuesBetween(T lower, T upper) {
  return static_cast<Int128>(upper) - static_cast<Int128>(lower) + 1;
}

/// The size of `count` bins that share the values from `lower` to `upper`. An integer v stands for
/// all from v to v + 1. It is above 0; 1 for equal bounds of a floating-point type.
/// @param count  1 or more.
template <typename T>
double ExactBinSize(T lower, T upper, unsigned count) {
  if constexpr (std::is_integral_v<T>) {
    return static_cast<double>(ValuesBetween(lower, upper)) / count;
  } else {
    if (!(lower < upper)) return 1.0;
    const double low = static_cast<double>(lower), high = static_cast<double>(upper);
    double size = (high - low) / count;
    if (!std::isfinite(size)) size = high / count - low / count;
    return std::max(size, std::numeric_limits<double>::denorm_min());
  }
}

/// The number of bins of a size that hold the values from `lower` to `upper`; `most` + 1 for more
/// than `most`.
/// @param size  above 0, in pixel values.
template <typename T>
unsigned ExactBinCount(T lower, T upper, double size, unsigned most) {
  const double low = static_cast<double>(lower), high = static_cast<double>(upper);
  double count = 0;
  if constexpr (std::is_integral_v<T>) {
    count = std::floor(static_cast<double>(ValuesBetween(lower, upper) - 1) / size) + 1;
  } else {
    // The last bin begins below the upper bound and ends at it or above.
    count = std::max(std::ceil((high - low) / size), 1.0);
    if (count > 1 && low + (count - 1) * size >= high) count -= 1;
    if (low + count * size < high) count += 1;
  }
  return count <= most ? static_cast<unsigned>(count)
                       : most + 1;  // and there is no memory for that
}

}  // namespace lumo::detail
