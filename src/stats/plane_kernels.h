#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <type_traits>

// Computations on a plane: a run of values of one band that lie together, kPlane at most. The loops
// are written for the vector registers; their results do not depend on the machine. A mask has a
// byte for each value, 0xFF where it is valid and 0 elsewhere.

namespace lumo {

/// The most values of a plane. Sums in narrow integers have room for them.
inline constexpr std::size_t kPlane = 2048;

/// True for the types whose statistics come from exact sums.
template <typename T>
inline constexpr bool kExactStats = std::is_integral_v<T> && sizeof(T) <= 4;

/// The sums of a plane of integers, exact. The sum of the squares is sum2High * 2^32 + sum2Low.
template <typename T, bool kExact = kExactStats<T>>
struct PlaneSums {
  std::int64_t sum = 0;
  std::uint64_t sum2Low = 0;   ///< of the squares, sum of the lower 32 bits
  std::uint64_t sum2High = 0;  ///< sum of the bits above
  T min = std::numeric_limits<T>::max();
  T max = std::numeric_limits<T>::lowest();
};

/// The sums of a plane of other numbers: of v - shift and of (v - shift)^2.
template <typename T>
struct PlaneSums<T, false> {
  double shift = 0;  ///< taken off each value first
  double sum = 0;
  double sum2 = 0;     ///< sum of the squares
  bool finite = true;  ///< false: some value isn't finite, and the rest means nothing
  T min = std::numeric_limits<T>::max();
  T max = std::numeric_limits<T>::lowest();
};

/// Clears the bytes of a mask whose value isn't finite. @return how many are left.
std::size_t MaskFinite(const float* values, std::size_t count, unsigned char* mask);
std::size_t MaskFinite(const double* values, std::size_t count, unsigned char* mask);

/// Copies the valid values of a plane, and writes `filler` in place of the others.
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

/// Sums a plane. The shift, of the types that have one, is the first value of the plane.
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

/// Converts values to doubles and takes a shift off each.
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

/// Converts values of 8 bits to integers of 16, whose products are quicker to sum.
void Widen(const std::uint8_t* values, std::size_t count, std::int16_t* out);
void Widen(const std::int8_t* values, std::size_t count, std::int16_t* out);

/// Zeroes the invalid values of a plane and fills `weights` with 1 for valid values and 0 for
/// others.
void WeighPlane(const unsigned char* mask, std::size_t count, double* plane, double* weights);
void WeighPlane(const unsigned char* mask, std::size_t count, std::int16_t* plane,
                std::int16_t* weights);

/// Computes the sums of the products of plane `x` with each of `planes` planes, which lie `stride`
/// values apart from `y` on.
/// @param out  [out] one sum for each of them.
void Dot(const double* x, const double* y, std::size_t planes, std::size_t stride,
         std::size_t count, double* out);
/// The same for values of 8 bits that Widen has converted.
void Dot(const std::int16_t* x, const std::int16_t* y, std::size_t planes, std::size_t stride,
         std::size_t count, std::int32_t* out);

}  // namespace lumo
