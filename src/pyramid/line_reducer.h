#pragma once

#include <array>
#include <cmath>
#include <complex>
#include <vector>

#include "raster/level_reduction.h"
#include "raster/pixel_mode.h"
#include "raster/raster_enums.h"

namespace lumo::detail {

/// The type that pixels are added up in: exact for integers of 32 bits, for those of 64 with all
/// digits of one.
template <typename T>
using LevelSum =
    std::conditional_t<std::is_floating_point_v<T>, double,
                       std::conditional_t<!std::is_integral_v<T>, std::complex<double>,
                                          std::conditional_t<sizeof(T) == 8, long double, double>>>;

template <typename T>
LevelSum<T> SumOf(const T& value) {
  if constexpr (std::is_arithmetic_v<T>) {
    return static_cast<LevelSum<T>>(value);
  } else {
    return {static_cast<double>(value.real), static_cast<double>(value.imag)};
  }
}

template <typename T>
T MeanOf(const LevelSum<T>& sum, double count) {
  if constexpr (std::is_integral_v<T>) {
    return static_cast<T>(std::floor(sum / count + LevelSum<T>(0.5)));
  } else if constexpr (std::is_floating_point_v<T>) {
    return static_cast<T>(sum / count);
  } else {
    T mean{};
    mean.real = static_cast<decltype(mean.real)>(sum.real() / count);
    mean.imag = static_cast<decltype(mean.imag)>(sum.imag() / count);
    return mean;
  }
}

template <typename T>
bool IsCounted(const T& value, unsigned char state) {
  return IsValidState(state) && (value == value);  // NaN differs from itself
}

/// A line of the raster.
template <typename T>
struct SourceLine {
  const T* values;
  const unsigned char* states;

  const T& Value(std::size_t i) const { return values[i]; }
  unsigned char State(std::size_t i) const { return states[i]; }
  double Count(std::size_t i) const { return IsCounted(values[i], states[i]) ? 1 : 0; }
  LevelSum<T> Sum(std::size_t i) const {
    return IsCounted(values[i], states[i]) ? SumOf(values[i]) : LevelSum<T>();
  }
};

/// A line of a level in the making.
template <typename T>
struct LevelLine {
  std::vector<T> values;              ///< the first valid pixel below, else the first; or the mode
  std::vector<unsigned char> states;  ///< of that
  std::vector<double> counts;         ///< of valid pixels of the raster
  std::vector<LevelSum<T>> sums;      ///< of those

  void Resize(std::size_t size) {
    values.resize(size), states.resize(size), counts.resize(size), sums.resize(size);
  }
  const T& Value(std::size_t i) const { return values[i]; }
  unsigned char State(std::size_t i) const { return states[i]; }
  double Count(std::size_t i) const { return counts[i]; }
  LevelSum<T> Sum(std::size_t i) const { return sums[i]; }
};

/// Makes the lines of one level, each out of two of the level below. Told: of every second pixel of
/// every second line.
template <typename T>
class LineReducer {
 public:
  LineReducer(unsigned width, unsigned bands, LevelReduction reduction)
      : bands_(bands), size_(std::size_t{width} * bands), reduction_(reduction) {
    line_.Resize(size_);
    if (reduction == LevelReduction::kMode) upper_.Resize(2 * size_);
  }

  /// Takes a line of the level below. @return true when a line of this level is whole.
  template <typename Below>
  bool Take(const Below& below) {
    isOdd_ = !isOdd_;
    if (reduction_ == LevelReduction::kMode) {
      isOdd_ ? Keep(below) : TakeMode(below);
    } else if (reduction_ == LevelReduction::kAverage) {
      isOdd_ ? Add<true>(below) : Add<false>(below);
    } else if (isOdd_) {
      Pick(below);
    }
    return !isOdd_;
  }

  const LevelLine<T>& Line() const { return line_; }

 private:
  template <bool kIsUpper, typename Below>
  void Add(const Below& below) {
    for (std::size_t i = 0, at = 0; i < size_; at += bands_) {
      for (unsigned band = 0; band < bands_; ++band, ++i, ++at) {
        const std::size_t next = at + bands_;
        const double first = below.Count(at), second = below.Count(next);
        const double before = kIsUpper ? 0 : line_.counts[i];
        if (kIsUpper || (before == 0 && first + second != 0)) {
          const std::size_t chosen = first == 0 && second != 0 ? next : at;
          line_.values[i] = below.Value(chosen);
          line_.states[i] = below.State(chosen);
        }
        line_.counts[i] = before + first + second;
        const LevelSum<T> sum = below.Sum(at) + below.Sum(next);
        line_.sums[i] = kIsUpper ? sum : line_.sums[i] + sum;
      }
    }
  }

  template <typename Below>
  void Pick(const Below& below) {
    for (std::size_t i = 0, at = 0; i < size_; at += bands_) {
      for (unsigned band = 0; band < bands_; ++band, ++i, ++at) {
        line_.values[i] = below.Value(at);
        line_.states[i] = below.State(at);
      }
    }
  }

  template <typename Below>
  void Keep(const Below& below) {
    for (std::size_t i = 0; i < 2 * size_; ++i) {
      upper_.values[i] = below.Value(i);
      upper_.states[i] = below.State(i);
      upper_.counts[i] = below.Count(i);
    }
  }

  template <typename Below>
  void TakeMode(const Below& lower) {
    std::array<T, 4> counted{};
    for (std::size_t i = 0, at = 0; i < size_; at += bands_) {
      for (unsigned band = 0; band < bands_; ++band, ++i, ++at) {
        unsigned count = 0;
        unsigned char state = 0;
        const auto take = [&](const auto& line, std::size_t from) {
          if (line.Count(from) == 0) return;
          if (count == 0) state = line.State(from);
          counted[count++] = line.Value(from);
        };
        take(upper_, at), take(upper_, at + bands_), take(lower, at), take(lower, at + bands_);
        line_.counts[i] = count;
        line_.values[i] = count != 0 ? ModeOf(counted, count) : upper_.Value(at);
        line_.states[i] = count != 0 ? state : upper_.State(at);
      }
    }
  }

  const unsigned bands_;
  const std::size_t size_;  // values of a line
  const LevelReduction reduction_;
  bool isOdd_ = false;  // of two lines one has come
  LevelLine<T> line_;
  LevelLine<T> upper_;  // of the level below, for modes
};

}  // namespace lumo::detail
