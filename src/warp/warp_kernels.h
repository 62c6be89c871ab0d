#pragma once

#include <cstddef>
#include <cstdint>

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

/// Computes the weights for `count` fractional positions between the first middle column, or line,
/// and the next one, 0 to 1.
void FindCubicWeights(const double* ways, unsigned count, CubicWeights& weights);

/// Bilinear interpolation of `count` lanes between the taps (0, 0), (1, 0), (0, 1), (1, 1).
/// Cubic convolution between four by four taps, the kernel's parameter -1; whole numbers are
/// limited to their type (Keys, Cubic convolution interpolation for digital image processing, 1981,
/// the kernel with a free parameter). InterpolateCubic rounds toward zero, and gives the value of
/// four equal taps exactly; WeighCubic rounds to the nearest, and is faster.
/// @param a  the fractional position of each lane between its first middle column and the next, 0
/// to 1.
/// @param b  the same between lines.
#define VEXG_WARP_KERNELS(T)                                                                       \
  void InterpolateLinear(WarpLanes<T, 4>& lanes, const double* a, const double* b, unsigned count, \
                         WarpRounding rounding);                                                   \
  void InterpolateCubic(WarpLanes<T, 16>& lanes, const double* a, const double* b,                 \
                        unsigned count);                                                           \
  void WeighCubic(WarpLanes<T, 16>& lanes, const CubicWeights& x, const CubicWeights& y,           \
                  unsigned count);
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
