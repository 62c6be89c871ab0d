#pragma once

#include <cmath>
#include <cstddef>
#include <limits>
#include <optional>
#include <vector>

#include "raster/pixel_types.h"
#include "raster/raster_enums.h"

namespace lumo {

/// The number nearest to a value that a pixel of type T can hold.
template <typename T>
T NearestPixel(double value) {
  if constexpr (std::is_floating_point_v<T>) {
    constexpr double kMost = std::numeric_limits<T>::max();
    return static_cast<T>(value < -kMost ? -kMost : value > kMost ? kMost : value);
  } else {
    constexpr double kLeast = std::numeric_limits<T>::min(), kMost = std::numeric_limits<T>::max();
    const double rounded = std::floor(value + 0.5);
    return static_cast<T>(!(rounded > kLeast) ? kLeast : rounded > kMost ? kMost : rounded);
  }
}

/// A value beside one that pixels may not have, on the side where another value lies.
template <typename T>
T BesideNoData(T noData, double towards) {
  const bool up =
      (towards > static_cast<double>(noData) && noData != std::numeric_limits<T>::max()) ||
      noData == std::numeric_limits<T>::lowest();
  if constexpr (std::is_floating_point_v<T>) {
    constexpr T kFar = std::numeric_limits<T>::max();
    return std::nextafter(noData, up ? kFar : -kFar);
  } else {
    return static_cast<T>(up ? noData + 1 : noData - 1);
  }
}

/// Turns the values of a band of a scene into those of the reference: by the table of a histogram
/// matching, whose bin k stands for the values from minimum + k * size on.
///
/// Types of up to 16 bits have a bin for each value. Of wider ones a value between the beginnings
/// of two bins gets what lies between both entries, so that no bands show. Values outside the range
/// of the histogram go on by the table's mean gain.
template <typename T>
class ColourTable {
 public:
  /// A table that leaves values as they are.
  ColourTable() = default;
  /// @param minimum,maximum  of the histogram.
  /// @param size             of its bins.
  /// @param entries          one for each bin; none leaves values as they are.
  /// @param noData           a value that no pixel may get.
  ColourTable(double minimum, double maximum, double size, std::vector<double> entries,
              std::optional<T> noData);

  bool IsIdentity() const { return entries_.empty() && byValue_.empty(); }
  /// Turns `count` values that lie `stride` apart; those whose state isn't valid stay.
  void Apply(T* values, const unsigned char* states, std::size_t count, std::size_t stride) const;

 private:
  static constexpr bool kIsNarrow = sizeof(T) <= 2;

  double Find(double value) const;
  T Turn(T value) const;

  double minimum_ = 0, maximum_ = 0, size_ = 1, gain_ = 1;
  std::vector<double> entries_;
  std::optional<T> noData_;
  std::vector<T> byValue_;  // of a narrow type, from its lowest value on
};

template <typename T>
ColourTable<T>::ColourTable(double minimum, double maximum, double size,
                            std::vector<double> entries, std::optional<T> noData)
    : minimum_(minimum),
      maximum_(maximum),
      size_(size > 0 ? size : 1),
      entries_(std::move(entries)),
      noData_(noData) {
  if (entries_.empty()) return;
  if (maximum_ > minimum_) gain_ = (entries_.back() - entries_.front()) / (maximum_ - minimum_);
  if constexpr (kIsNarrow) {
    constexpr int kLowest = std::numeric_limits<T>::lowest(), kMost = std::numeric_limits<T>::max();
    byValue_.reserve(kMost - kLowest + 1);
    for (int value = kLowest; value <= kMost; ++value) {
      byValue_.push_back(Turn(static_cast<T>(value)));
    }
    entries_ = {};
  }
}

template <typename T>
double ColourTable<T>::Find(double value) const {
  if (!(value >= minimum_)) return entries_.front() + (value - minimum_) * gain_;
  if (value > maximum_) return entries_.back() + (value - maximum_) * gain_;
  const double at = (value - minimum_) / size_;
  const double last = static_cast<double>(entries_.size() - 1);
  if (!(at < last)) return entries_.back();
  const auto bin = static_cast<std::size_t>(at);
  const double part = at - static_cast<double>(bin);
  return part == 0 ? entries_[bin] : entries_[bin] * (1 - part) + entries_[bin + 1] * part;
}

template <typename T>
T ColourTable<T>::Turn(T value) const {
  if constexpr (std::is_floating_point_v<T>) {
    if (!std::isfinite(value)) return value;
  }
  if (noData_ && value == *noData_) return value;
  const T turned = NearestPixel<T>(Find(static_cast<double>(value)));
  return noData_ && turned == *noData_ ? BesideNoData(turned, static_cast<double>(value)) : turned;
}

template <typename T>
void ColourTable<T>::Apply(T* values, const unsigned char* states, std::size_t count,
                           std::size_t stride) const {
  if (IsIdentity()) return;
  for (std::size_t i = 0; i < count; ++i) {
    T& value = values[i * stride];
    if (!IsValidState(states[i * stride])) continue;
    if constexpr (kIsNarrow) {
      value =
          byValue_[static_cast<std::size_t>(int{value} - int{std::numeric_limits<T>::lowest()})];
    } else {
      value = Turn(value);
    }
  }
}

}  // namespace lumo
