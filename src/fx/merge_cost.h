#pragma once

#include <cmath>
#include <cstdint>
#include <limits>

namespace lumo {

/// Limits how segments grow.
struct GrowthLimits {
  /// The pixels of a segment at most: a pair that has more together is not merged.
  double mostPixels = std::numeric_limits<double>::infinity();
  /// A cost is divided by l to the power of this besides, l the length of the common boundary:
  /// above 0, segments with much common boundary merge earlier, which makes them more compact.
  double compactness = 0;
};

/// A pair of this cost or more is never merged.
inline constexpr double kMergeCostLimit = 2147483647.0;

/// A segment as its cost sees it.
struct MergeSide {
  double pixels = 0;
  const double* means = nullptr;  ///< of its bands
};

/// The cost of joining two segments: for ones of a and b pixels with mean band vectors u and v and
/// a common boundary of l pixel edges a b / (a + b) * |u - v|^2 / l (Robinson, Redding and Crisp,
/// Implementation of a fast algorithm for segmenting SAR imagery, 2002); 0 if a, b or l is.
inline double MergeCost(const MergeSide& one, const MergeSide& other, std::uint32_t bands,
                        std::uint32_t length, const GrowthLimits& limits) {
  const double a = one.pixels, b = other.pixels;
  if (a == 0 || b == 0 || length == 0) return 0;
  if (a + b > limits.mostPixels) return std::numeric_limits<double>::infinity();
  double sum = 0;
  for (std::uint32_t band = 0; band < bands; ++band) {
    const double difference = one.means[band] - other.means[band];
    sum += difference * difference;
  }
  const double cost = a * b / (a + b) * sum / length;
  return limits.compactness == 0 ? cost : cost / std::pow(length, limits.compactness);
}

/// The mean of a band of two segments that become one.
inline double JoinedMean(double a, double u, double b, double v) {
  return a + b != 0 ? b / (a + b) * v + a / (a + b) * u : 0;
}

}  // namespace lumo
