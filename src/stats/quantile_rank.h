#pragma once

#include <cmath>
#include <cstdint>

namespace lumo {

/// The place of a percentile among values in their order: `part` of the way from the value at the
/// rank to the next one. Ranks count from 0; the rank is (count - 1) * percent / 100, as in
/// Hyndman and Fan, Sample quantiles in statistical packages, 1996, definition 7.
///
///     const QuantileRank median(values.size(), 50);
///     const double value = median.Between(values[median.rank], values[median.NextRank()]);
struct QuantileRank {
  /// @param count    of the values, 1 or more. @param percent  0 to 100.
  QuantileRank(double count, double percent) {
    const double exact = (count - 1) * percent / 100;
    rank = static_cast<std::uint64_t>(exact);
    part = exact - std::floor(exact);
  }

  /// The rank of the second value; the first one again where the percentile is a value itself.
  std::uint64_t NextRank() const { return part == 0 ? rank : rank + 1; }

  /// The percentile.
  /// @param lower,upper  the values at both ranks.
  double Between(double lower, double upper) const {
    return part == 0 ? lower : lower + part * (upper - lower);
  }

  std::uint64_t rank = 0;
  double part = 0;  ///< 0 or more, below 1
};

}  // namespace lumo
