#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "views/reprojection_geometry.h"

namespace lumo {

/// Gives the positions of a rectangle's pixels in the source, line by line: x and y apart, in
/// pixels of the source. A position that there is not is infinite.
///
/// Threads: a reader each.
class WarpPositions {
 public:
  /// By the fit of the rectangle.
  /// @param centre  0.5 to take pixels at their centres, or 0.
  WarpPositions(const WarpPolynomial& fit, unsigned width, double centre)
      : fit_(fit), width_(width), centre_(centre) {}
  /// By a transform of each.
  WarpPositions(const GeoRef& grid, const GeoRef& source, const SubRectProj& rect, double centre)
      : grid_(&grid),
        source_(&source),
        left_(rect.left),
        top_(rect.top),
        width_(static_cast<unsigned>(rect.Width())),
        centre_(centre) {}

  unsigned Width() const { return width_; }

  /// Reads lines one after the other.
  class Reader {
   public:
    /// @param end  behind the last line that is read.
    Reader(const WarpPositions& positions, unsigned end) : positions_(positions), end_(end) {}

    /// The positions of `count` pixels from `x` on, of a line not before the one read last.
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
  const GeoRef* grid_ = nullptr;  // null: by the polynomial
  const GeoRef* source_ = nullptr;
  std::int32_t left_ = 0, top_ = 0;
  unsigned width_;
  double centre_;
};

/// Where positions count, and how they are taken apart.
struct WarpLimits {
  double lowX, lowY;    ///< a position counts from here on
  double highX, highY;  ///< up to here, itself not
  double shift;         ///< taken off a position before it is rounded down
};

/// Positions of some pixels, taken apart.
struct WarpChunk {
  static constexpr unsigned kPixels = 128;
  unsigned count = 0;
  bool allInside = false;
  std::int32_t x[kPixels], y[kPixels];  ///< rounded down; of a position inside
  double a[kPixels], b[kPixels];        ///< what was cut off
  std::uint8_t inside[kPixels];
};

/// Takes chunk.count positions apart.
void TakeApart(const double* positionX, const double* positionY, const WarpLimits& limits,
               WarpChunk& chunk);

}  // namespace lumo
