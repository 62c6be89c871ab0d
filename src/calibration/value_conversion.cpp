#include "calibration/value_conversion.h"

#include <algorithm>
#include <limits>
#include <type_traits>

#include "platform/vector_clones.h"
#include "raster/pixel_types.h"

namespace lumo {
namespace {

constexpr std::size_t kBlock = 1024;

/// True when all values lie where 32 bits can hold what is left when they are cut.
VEXG_VECTOR_CLONES
bool FitInt32(const double* values, std::size_t count) {
  int outside = 0;
  for (std::size_t i = 0; i < count; ++i) {
    outside |= static_cast<int>(!(values[i] > -2147483648.0)) |
               static_cast<int>(!(values[i] < 2147483648.0));
  }
  return outside == 0;
}

VEXG_VECTOR_CLONES
void CutToInt32(const double* from, std::int32_t* to, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) to[i] = static_cast<std::int32_t>(from[i]);
}

VEXG_VECTOR_CLONES
void RoundToFloats(const double* from, float* to, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) to[i] = static_cast<float>(from[i]);
}

std::int64_t CutToInt64(double value) {
  constexpr double kBound = 9223372036854775808.0;  // 2^63
  const bool fits = value >= -kBound && value < kBound;
  return fits ? static_cast<std::int64_t>(value) : std::numeric_limits<std::int64_t>::min();
}

}  // namespace

template <typename T>
void ToDoubles(const T* from, double* to, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) to[i] = static_cast<double>(from[i]);
}

template <typename T>
void FromDoubles(const double* from, T* to, std::size_t count) {
  if constexpr (std::is_same_v<T, double>) {
    std::copy_n(from, count, to);
  } else if constexpr (std::is_same_v<T, float>) {
    RoundToFloats(from, to, count);
  } else {
    std::int32_t narrow[kBlock];
    for (std::size_t begin = 0; begin < count; begin += kBlock) {
      const std::size_t block = std::min(kBlock, count - begin);
      if (FitInt32(from + begin, block)) {
        CutToInt32(from + begin, narrow, block);
        for (std::size_t i = 0; i < block; ++i) to[begin + i] = static_cast<T>(narrow[i]);
      } else {
        for (std::size_t i = begin; i < begin + block; ++i) {
          to[i] = static_cast<T>(CutToInt64(from[i]));
        }
      }
    }
  }
}

#define CONVERSIONS(T)                                     \
  template void ToDoubles(const T*, double*, std::size_t); \
  template void FromDoubles(const double*, T*, std::size_t);
VEXG_FOR(EIGHT, CONVERSIONS);

}  // namespace lumo
