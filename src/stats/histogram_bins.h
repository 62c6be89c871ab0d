#pragma once

#include <cstddef>
#include <cstdint>
#include <type_traits>

namespace lumo {

/// The bins of one band, and which values count.
template <typename T>
struct HistogramBins {
  T lower{};  ///< of the values that count, both inclusive: within the bounds, and of the sign
  T upper{};
  T min{};                      ///< where the first bin begins
  double size = 1;              ///< of a bin; of integers a whole number, unless it is below 1
  std::uint64_t wholeSize = 1;  ///< of integers, where it isn't below 1
  std::uint32_t count = 0;      ///< of bins, below 2^31

  /// The bin of a value; `count` for one that doesn't count.
  [[gnu::always_inline]] std::uint32_t Find(T value) const {
    if constexpr (std::is_integral_v<T> && sizeof(T) == 8) {
      if (value < lower || value > upper) return count;
      const std::uint64_t above =
          static_cast<std::uint64_t>(value) - static_cast<std::uint64_t>(min);
      if (size < 1) {
        const double bin = static_cast<double>(above) / size;
        return bin < count ? static_cast<std::uint32_t>(bin) : count;
      }
      const std::uint64_t bin = wholeSize == 1 ? above : above / wholeSize;
      return bin < count ? static_cast<std::uint32_t>(bin) : count;
    } else {
      // As doubles throughout, which hold the values of all other types, and without a branch. A
      // quotient of 32-bit integers never rounds up to the next whole number.
      const auto v = static_cast<double>(value);
      double above = v - static_cast<double>(min);
      if constexpr (std::is_floating_point_v<T>) above = static_cast<double>(value - min);
      const double most = count;
      const double tooLow = v >= static_cast<double>(lower) ? 0.0 : most;
      const double tooHigh = v <= static_cast<double>(upper) ? 0.0 : most;
      double bin = above / size;
      bin = bin < most ? bin : most;
      bin = bin > tooLow ? bin : tooLow;
      bin = bin > tooHigh ? bin : tooHigh;
      return static_cast<std::uint32_t>(static_cast<std::int32_t>(bin));
    }
  }
};

/// Finds the bins of many values.
void FindBins(const HistogramBins<std::uint8_t>& bins, const std::uint8_t* values,
              std::size_t count, std::uint32_t* out);
void FindBins(const HistogramBins<std::int8_t>& bins, const std::int8_t* values, std::size_t count,
              std::uint32_t* out);
void FindBins(const HistogramBins<std::uint16_t>& bins, const std::uint16_t* values,
              std::size_t count, std::uint32_t* out);
void FindBins(const HistogramBins<std::int16_t>& bins, const std::int16_t* values,
              std::size_t count, std::uint32_t* out);
void FindBins(const HistogramBins<std::uint32_t>& bins, const std::uint32_t* values,
              std::size_t count, std::uint32_t* out);
void FindBins(const HistogramBins<std::int32_t>& bins, const std::int32_t* values,
              std::size_t count, std::uint32_t* out);
void FindBins(const HistogramBins<float>& bins, const float* values, std::size_t count,
              std::uint32_t* out);
void FindBins(const HistogramBins<double>& bins, const double* values, std::size_t count,
              std::uint32_t* out);
void FindBins(const HistogramBins<std::uint64_t>& bins, const std::uint64_t* values,
              std::size_t count, std::uint32_t* out);
void FindBins(const HistogramBins<std::int64_t>& bins, const std::int64_t* values,
              std::size_t count, std::uint32_t* out);

}  // namespace lumo
