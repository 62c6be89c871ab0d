#pragma once

#include "raster/raster_enums.h"
#include "regions/value_counter.h"
#include "regions/zonal_figures.h"
#include "stats/quantile_rank.h"

namespace lumo {

/// Pixels of one line and band that lie side by side in a zone.
template <typename T>
struct ZoneRun {
  const T* pixels;              ///< the first one
  const unsigned char* states;  ///< its state
  std::size_t step;             ///< elements between neighbours
  std::size_t count;            ///< pixels
};

/// Gathers the values of one band in one zone. Pixels that are not valid, and NaN, do not count.
///
///     ZoneValues<float> zone;
///     zone.Add({pixels, states, 1, count}, false);
///     const double mean = zone.Get({ZonalFigure::kMean, 0, "mean"}, false);
///
/// Cost: a few numbers, beside a ValueCounter where the values themselves are wanted.
/// Threads: one at a time.
template <typename T>
class ZoneValues {
 public:
  /// Adds pixels of weight 1.
  /// @param withValues  keep the values too, which median, percentiles, majority, minority and
  ///                    variety need.
  void Add(const ZoneRun<T>& run, bool withValues);
  /// Adds pixels with their weights, `run.count` of them.
  void AddWeighted(const ZoneRun<T>& run, const double* weights, bool withValues);

  /// A figure of the values that were added; NaN where there is none. The median and percentiles of
  /// pixels of weight 1 lie between the values at the two ranks next to (n - 1) p / 100 (Hyndman
  /// and Fan, Sample quantiles in statistical packages, 1996, definition 7). With other weights
  /// they are the least value up to which p / 100 of all weight lies. The deviation has the divisor
  /// n - 1, and with other weights their sum. Of values as frequent as one another the least is
  /// given.
  double Get(const ZonalRequest& request, bool isWeighted);

 private:
  void AddOne(T value, double weight);
  void AddIntegers(const ZoneRun<T>& run);
  double Deviation(bool isWeighted) const;
  double Quantile(double percent, bool isWeighted);
  double MostFrequent(double sign);

  double weight_ = 0;
  double shift_ = 0;    // the first value, from which the sums count
  double sum_ = 0;      // of weight times difference
  double squares_ = 0;  // of weight times squared difference
  T min_ = std::numeric_limits<T>::max();
  T max_ = std::numeric_limits<T>::lowest();
  bool isEmpty_ = true;
  ValueCounter<T> values_;
};

template <typename T>
void ZoneValues<T>::AddOne(T value, double weight) {
  if (isEmpty_) {
    shift_ = static_cast<double>(value);
    min_ = max_ = value;
  }
  isEmpty_ = false;
  const double difference = static_cast<double>(value) - shift_;
  weight_ += weight;
  sum_ += weight * difference;
  squares_ += weight * difference * difference;
  min_ = std::min(min_, value);
  max_ = std::max(max_, value);
}

/// Adds short integers that all count: their sums are exact, in any order.
template <typename T>
void ZoneValues<T>::AddIntegers(const ZoneRun<T>& run) {
  if (isEmpty_) shift_ = static_cast<double>(run.pixels[0]);
  isEmpty_ = false;
  const auto shift = static_cast<std::int32_t>(shift_);
  std::int64_t sum = 0;
  std::int64_t squares = 0;
  T least = min_, most = max_;
  for (std::size_t i = 0; i < run.count; ++i) {
    const T value = run.pixels[i * run.step];
    const std::int64_t difference = std::int32_t{value} - shift;
    sum += difference;
    squares += difference * difference;
    least = std::min(least, value);
    most = std::max(most, value);
  }
  weight_ += static_cast<double>(run.count);
  sum_ += static_cast<double>(sum);
  squares_ += static_cast<double>(squares);
  min_ = least;
  max_ = most;
}

template <typename T>
void ZoneValues<T>::Add(const ZoneRun<T>& run, bool withValues) {
  unsigned char any = 0;
  for (std::size_t i = 0; i < run.count; ++i) any |= run.states[i * run.step];
  const bool countAll = (any & PixelValueState::NotValid) == 0;
  if constexpr (std::is_integral_v<T> && sizeof(T) <= 2) {
    if (countAll && !withValues) return AddIntegers(run);
  }
  for (std::size_t i = 0; i < run.count; ++i) {
    const T value = run.pixels[i * run.step];
    if (!countAll && (run.states[i * run.step] & PixelValueState::NotValid) != 0) continue;
    if (value != value) continue;
    AddOne(value, 1);
    if (withValues) values_.Add(value, 1);
  }
}

template <typename T>
void ZoneValues<T>::AddWeighted(const ZoneRun<T>& run, const double* weights, bool withValues) {
  for (std::size_t i = 0; i < run.count; ++i) {
    const T value = run.pixels[i * run.step];
    const bool counts = weights[i] > 0 && value == value &&
                        (run.states[i * run.step] & PixelValueState::NotValid) == 0;
    if (!counts) continue;
    AddOne(value, weights[i]);
    if (withValues) values_.Add(value, weights[i]);
  }
}

template <typename T>
double ZoneValues<T>::Deviation(bool isWeighted) const {
  const double divisor = isWeighted ? weight_ : weight_ - 1;
  if (!(divisor > 0)) return std::nan("");
  return std::sqrt(std::max(0.0, (squares_ - sum_ * sum_ / weight_) / divisor));
}

template <typename T>
double ZoneValues<T>::Quantile(double percent, bool isWeighted) {
  const auto& entries = values_.GetEntries();
  if (entries.empty()) return std::nan("");
  const QuantileRank place(isWeighted ? 1 : weight_, percent);
  const double wanted =
      isWeighted ? weight_ * percent / 100 * (1 - 1e-12) : static_cast<double>(place.rank) + 1;
  double below = 0;
  std::size_t i = 0;
  while (i + 1 < entries.size() && below + entries[i].weight < wanted) below += entries[i++].weight;
  const bool isLastOfItsValue = below + entries[i].weight < wanted + 1;
  const std::size_t next = isLastOfItsValue && i + 1 < entries.size() ? i + 1 : i;
  return place.Between(static_cast<double>(entries[i].value),
                       static_cast<double>(entries[next].value));
}

/// The least of the values of the greatest weight; of the smallest where `sign` is -1.
template <typename T>
double ZoneValues<T>::MostFrequent(double sign) {
  const auto& entries = values_.GetEntries();
  if (entries.empty()) return std::nan("");
  const auto found = std::max_element(
      entries.begin(), entries.end(),
      [&](const auto& a, const auto& b) { return sign * a.weight < sign * b.weight; });
  return static_cast<double>(found->value);
}

template <typename T>
double ZoneValues<T>::Get(const ZonalRequest& request, bool isWeighted) {
  if (request.figure == ZonalFigure::kCount) return weight_;
  if (request.figure == ZonalFigure::kVariety) {
    return static_cast<double>(values_.GetEntries().size());
  }
  if (isEmpty_) return std::nan("");
  switch (request.figure) {
    case ZonalFigure::kMin:
      return static_cast<double>(min_);
    case ZonalFigure::kMax:
      return static_cast<double>(max_);
    case ZonalFigure::kMean:
      return shift_ + sum_ / weight_;
    case ZonalFigure::kStd:
      return Deviation(isWeighted);
    case ZonalFigure::kSum:
      return shift_ * weight_ + sum_;
    case ZonalFigure::kMedian:
      return Quantile(50, isWeighted);
    case ZonalFigure::kPercentile:
      return Quantile(request.percent, isWeighted);
    case ZonalFigure::kMajority:
      return MostFrequent(1);
    case ZonalFigure::kMinority:
      return MostFrequent(-1);
    default:
      return std::nan("");
  }
}

}  // namespace lumo
