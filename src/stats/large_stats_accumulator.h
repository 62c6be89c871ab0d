#pragma once

#include <algorithm>
#include <cstdint>
#include <limits>

namespace lumo {

/// The running statistics of one band: a numerically stable form that takes one sample at a time
/// (Welford, Note on a method for calculating corrected sums of squares and products, Technometrics
/// 4, 1962), and merges with another by the pairwise formulas (Chan, Golub, LeVeque, Updating
/// formulae and a pairwise algorithm for computing sample variances, 1979). Samples have to be
/// finite.
///
///     LargeStatsAccumulator<float> band;
///     for (const float value : values) band.Add(value);
///     const double variance = band.s / (band.count - 1);
template <typename T>
struct LargeStatsAccumulator {
  std::uint64_t count = 0;
  double oldMean = 0;  ///< before the last sample
  double mean = 0;
  double oldS = 0;       ///< likewise
  double s = 0;          ///< sum of the squared differences from the mean
  double oldMeanSq = 0;  ///< likewise
  double meanSq = 0;     ///< mean of the squares
  double sum = 0;
  double sum2 = 0;  ///< sum of the squares
  T min = std::numeric_limits<T>::max();
  T max = std::numeric_limits<T>::lowest();

  /// Takes in one finite sample.
  void Add(T sample) {
    const auto v = static_cast<double>(sample);
    const double q = v * v;
    const auto n = static_cast<double>(++count);
    if (count == 1) {
      mean = v;
      s = 0;
      meanSq = q;
    } else {
      oldMean = mean;
      oldS = s;
      oldMeanSq = meanSq;
      mean = (v - oldMean) / n + oldMean;
      s = (v - mean) * (v - oldMean) + oldS;
      meanSq = (q - oldMeanSq) / n + oldMeanSq;
    }
    sum += v;
    sum2 += q;
    min = std::min(min, sample);
    max = std::max(max, sample);
  }

  /// Takes in what another one has seen. No sample is to be added afterwards.
  void Merge(const LargeStatsAccumulator& other) {
    if (other.count == 0) return;
    if (count == 0) {
      *this = other;
      return;
    }
    const auto n1 = static_cast<double>(count);
    const auto n2 = static_cast<double>(other.count);
    const double n = n1 + n2;
    const double d = other.mean - mean;
    mean = (mean * n1 + other.mean * n2) / n;
    s = d * d * n1 * n2 / n + other.s + s;
    meanSq = (n2 * other.meanSq + n1 * meanSq) / n;
    sum += other.sum;
    sum2 += other.sum2;
    min = std::min(min, other.min);
    max = std::max(max, other.max);
    count += other.count;
  }

  /// Calls `visit(number)` for each number that a merge takes in.
  template <typename Visit>
  void ForEachNumber(const Visit& visit) {
    visit(count), visit(mean), visit(s), visit(meanSq), visit(sum), visit(sum2);
    visit(min), visit(max);
  }

  /// The running form, as ExactStatsAccumulator has it too.
  const LargeStatsAccumulator& ToLarge() const { return *this; }
};

/// The running statistics of a pair of bands x and y: those of x, and the sums over both.
template <typename T>
struct LargeStatsAccumulator2 : LargeStatsAccumulator<T> {
  double oldMeanY = 0;
  double meanY = 0;
  double oldC = 0;
  double c = 0;  ///< sum of the products of the differences from both means
  double sumXY = 0;

  /// Takes in one pixel that is valid in both bands.
  void Add(T sampleX, T sampleY) {
    LargeStatsAccumulator<T>::Add(sampleX);
    const auto x = static_cast<double>(sampleX);
    const auto y = static_cast<double>(sampleY);
    if (this->count == 1) {
      meanY = y;
      c = 0;
    } else {
      oldMeanY = meanY;
      oldC = c;
      meanY = (y - oldMeanY) / static_cast<double>(this->count) + oldMeanY;
      c = (y - meanY) * (x - this->oldMean) + oldC;
    }
    sumXY += y * x;
  }

  /// Takes in what another one has seen. No sample is to be added afterwards.
  void Merge(const LargeStatsAccumulator2& other) {
    if (other.count == 0) return;
    if (this->count == 0) {
      *this = other;
      return;
    }
    const auto n1 = static_cast<double>(this->count);
    const auto n2 = static_cast<double>(other.count);
    const double n = n1 + n2;
    c = (other.meanY - meanY) * (other.mean - this->mean) * n1 * n2 / n + other.c + c;
    meanY = (meanY * n1 + other.meanY * n2) / n;
    sumXY += other.sumXY;
    LargeStatsAccumulator<T>::Merge(other);
  }

  /// Calls `visit(number)` for each number that a merge takes in.
  template <typename Visit>
  void ForEachNumber(const Visit& visit) {
    LargeStatsAccumulator<T>::ForEachNumber(visit);
    visit(meanY), visit(c), visit(sumXY);
  }

  /// Sum of the products x * y.
  double SumXY() const { return sumXY; }
  /// Sum of the products of the differences from both means, which n - 1 divides to the covariance.
  double C() const { return c; }
};

}  // namespace lumo
