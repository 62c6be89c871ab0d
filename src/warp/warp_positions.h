#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "warp/reprojection_geometry.h"

namespace lumo {

/// Gives the positions of a rectangle's pixels in the source, line by line: x and y apart, in
/// pixels of the source. A position that there is not is infinite.
///
/// Threads: a reader each.
class WarpPositions {
 public:
  /// By a fit.
  /// @param x,y  the centre, or the corner, of the rectangle's first pixel, from where the fit
  ///             counts.
  WarpPositions(const WarpPolynomial& fit, unsigned width, double x, double y)
      : fit_(fit), width_(width), firstX_(x), firstY_(y) {}
  /// By a transform of each.
  /// @param centre  0.5 to take pixels at their centres, or 0.
  WarpPositions(const GeoRef& grid, const GeoRef& source, const SubRectProj& rect, double centre)
      : grid_(&grid),
        source_(&source),
        width_(static_cast<unsigned>(rect.Width())),
        firstX_(rect.left + centre),
        firstY_(rect.top + centre) {}
  /// From an array that has them, x before y.
  WarpPositions(const double* points, unsigned width) : points_(points), width_(width) {}

  /// Pixels of a line of the rectangle.
  unsigned Width() const { return width_; }

  /// Reads lines one after the other.
  class Reader {
   public:
    /// @param end  behind the last line that is read.
    Reader(const WarpPositions& positions, unsigned end) : positions_(positions), end_(end) {}

    /// The positions of `count` pixels from `x` on, of a line not before the one read last.
    /// @param positionX,positionY  of a whole chunk; those behind `count` may be anything.
    void Read(unsigned line, unsigned x, unsigned count, double* positionX, double* positionY);

   private:
    void Transform(unsigned line);

    const WarpPositions& positions_;
    unsigned end_;
    unsigned first_ = 0;  // line of the points
    unsigned lines_ = 0;
  };

 private:
  WarpPolynomial fit_;
  const double* points_ = nullptr;
  const GeoRef* grid_ = nullptr;  // null, as are the points: by the polynomial
  const GeoRef* source_ = nullptr;
  unsigned width_;
  double firstX_ = 0, firstY_ = 0;
};

/// Says where positions count, and how they are taken apart.
struct WarpLimits {
  double lowX, lowY;    ///< a position counts from here on
  double highX, highY;  ///< up to here, itself not
  double shift;         ///< taken off a position before it is rounded down
  /// A position no farther than this from an edge or the middle of a pixel is put there, as the
  /// errors of arithmetic have moved it. So an edge belongs to the pixel that begins with it.
  double noise = 0;

  static constexpr double kAffineNoise = 0x1p-20;     ///< of map coordinates that were written down
  static constexpr double kTransformNoise = 0x1p-30;  ///< of transforms between systems
};

/// Holds positions of some pixels, taken apart into whole and fractional parts.
struct WarpChunk {
  static constexpr unsigned kPixels = 128;  ///< at most
  unsigned count = 0;                       ///< pixels in use
  bool allInside = false;                   ///< no position lies outside the limits
  std::int32_t x[kPixels], y[kPixels];      ///< rounded down; of a position inside
  double a[kPixels], b[kPixels];            ///< the fractions that were cut off, 0 to 1
  std::uint8_t inside[kPixels];             ///< 1 for a position within the limits, else 0
};

/// Takes chunk.count positions apart, after they have been snapped where the limits say so.
/// @param positionX,positionY  of a whole chunk; those behind chunk.count may be anything.
void TakeApart(double* positionX, double* positionY, const WarpLimits& limits, WarpChunk& chunk);

}  // namespace lumo
