#pragma once

#include <algorithm>
#include <array>
#include <cmath>
#include <type_traits>

namespace lumo {

/// True for the same value; NaN is the same as NaN.
template <typename T>
bool IsSamePixel(const T& a, const T& b) {
  if constexpr (std::is_floating_point_v<T>) {
    return a == b || (std::isnan(a) && std::isnan(b));
  } else if constexpr (std::is_integral_v<T>) {
    return a == b;
  } else {
    return IsSamePixel(a.real, b.real) && IsSamePixel(a.imag, b.imag);
  }
}

/// The most frequent of one to four values, of several such the first.
template <typename T>
T ModeOf(const std::array<T, 4>& values, unsigned count) {
  const auto times = [&](unsigned i) {
    return std::count_if(values.begin(), values.begin() + count,
                         [&](const T& value) { return IsSamePixel(value, values[i]); });
  };
  unsigned best = 0;
  for (unsigned i = 1; i < count; ++i) {
    if (times(i) > times(best)) best = i;
  }
  return values[best];
}

}  // namespace lumo
