#include "stats/plane_kernels.h"

#include <algorithm>
#include <cstring>

#include "platform/vector_clones.h"

namespace lumo {
namespace {

/// Sums of floating-point numbers run in so many lanes, which are added up in a fixed order.
constexpr std::size_t kLanes = 16;

template <typename Lanes>
[[gnu::always_inline]] inline double AddLanes(const Lanes& lanes) {
  double sums[kLanes];
  for (std::size_t j = 0; j < kLanes; ++j) sums[j] = static_cast<double>(lanes[j]);
  for (std::size_t half = kLanes / 2; half != 0; half /= 2) {
    for (std::size_t j = 0; j < half; ++j) sums[j] += sums[j + half];
  }
  return sums[0];
}

/// 8 and 16 bits: a plane's sum fits 32 bits, and so does one square.
template <typename T>
[[gnu::always_inline]] inline void SumNarrow(const T* values, std::size_t count,
                                             PlaneSums<T>& sums) {
  using Squares = std::conditional_t<sizeof(T) == 1, std::uint32_t, std::uint64_t>;
  std::int32_t sum = 0;
  Squares sum2 = 0;
  T min = std::numeric_limits<T>::max();
  T max = std::numeric_limits<T>::lowest();
  for (std::size_t i = 0; i < count; ++i) {
    const std::int32_t v = values[i];
    sum += v;
    sum2 += static_cast<std::uint32_t>(v) * static_cast<std::uint32_t>(v);
    min = std::min(min, values[i]);
    max = std::max(max, values[i]);
  }
  sums.sum = sum;
  sums.sum2Low = sum2;
  sums.sum2High = 0;
  sums.min = min;
  sums.max = max;
}

/// 32 bits: squares of 64 bits are summed as two halves.
template <typename T>
[[gnu::always_inline]] inline void SumWide(const T* values, std::size_t count, PlaneSums<T>& sums) {
  using Square = std::conditional_t<std::is_signed_v<T>, std::int64_t, std::uint64_t>;
  std::int64_t sum = 0;
  std::uint64_t low = 0;
  std::uint64_t high = 0;
  T min = std::numeric_limits<T>::max();
  T max = std::numeric_limits<T>::lowest();
  for (std::size_t i = 0; i < count; ++i) {
    sum += values[i];
    const auto square =
        static_cast<std::uint64_t>(static_cast<Square>(values[i]) * static_cast<Square>(values[i]));
    low += static_cast<std::uint32_t>(square);
    high += square >> 32;
    min = std::min(min, values[i]);
    max = std::max(max, values[i]);
  }
  sums.sum = sum;
  sums.sum2Low = low;
  sums.sum2High = high;
  sums.min = min;
  sums.max = max;
}

/// The lanes of a sum of numbers that are taken as doubles.
template <typename T>
struct ShiftedLanes {
  double sum[kLanes] = {};
  double sum2[kLanes] = {};
  T zeros[kLanes] = {};  // v * 0 added up: 0 unless some v isn't finite
  T min[kLanes];
  T max[kLanes];

  [[gnu::always_inline]] void Take(const T* values, std::size_t count, double shift) {
    for (std::size_t j = 0; j < count; ++j) {
      const T v = values[j];
      const double d = static_cast<double>(v) - shift;
      sum[j] += d;
      sum2[j] += d * d;
      if constexpr (std::is_floating_point_v<T>) zeros[j] += v * T(0);
      min[j] = v < min[j] ? v : min[j];
      max[j] = v > max[j] ? v : max[j];
    }
  }
};

template <typename T>
[[gnu::always_inline]] inline void SumShifted(const T* values, std::size_t count,
                                              PlaneSums<T>& sums) {
  sums = {};
  if (count == 0) return;
  ShiftedLanes<T> lanes;
  for (std::size_t j = 0; j < kLanes; ++j) {
    lanes.min[j] = std::numeric_limits<T>::max();
    lanes.max[j] = std::numeric_limits<T>::lowest();
  }
  const auto shift = static_cast<double>(values[0]);
  std::size_t i = 0;
  for (; i + kLanes <= count; i += kLanes) lanes.Take(values + i, kLanes, shift);
  lanes.Take(values + i, count - i, shift);
  sums.shift = shift;
  sums.sum = AddLanes(lanes.sum);
  sums.sum2 = AddLanes(lanes.sum2);
  sums.finite = AddLanes(lanes.zeros) == 0;
  sums.min = *std::min_element(lanes.min, lanes.min + kLanes);
  sums.max = *std::max_element(lanes.max, lanes.max + kLanes);
}

template <typename T>
[[gnu::always_inline]] inline std::size_t MaskFiniteOf(const T* values, std::size_t count,
                                                       unsigned char* mask) {
  for (std::size_t i = 0; i < count; ++i) {
    mask[i] = static_cast<unsigned char>(mask[i] & (values[i] * T(0) == T(0) ? 0xFF : 0));
  }
  std::uint32_t valid = 0;
  for (std::size_t i = 0; i < count; ++i) valid += mask[i] & 1;
  return valid;
}

template <typename T>
[[gnu::always_inline]] inline void SelectOf(const T* __restrict values,
                                            const unsigned char* __restrict mask, std::size_t count,
                                            T filler, T* __restrict out) {
  for (std::size_t i = 0; i < count; ++i) {
    if constexpr (std::is_integral_v<T>) {  // by the bits: this the compiler turns into vectors
      const auto ones = static_cast<T>(static_cast<signed char>(mask[i]));
      out[i] = static_cast<T>(filler ^ ((values[i] ^ filler) & ones));
    } else {
      out[i] = mask[i] != 0 ? values[i] : filler;
    }
  }
}

template <typename T>
[[gnu::always_inline]] inline void WidenOf(const T* __restrict values, std::size_t count,
                                           double shift, double* __restrict out) {
  for (std::size_t i = 0; i < count; ++i) out[i] = static_cast<double>(values[i]) - shift;
}

/// Four doubles in vector registers.
using FourDoubles [[gnu::vector_size(32)]] = double;

/// The products with kPlanes planes at once.
template <std::size_t kPlanes>
[[gnu::always_inline]] inline void DotOf(const double* x, const double* y, std::size_t stride,
                                         std::size_t count, double* out) {
  constexpr std::size_t kWide = 4;
  FourDoubles sums[kPlanes] = {};
  std::size_t i = 0;
  for (; i + kWide <= count; i += kWide) {
    FourDoubles xs;
    std::memcpy(&xs, x + i, sizeof(xs));
#pragma GCC unroll 4
    for (std::size_t p = 0; p < kPlanes; ++p) {
      FourDoubles ys;
      std::memcpy(&ys, y + p * stride + i, sizeof(ys));
      sums[p] += xs * ys;
    }
  }
#pragma GCC unroll 4
  for (std::size_t p = 0; p < kPlanes; ++p) {
    double rest = 0;
    for (std::size_t j = i; j < count; ++j) rest += x[j] * y[p * stride + j];
    out[p] = (sums[p][0] + sums[p][2]) + (sums[p][1] + sums[p][3]) + rest;
  }
}

}  // namespace

VEXG_VECTOR_CLONES
std::size_t MaskFinite(const float* values, std::size_t count, unsigned char* mask) {
  return MaskFiniteOf(values, count, mask);
}
VEXG_VECTOR_CLONES
std::size_t MaskFinite(const double* values, std::size_t count, unsigned char* mask) {
  return MaskFiniteOf(values, count, mask);
}

VEXG_VECTOR_CLONES
void Select(const std::uint8_t* values, const unsigned char* mask, std::size_t count,
            std::uint8_t filler, std::uint8_t* out) {
  SelectOf(values, mask, count, filler, out);
}
VEXG_VECTOR_CLONES
void Select(const std::int8_t* values, const unsigned char* mask, std::size_t count,
            std::int8_t filler, std::int8_t* out) {
  SelectOf(values, mask, count, filler, out);
}
VEXG_VECTOR_CLONES
void Select(const std::uint16_t* values, const unsigned char* mask, std::size_t count,
            std::uint16_t filler, std::uint16_t* out) {
  SelectOf(values, mask, count, filler, out);
}
VEXG_VECTOR_CLONES
void Select(const std::int16_t* values, const unsigned char* mask, std::size_t count,
            std::int16_t filler, std::int16_t* out) {
  SelectOf(values, mask, count, filler, out);
}
VEXG_VECTOR_CLONES
void Select(const std::uint32_t* values, const unsigned char* mask, std::size_t count,
            std::uint32_t filler, std::uint32_t* out) {
  SelectOf(values, mask, count, filler, out);
}
VEXG_VECTOR_CLONES
void Select(const std::int32_t* values, const unsigned char* mask, std::size_t count,
            std::int32_t filler, std::int32_t* out) {
  SelectOf(values, mask, count, filler, out);
}
VEXG_VECTOR_CLONES
void Select(const float* values, const unsigned char* mask, std::size_t count, float filler,
            float* out) {
  SelectOf(values, mask, count, filler, out);
}
VEXG_VECTOR_CLONES
void Select(const double* values, const unsigned char* mask, std::size_t count, double filler,
            double* out) {
  SelectOf(values, mask, count, filler, out);
}
VEXG_VECTOR_CLONES
void Select(const std::uint64_t* values, const unsigned char* mask, std::size_t count,
            std::uint64_t filler, std::uint64_t* out) {
  SelectOf(values, mask, count, filler, out);
}
VEXG_VECTOR_CLONES
void Select(const std::int64_t* values, const unsigned char* mask, std::size_t count,
            std::int64_t filler, std::int64_t* out) {
  SelectOf(values, mask, count, filler, out);
}

VEXG_VECTOR_CLONES
void SumPlane(const std::uint8_t* values, std::size_t count, PlaneSums<std::uint8_t>& sums) {
  SumNarrow(values, count, sums);
}
VEXG_VECTOR_CLONES
void SumPlane(const std::int8_t* values, std::size_t count, PlaneSums<std::int8_t>& sums) {
  SumNarrow(values, count, sums);
}
VEXG_VECTOR_CLONES
void SumPlane(const std::uint16_t* values, std::size_t count, PlaneSums<std::uint16_t>& sums) {
  SumNarrow(values, count, sums);
}
VEXG_VECTOR_CLONES
void SumPlane(const std::int16_t* values, std::size_t count, PlaneSums<std::int16_t>& sums) {
  SumNarrow(values, count, sums);
}
VEXG_VECTOR_CLONES
void SumPlane(const std::uint32_t* values, std::size_t count, PlaneSums<std::uint32_t>& sums) {
  SumWide(values, count, sums);
}
VEXG_VECTOR_CLONES
void SumPlane(const std::int32_t* values, std::size_t count, PlaneSums<std::int32_t>& sums) {
  SumWide(values, count, sums);
}
VEXG_VECTOR_CLONES
void SumPlane(const float* values, std::size_t count, PlaneSums<float>& sums) {
  SumShifted(values, count, sums);
}
VEXG_VECTOR_CLONES
void SumPlane(const double* values, std::size_t count, PlaneSums<double>& sums) {
  SumShifted(values, count, sums);
}
VEXG_VECTOR_CLONES
void SumPlane(const std::uint64_t* values, std::size_t count, PlaneSums<std::uint64_t>& sums) {
  SumShifted(values, count, sums);
}
VEXG_VECTOR_CLONES
void SumPlane(const std::int64_t* values, std::size_t count, PlaneSums<std::int64_t>& sums) {
  SumShifted(values, count, sums);
}

VEXG_VECTOR_CLONES
void Widen(const std::uint8_t* values, std::size_t count, double shift, double* out) {
  WidenOf(values, count, shift, out);
}
VEXG_VECTOR_CLONES
void Widen(const std::int8_t* values, std::size_t count, double shift, double* out) {
  WidenOf(values, count, shift, out);
}
VEXG_VECTOR_CLONES
void Widen(const std::uint16_t* values, std::size_t count, double shift, double* out) {
  WidenOf(values, count, shift, out);
}
VEXG_VECTOR_CLONES
void Widen(const std::int16_t* values, std::size_t count, double shift, double* out) {
  WidenOf(values, count, shift, out);
}
VEXG_VECTOR_CLONES
void Widen(const std::uint32_t* values, std::size_t count, double shift, double* out) {
  WidenOf(values, count, shift, out);
}
VEXG_VECTOR_CLONES
void Widen(const std::int32_t* values, std::size_t count, double shift, double* out) {
  WidenOf(values, count, shift, out);
}
VEXG_VECTOR_CLONES
void Widen(const float* values, std::size_t count, double shift, double* out) {
  WidenOf(values, count, shift, out);
}
VEXG_VECTOR_CLONES
void Widen(const double* values, std::size_t count, double shift, double* out) {
  WidenOf(values, count, shift, out);
}
VEXG_VECTOR_CLONES
void Widen(const std::uint64_t* values, std::size_t count, double shift, double* out) {
  WidenOf(values, count, shift, out);
}
VEXG_VECTOR_CLONES
void Widen(const std::int64_t* values, std::size_t count, double shift, double* out) {
  WidenOf(values, count, shift, out);
}

VEXG_VECTOR_CLONES
void Widen(const std::uint8_t* values, std::size_t count, std::int16_t* out) {
  for (std::size_t i = 0; i < count; ++i) out[i] = values[i];
}
VEXG_VECTOR_CLONES
void Widen(const std::int8_t* values, std::size_t count, std::int16_t* out) {
  for (std::size_t i = 0; i < count; ++i) out[i] = values[i];
}

VEXG_VECTOR_CLONES
void WeighPlane(const unsigned char* mask, std::size_t count, double* plane, double* weights) {
  for (std::size_t i = 0; i < count; ++i) {
    weights[i] = static_cast<double>(mask[i] & 1);
    plane[i] *= weights[i];
  }
}
VEXG_VECTOR_CLONES
void WeighPlane(const unsigned char* mask, std::size_t count, std::int16_t* plane,
                std::int16_t* weights) {
  for (std::size_t i = 0; i < count; ++i) {
    weights[i] = mask[i] & 1;
    plane[i] = static_cast<std::int16_t>(plane[i] * weights[i]);
  }
}

VEXG_VECTOR_CLONES
void Dot(const double* x, const double* y, std::size_t planes, std::size_t stride,
         std::size_t count, double* out) {
  constexpr std::size_t kAtOnce = 4;
  std::size_t p = 0;
  for (; p + kAtOnce <= planes; p += kAtOnce) {
    DotOf<kAtOnce>(x, y + p * stride, stride, count, out + p);
  }
  for (; p < planes; ++p) DotOf<1>(x, y + p * stride, stride, count, out + p);
}

VEXG_VECTOR_CLONES
void Dot(const std::int16_t* x, const std::int16_t* y, std::size_t planes, std::size_t stride,
         std::size_t count, std::int32_t* out) {
  for (std::size_t p = 0; p < planes; ++p) {
    const std::int16_t* const other = y + p * stride;
    std::int32_t sum = 0;
    for (std::size_t i = 0; i < count; ++i) sum += x[i] * other[i];
    out[p] = sum;
  }
}

}  // namespace lumo
