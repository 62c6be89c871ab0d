#pragma once

#include <cmath>
#include <span>

namespace lumo {

/// Below this range a window counts as even, and has no entropy.
inline constexpr double kEvenRange = 1e-9;

/// A bin's term of the entropy of a window: its count over `divisor`, times the logarithm of that.
inline double EntropyTerm(double count, double divisor) {
  return count > 0 ? count / divisor * std::log(count / divisor) : 0;
}

/// The entropy of the values of a window, from a histogram of three bins between its extremes: half
/// a range is the width of a bin, so that the third holds the maximum alone. Counts are divided by
/// the number of bins, not of values, so it is negative in most windows. 0 for an even window.
inline double WindowEntropy(std::span<const double> values, double min, double max) {
  constexpr unsigned kBins = 3;
  const double range = max - min;
  if (!(range > kEvenRange)) return 0;
  double counts[kBins] = {};
  for (const double value : values) {
    const double bin = std::floor((value - min) / (range / (kBins - 1)));
    if (bin >= 0 && bin < kBins) ++counts[static_cast<unsigned>(bin)];
  }
  double entropy = 0;
  for (const double count : counts) entropy -= EntropyTerm(count, kBins);
  return entropy;
}

}  // namespace lumo
