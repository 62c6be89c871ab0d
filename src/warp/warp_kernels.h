#pragma once

#include <cmath>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <type_traits>

#include "warp/warp_kernel.h"

namespace lumo {

/// Values of one band to be interpolated at once.
template <typename T, unsigned kTaps>
struct WarpLanes {
  static constexpr unsigned kLanes = 128;  ///< values at once
  T taps[kTaps][kLanes];                   ///< neighbours of each lane, line by line
  T out[kLanes];                           ///< the interpolated values
};

/// Names the ways in which a result becomes a whole number.
enum class WarpRounding { kTowardZero, kNearest };

/// Holds the weights of the four columns, or lines, around each position in cubic convolution.
struct CubicWeights {
  double of[4][128];  ///< by column, then position
};

/// Names the pixels that WeighNear reads and those that it makes.
template <typename T>
struct NearPixels {
  const T* in = nullptr;  ///< the pixel (0, 0) of the weights
  std::size_t inPixel = 0, inLine = 0;
  unsigned bands = 0;  ///< that lie next to one another
  T* out = nullptr;    ///< of the first position
  std::size_t outPixel = 0, outBand = 0;
};

/// Computes the weights for `count` fractional positions between the first middle column, or line,
/// and the next one, 0 to 1.
/// @param parameter  of the kernel: its slope at the distance 1.
void FindCubicWeights(const double* ways, unsigned count, double parameter, CubicWeights& weights);

/// Makes a result a pixel value: whole numbers are rounded and limited to their type.
template <typename T, bool kNearest = true>
[[gnu::always_inline]] inline T StorePixel(double value) {
  if constexpr (std::is_floating_point_v<T>) {
    return static_cast<T>(value);
  } else {
    if constexpr (kNearest) value = std::floor(value + 0.5);
    const double low = std::numeric_limits<T>::min(), high = std::numeric_limits<T>::max();
    value = value < low ? low : value;
    value = value > high ? high : value;
    // By way of a type that vector code converts to.
    if constexpr (sizeof(T) < 4) return static_cast<T>(static_cast<std::int32_t>(value));
    return static_cast<T>(value);
  }
}

/// Bilinear interpolation of `count` lanes between the taps (0, 0), (1, 0), (0, 1), (1, 1).
/// Cubic convolution between four by four taps, in InterpolateCubic of the parameter -1; whole
/// numbers are limited to their type (Keys, Cubic convolution interpolation for digital image
/// processing, 1981, the kernel with a free parameter). InterpolateCubic rounds toward zero, and
/// gives the value of four equal taps exactly; WeighCubic rounds to the nearest, and is faster.
/// @param a  the fractional position of each lane between its first middle column and the next, 0
/// to 1.
/// @param b  the same between lines.
/// AddWeighed adds `count` values, each times a weight, to as many sums.
/// WeighNear sums the pixels around each of `count` positions, line by line within a column, then
/// over the columns; see NearPixels. Up to three elements behind a pixel are read too.
#define VEXG_WARP_KERNELS(T)                                                                       \
  void InterpolateLinear(WarpLanes<T, 4>& lanes, const double* a, const double* b, unsigned count, \
                         WarpRounding rounding);                                                   \
  void InterpolateCubic(WarpLanes<T, 16>& lanes, const double* a, const double* b,                 \
                        unsigned count);                                                           \
  void WeighCubic(WarpLanes<T, 16>& lanes, const CubicWeights& x, const CubicWeights& y,           \
                  unsigned count);                                                                 \
  void AddWeighed(const T* values, std::size_t count, double weight, double* sums);                \
  void WeighNear(const NearPixels<T>& pixels, const NearWeights& x, const NearWeights& y,          \
                 const std::uint8_t* wanted, unsigned count);
VEXG_WARP_KERNELS(std::uint8_t)
VEXG_WARP_KERNELS(std::int8_t)
VEXG_WARP_KERNELS(std::uint16_t)
VEXG_WARP_KERNELS(std::int16_t)
VEXG_WARP_KERNELS(std::uint32_t)
VEXG_WARP_KERNELS(std::int32_t)
VEXG_WARP_KERNELS(float)
VEXG_WARP_KERNELS(double)
#undef VEXG_WARP_KERNELS

}  // namespace lumo
