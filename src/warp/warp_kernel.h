#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "commands/value_text.h"
#include "raster/raster_enums.h"

namespace lumo {

/// Names the ways in which pixels of a source make one of a grid. Those behind kNearest widen with
/// the grid's pixel, so that a smaller picture shows all of the source: linear, cubic and Lanczos
/// kernels are stretched over its footprint once that is larger than a pixel of the source
/// (Turkowski, Filters for common resampling tasks, Graphics Gems, 1990), the others take what it
/// covers.
///
/// Pixels that aren't valid are left out, and the weights of the others make up for them. Cubic and
/// Lanczos, whose weights may cancel, become linear where a pixel isn't valid.
enum class WarpKernel : unsigned {
  kTold,     ///< what the resampling method says, over the same few pixels whatever the grid
  kNearest,  ///< the pixel that the position falls into
  kLinear,   ///< a triangle of two pixels
  kCubic,    ///< cubic convolution of four pixels, the parameter -1/2 (Keys, 1981)
  kLanczos,  ///< a windowed sinc of six pixels (Duchon, Lanczos filtering, 1979)
  kAverage,  ///< the mean of the pixels under the footprint, each by the part that is covered
  kMode,     ///< the value that covers most of the footprint; of several the least
  kMin,      ///< the least value with its centre in the footprint, else the pixel at the position
  kMax,      ///< the greatest of these
  kMedian    ///< the middle one of these; of an even number the lower of both
};

VEXG_EXPORT std::span<const EnumWord<WarpKernel>> WordsOf(WarpKernel);

/// Gives the kernel of a resampling: kLinear, kCubic, or else kNearest.
inline WarpKernel KernelOf(PyramidResamplingMethod resampling) {
  return resampling == PyramidResamplingMethod::kLinear  ? WarpKernel::kLinear
         : resampling == PyramidResamplingMethod::kCubic ? WarpKernel::kCubic
                                                         : WarpKernel::kNearest;
}

/// Holds the size of a grid's pixel in pixels of the source, along the axes of the source: what it
/// covers has the standard deviations of a rectangle of that size.
struct WarpFootprint {
  double width = 1;
  double height = 1;

  /// Kernels that weigh by distance are stretched once a pixel is larger than this.
  static constexpr double kLeastStretch = 1.05;
  /// True when such kernels are stretched in one direction at least.
  bool IsWide() const { return width > kLeastStretch || height > kLeastStretch; }
};

/// Says how far from a position, in pixels of the source, a kernel reads.
/// @param size  of the footprint in that direction.
VEXG_EXPORT double KernelReach(WarpKernel kernel, double size);

/// True for the kernels whose value is a weighed mean.
inline bool IsWeighing(WarpKernel kernel) {
  return kernel == WarpKernel::kLinear || kernel == WarpKernel::kCubic ||
         kernel == WarpKernel::kLanczos || kernel == WarpKernel::kAverage;
}

/// Holds the weights of neighbouring pixels.
struct KernelWeights {
  std::int32_t first = 0;  ///< the first pixel
  std::vector<double> of;  ///< a weight for it and for each that follows; their sum is 1
};

/// Computes the weights of the pixels around a position. kMode weighs as kAverage; kMin, kMax and
/// kMedian give each pixel that counts the same weight. A pixel of weight 0 isn't looked at.
/// @param position  in pixels of the source, 0 at the edge of the first one.
/// @param size      of the footprint.
/// @param low,high  the first and the last pixel that there is.
VEXG_EXPORT void FindKernelWeights(WarpKernel kernel, double position, double size,
                                   std::int32_t low, std::int32_t high, KernelWeights& weights);

/// Holds the weights around many positions, as long as they are few for each.
struct NearWeights {
  static constexpr unsigned kMostTaps = 8;
  static constexpr unsigned kMostPositions = 128;
  unsigned taps = 0;                   ///< for each position
  std::int32_t first[kMostPositions];  ///< the first pixel of each
  double of[kMostTaps][kMostPositions];
};

/// Says how many pixels in a row a weighing kernel may need; see NearWeights::taps.
VEXG_EXPORT double CountTaps(WarpKernel kernel, double size);

/// Computes what FindKernelWeights does, to the bit, for many positions far from all edges.
/// @param whole,rest  the positions, taken apart.
/// @param count       of positions.
VEXG_EXPORT void FindNearWeights(WarpKernel kernel, const std::int32_t* whole, const double* rest,
                                 unsigned count, double size, NearWeights& weights);

}  // namespace lumo
