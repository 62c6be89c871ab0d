#pragma once

#include <cstddef>
#include <cstdint>
#include <type_traits>

#include "commands/value_text.h"

namespace lumo {

/// The bins of one band, and which values count. RasterHistogram explains the rules of both forms.
/// Each Find has no branch for the types of up to 32 bits, so that the compiler makes vector code
/// of a loop over it; FindBins is that loop.
template <typename T>
struct HistogramBins {
  __extension__ using WholeSpan = unsigned __int128;

  T lower{};  ///< of the values that count, both inclusive: within the bounds, and of the sign
  T upper{};  ///< the other bound
  T min{};    ///< where the first bin begins
  double size = 1;              ///< of a bin; of integers a whole number, unless it is below 1
  std::uint64_t wholeSize = 1;  ///< of integers, where it isn't below 1
  std::uint32_t count = 0;      ///< of bins, below 2^31
  Form form = Form::kTold;      ///< which rule gives a value its bin
  // In the exact form a value so far above the first bin's begin is in bin above * parts / span,
  // rounded down. Of integers both are whole where the bins were given by their number.
  double parts = 1;
  double span = 1;
  WholeSpan wholeSpan = 1;  // the span of 64-bit integers, which may be 2^64; 0 unless it is whole

  /// The bin of a value; `count` for one that doesn't count.
  std::uint32_t Find(T value) const {
    return form == Form::kExact ? FindExactly(value) : FindAsTold(value);
  }

  /// Find in the exact form.
  [[gnu::always_inline]] std::uint32_t FindExactly(T value) const {
    if constexpr (std::is_integral_v<T> && sizeof(T) == 8) {
      if (value < lower || value > upper || count == 0) return count;
      const std::uint64_t above =
          static_cast<std::uint64_t>(value) - static_cast<std::uint64_t>(min);
      const std::uint64_t last = count - 1;
      std::uint64_t bin = last;
      if (wholeSpan != 0) {
        const auto exact =
            static_cast<WholeSpan>(above) * static_cast<std::uint64_t>(parts) / wholeSpan;
        if (exact < last) bin = static_cast<std::uint64_t>(exact);
      } else {
        const long double part = static_cast<long double>(above) / span;
        if (part < static_cast<long double>(last)) bin = static_cast<std::uint64_t>(part);
      }
      return static_cast<std::uint32_t>(bin);
    } else {
      const auto v = static_cast<double>(value);
      const auto begin = static_cast<double>(min);
      const double last = count == 0 ? 0.0 : count - 1.0;
      const double at = (v - begin) * parts;
      double bin = at / span;
      bin = bin < last ? bin : last;
      bin = bin > 0.0 ? bin : 0.0;
      bin = static_cast<double>(static_cast<std::int32_t>(bin));
      // A quotient that was rounded may be one beside that of the edges, which decide.
      const double from = std::is_integral_v<T> ? bin * span : begin + bin * span;
      const double to = std::is_integral_v<T> ? (bin + 1.0) * span : begin + (bin + 1.0) * span;
      const double place = std::is_integral_v<T> ? at : v;
      const double above = bin + 1.0;
      const double below = bin - 1.0;
      bin = place >= to ? above : bin;
      bin = place < from ? below : bin;
      bin = bin < last ? bin : last;
      const double most = count;
      const double tooLow = v >= static_cast<double>(lower) ? 0.0 : most;
      const double tooHigh = v <= static_cast<double>(upper) ? 0.0 : most;
      bin = bin > tooLow ? bin : tooLow;
      bin = bin > tooHigh ? bin : tooHigh;
      return static_cast<std::uint32_t>(static_cast<std::int32_t>(bin));
    }
  }

  /// Find in the told form.
  [[gnu::always_inline]] std::uint32_t FindAsTold(T value) const {
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

/// Finds the bins of many values, as HistogramBins::Find does for each.
/// @param out  [out] `count` numbers of bins; bins.count for a value that doesn't count.
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
