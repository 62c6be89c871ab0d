#pragma once

#include <cmath>
#include <limits>
#include <optional>
#include <type_traits>

namespace lumo::gdal {

/// A number as a pixel value; nothing when T hasn't got it, so that no pixel can hold it.
template <typename T>
std::optional<T> ToPixel(double value) {
  if constexpr (std::is_integral_v<T>) {
    // The bounds as doubles that are exact: the least value, and one above the greatest.
    const double low = static_cast<double>(std::numeric_limits<T>::min());
    const double end = std::ldexp(1.0, std::numeric_limits<T>::digits);
    if (!(value >= low && value < end) || value != std::trunc(value)) return std::nullopt;
    return static_cast<T>(value);
  } else if constexpr (std::is_same_v<T, float>) {
    // Texts of the greatest float are often a little above it.
    constexpr double kMax = std::numeric_limits<float>::max();
    if (std::isfinite(value) && std::abs(value) > kMax) {
      if (std::abs(value) > kMax * (1 + 1e-7)) return std::nullopt;
      return static_cast<float>(std::copysign(kMax, value));
    }
    return static_cast<float>(value);
  } else if constexpr (std::is_same_v<T, double>) {
    return value;
  } else {
    const auto real = ToPixel<decltype(T::real)>(value);
    return real ? std::optional<T>(T{*real, 0}) : std::nullopt;
  }
}

}  // namespace lumo::gdal
