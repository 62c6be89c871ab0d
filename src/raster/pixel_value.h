#pragma once

#include <charconv>
#include <cmath>
#include <limits>
#include <optional>
#include <string>
#include <type_traits>

#include "raster/pixel_types.h"

namespace lumo {

/// Turns a number into a pixel value; gives nothing when no pixel of type T can hold it: a fraction
/// or a number out of range for an integer, one beyond the greatest float.
///
/// This is the one way by which a no-data value becomes one of pixels: a value that the type can't
/// hold equals no pixel and is never written into one. A complex pixel gets it as its real part.
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

/// Turns the text of a number into a pixel value, integers exactly; gives nothing when the text is
/// no number, has anything behind it, or T can't hold it. The decimal point is ".", whatever the
/// locale.
template <typename T>
std::optional<T> ToPixel(const std::string& text) {
  const char* const end = text.data() + text.size();
  if constexpr (std::is_integral_v<T>) {
    T whole{};
    const auto [at, fault] = std::from_chars(text.data(), end, whole);
    if (fault == std::errc() && at == end) return whole;
  }
  double number = 0;
  const auto [at, fault] = std::from_chars(text.data(), end, number);
  return fault == std::errc() && at == end ? ToPixel<T>(number) : std::nullopt;
}

/// True when a pixel of the type with this code can hold the number.
inline bool FitsPixel(unsigned dataType, double value) {
  return DispatchType(TwelveTypes{}, dataType,
                      [&]<typename T>() { return ToPixel<T>(value).has_value(); });
}

}  // namespace lumo
