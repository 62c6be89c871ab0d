#pragma once

#include <algorithm>
#include <istream>
#include <ostream>

#include "foundation/array.h"

namespace lumo {

/// A rectangle of pixels with inclusive corners, left <= right and top <= bottom however it was
/// made. The default is the single pixel at the origin. Its text form is the four numbers in the
/// order left, top, right, bottom.
///
///     SubRect rect(10, 20, 19, 24);       // 10 samples by 5 lines
///     rect = rect.Clip(raster.Samples() - 1, raster.Lines() - 1);
class SubRect {
 public:
  SubRect() = default;
  /// Any two corners that face each other.
  SubRect(unsigned x0, unsigned y0, unsigned x1, unsigned y1)
      : left(std::min(x0, x1)),
        top(std::min(y0, y1)),
        right(std::max(x0, x1)),
        bottom(std::max(y0, y1)) {}

  /// The bounding box of x, y pairs; of no pair, the default.
  explicit SubRect(const Array<unsigned>& points) {
    for (unsigned i = 0; i + 1 < points.GetCount(); i += 2) {
      const unsigned x = points[i];
      const unsigned y = points[i + 1];
      *this = i == 0 ? SubRect(x, y, x, y)
                     : SubRect(std::min(left, x), std::min(top, y), std::max(right, x),
                               std::max(bottom, y));
    }
  }
  virtual ~SubRect() = default;
  SubRect(const SubRect&) = default;
  SubRect& operator=(const SubRect&) = default;

  /// Samples of a line, 1 or more; 0 for a rectangle of all 2^32 columns.
  unsigned Width() const { return right - left + 1; }
  /// Lines, 1 or more; 0 for a rectangle of all 2^32 lines.
  unsigned Height() const { return bottom - top + 1; }

  /// Raises left and top to the low bounds, lowers right and bottom to the high ones, and orders
  /// the corners that come out.
  SubRect Clip(unsigned lowX, unsigned lowY, unsigned highX, unsigned highY) const {
    return {std::max(left, lowX), std::max(top, lowY), std::min(right, highX),
            std::min(bottom, highY)};
  }
  /// Cuts the rectangle to pixels 0 to the high bounds, inclusive. One that lies wholly outside
  /// comes out between the bound and itself.
  SubRect Clip(unsigned highX, unsigned highY) const { return Clip(0, 0, highX, highY); }

  friend bool operator==(const SubRect& a, const SubRect& b) {
    return a.left == b.left && a.top == b.top && a.right == b.right && a.bottom == b.bottom;
  }

  unsigned left = 0;    ///< first column
  unsigned top = 0;     ///< first line
  unsigned right = 0;   ///< last column, inclusive
  unsigned bottom = 0;  ///< last line, inclusive
};

/// Writes the four numbers with a blank between them.
inline std::ostream& operator<<(std::ostream& out, const SubRect& rect) {
  return out << rect.left << ' ' << rect.top << ' ' << rect.right << ' ' << rect.bottom;
}

/// Reads the four numbers; the default rectangle when there are not four.
inline std::istream& operator>>(std::istream& in, SubRect& rect) {
  unsigned x0 = 0, y0 = 0, x1 = 0, y1 = 0;
  rect = in >> x0 >> y0 >> x1 >> y1 ? SubRect(x0, y0, x1, y1) : SubRect();
  return in;
}

}  // namespace lumo
