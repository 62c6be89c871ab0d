#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <type_traits>

// What is computed on a plane: a stretch of values of one band that lie together, kPlane at most.
// The loops are written for the vector registers; their results do not depend on the machine.

namespace lumo {

/// How many values a plane has at most. What is summed in narrow integers has room for them.
inline constexpr std::size_t kPlane = 2048;

/// Whether statistics of T come from exact sums.
template <typename T>
inline constexpr bool kExactStats = std::is_integral_v<T> && sizeof(T) <= 4;

/// The sums of a plane of integers, exact. The sum of the squares is sum2High * 2^32 + sum2Low.
template <typename T, bool kExact = kExactStats<T>>
struct PlaneSums {
  std::int64_t sum = 0;
  std::uint64_t sum2Low = 0;
  std::uint64_t sum2High = 0;
  T min = std::numeric_limits<T>::max();
  T max = std::numeric_limits<T>::lowest();
};

/// The sums of a plane of other numbers: of v - shift and of (v - shift)^2.
template <typename T>
struct PlaneSums<T, false> {
  double shift = 0;
  double sum = 0;
  double sum2 = 0;
  bool finite = true;  ///< false: some value isn't finite, and the rest means nothing
  T min = std::numeric_limits<T>::max();
  T max = std::numeric_limits<T>::lowest();
};

/// Takes those out of a mask whose value isn't finite. @return how many are left.
std::size_t MaskFinite(const float* values, std::size_t count, unsigned char* mask);
std::size_t MaskFinite(const double* values, std::size_t count, unsigned char* mask);

/// Copies the values where the mask has ones, and `filler` elsewhere.
void Select(const std::uint8_t* values, const unsigned char* mask, std::size_t count,
            std::uint8_t filler, std::uint8_t* out);
void Select(const std::int8_t* values, const unsigned char* mask, std::size_t count,
            std::int8_t filler, std::int8_t* out);
void Select(const std::uint16_t* values, const unsigned char* mask, std::size_t count,
            std::uint16_t filler, std::uint16_t* out);
void Select(const std::int16_t* values, const unsigned char* mask, std::size_t count,
            std::int16_t filler, std::int16_t* out);
void Select(const std::uint32_t* values, const unsigned char* mask, std::size_t count,
            std::uint32_t filler, std::uint32_t* out);
void Select(const std::int32_t* values, const unsigned char* mask, std::size_t count,
            std::int32_t filler, std::int32_t* out);
void Select(const float* values, const unsigned char* mask, std::size_t count, float filler,
            float* out);
void Select(const double* values, const unsigned char* mask, std::size_t count, double filler,
            double* out);
void Select(const std::uint64_t* values, const unsigned char* mask, std::size_t count,
            std::uint64_t filler, std::uint64_t* out);
void Select(const std::int64_t* values, const unsigned char* mask, std::size_t count,
            std::int64_t filler, std::int64_t* out);

/// Sums of a plane. The shift is for the types that have one: the first value of the plane.
void SumPlane(const std::uint8_t* values, std::size_t count, PlaneSums<std::uint8_t>& sums);
void SumPlane(const std::int8_t* values, std::size_t count, PlaneSums<std::int8_t>& sums);
void SumPlane(const std::uint16_t* values, std::size_t count, PlaneSums<std::uint16_t>& sums);
void SumPlane(const std::int16_t* values, std::size_t count, PlaneSums<std::int16_t>& sums);
void SumPlane(const std::uint32_t* values, std::size_t count, PlaneSums<std::uint32_t>& sums);
void SumPlane(const std::int32_t* values, std::size_t count, PlaneSums<std::int32_t>& sums);
void SumPlane(const float* values, std::size_t count, PlaneSums<float>& sums);
void SumPlane(const double* values, std::size_t count, PlaneSums<double>& sums);
void SumPlane(const std::uint64_t* values, std::size_t count, PlaneSums<std::uint64_t>& sums);
void SumPlane(const std::int64_t* values, std::size_t count, PlaneSums<std::int64_t>& sums);

/// Values less a shift, as doubles.
void Widen(const std::uint8_t* values, std::size_t count, double shift, double* out);
void Widen(const std::int8_t* values, std::size_t count, double shift, double* out);
void Widen(const std::uint16_t* values, std::size_t count, double shift, double* out);
void Widen(const std::int16_t* values, std::size_t count, double shift, double* out);
void Widen(const std::uint32_t* values, std::size_t count, double shift, double* out);
void Widen(const std::int32_t* values, std::size_t count, double shift, double* out);
void Widen(const float* values, std::size_t count, double shift, double* out);
void Widen(const double* values, std::size_t count, double shift, double* out);
void Widen(const std::uint64_t* values, std::size_t count, double shift, double* out);
void Widen(const std::int64_t* values, std::size_t count, double shift, double* out);

/// Values of 8 bits as integers whose products are quicker to sum.
void Widen(const std::uint8_t* values, std::size_t count, std::int16_t* out);
void Widen(const std::int8_t* values, std::size_t count, std::int16_t* out);

/// Makes a plane that of its valid values alone: one that isn't valid becomes 0, and its weight is
/// 0, where that of others is 1.
void WeighPlane(const unsigned char* mask, std::size_t count, double* plane, double* weights);
void WeighPlane(const unsigned char* mask, std::size_t count, std::int16_t* plane,
                std::int16_t* weights);

/// The sums of the products of plane `x` with each of `planes` planes, which lie `stride` values
/// apart from `y` on.
void Dot(const double* x, const double* y, std::size_t planes, std::size_t stride,
         std::size_t count, double* out);
/// The same for what Widen makes of 8 bits.
void Dot(const std::int16_t* x, const std::int16_t* y, std::size_t planes, std::size_t stride,
         std::size_t count, std::int32_t* out);

}  // namespace lumo
