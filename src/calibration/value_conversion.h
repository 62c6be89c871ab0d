#pragma once

#include <cstddef>
#include <cstdint>

#include "platform/export.h"

namespace lumo {

// Values between pixel types and double, many at a time. Exist for EightTypes.

/// Gives each value as a double, which is exact.
template <typename T>
VEXG_EXPORT void ToDoubles(const T* from, double* to, std::size_t count);

/// Gives each double as a T: an integer is cut toward zero to 64 bits, of which the low ones stay,
/// so 300.7 is 44 as a byte; numbers that 64 bits can't hold, and NaN, give the smallest 64-bit
/// integer. A float is rounded.
template <typename T>
VEXG_EXPORT void FromDoubles(const double* from, T* to, std::size_t count);

/// FromDoubles of one value.
template <typename T>
T FromDouble(double value) {
  T converted;
  FromDoubles(&value, &converted, 1);
  return converted;
}

}  // namespace lumo
