#pragma once

#include <algorithm>
#include <array>
#include <cstdint>
#include <span>

#include "georef/georef.h"
#include "raster/raster_enums.h"

// The geometry of a reprojection, which needs no pixel values: where the pixels of one raster lie
// in another.

namespace lumo {

/// Names the ways in which positions are found.
enum class ReprojectionMethod : std::uint32_t {
  kPolynomial = 0,     ///< by a bilinear polynomial fitted to the rectangle read
  kTriangulation = 1,  ///< runs as kPolynomial
  kRigorous = 2        ///< by a transform of every pixel
};

VEXG_EXPORT std::span<const EnumWord<ReprojectionMethod>> WordsOf(ReprojectionMethod);
inline const char* UnknownWordOf(ReprojectionMethod) {
  return "Polynomial";
}

/// A rectangle of pixels with inclusive corners, in order however it was made, that may lie outside
/// a raster.
struct SubRectProj {
  SubRectProj() = default;
  SubRectProj(std::int32_t x0, std::int32_t y0, std::int32_t x1, std::int32_t y1)
      : left(std::min(x0, x1)),
        top(std::min(y0, y1)),
        right(std::max(x0, x1)),
        bottom(std::max(y0, y1)) {}

  /// Pixels of a line, 1 or more.
  std::int64_t Width() const { return std::int64_t{right} - left + 1; }
  /// Lines, 1 or more.
  std::int64_t Height() const { return std::int64_t{bottom} - top + 1; }

  std::int32_t left = 0;    ///< first column; below 0 in front of the raster
  std::int32_t top = 0;     ///< first line
  std::int32_t right = 0;   ///< last column, inclusive
  std::int32_t bottom = 0;  ///< last line, inclusive
};

/// The size and place of a raster in a grid that it is carried to.
struct OutputGrid {
  unsigned samples = 0;  ///< pixels of a line
  unsigned lines = 0;
  double tieX = 0;  ///< map position of its upper left corner
  double tieY = 0;
  double pixelSizeX = 0;  ///< in the target's map unit
  double pixelSizeY = 0;
};

/// Sizes the raster that shows all of a source of samples by lines in the target's system: pixels
/// as large as the source's, converted between the map units at the source's middle.
/// @return false when the source can't be carried to the target.
VEXG_EXPORT bool ComputeOutputGrid(const GeoRef& target, const GeoRef& source, unsigned samples,
                                   unsigned lines, OutputGrid& grid);

/// The number of pixels that a sampler reads on each side of a position.
VEXG_EXPORT std::int32_t SamplingMargin(PyramidResamplingMethod resampling);

/// The place of a rectangle of the base grid in a second raster.
struct CoveredRect {
  SubRectProj rect;        ///< in pixels of the second raster
  bool misses = false;     ///< wholly outside; `rect` is empty then
  bool isPartial = false;  ///< some points could not be carried
};

/// The rectangle of the second raster, of samples by lines, that covers `rect` of the base grid,
/// with the margin that the resampling reads, cut to the raster. It is found by points on the edges
/// and diagonals of `rect`, by a net over it, and by the poles where they lie in it. Where the
/// edges of a global raster meet in `rect`, the rectangle has its whole width. A rectangle that
/// misses the raster leaves a line in the log.
/// @param everyPixel  carry all pixels: for a small rectangle that can be carried in part only.
VEXG_EXPORT CoveredRect BaseSubRectToSecSubRect(const GeoRef& base, const SubRectProj& rect,
                                                const GeoRef& second, unsigned samples,
                                                unsigned lines, PyramidResamplingMethod resampling,
                                                bool everyPixel = false);

/// Carries positions of a rectangle of a grid to pixels of a source raster:
/// u, v = k0 + k1 y + k2 x + k3 x y, where x and y count from the rectangle's upper left corner.
struct WarpPolynomial {
  std::array<double, 4> u{};
  std::array<double, 4> v{};
  double worst = 0;  ///< largest difference, in pixels of the source, to the points of the fit
};

/// Fits the polynomial by least squares to points spread over `sourceRect`.
/// @param centre  0.5 to take pixels at their centres, or 0.
/// @return false where there is no such fit: points that can't be carried, or all on one line.
VEXG_EXPORT bool FitWarp(const GeoRef& grid, const SubRectProj& rect, const GeoRef& source,
                         const SubRectProj& sourceRect, double centre, WarpPolynomial& fit);

}  // namespace lumo
