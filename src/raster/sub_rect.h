#pragma once

#include <cstdint>
#include <iosfwd>

#include "foundation/array.h"

namespace lumo {

/// A rectangle of pixels with inclusive corners. Corners given the wrong way round are put right,
/// so left <= right and top <= bottom. The default is the single pixel at the origin.
///
/// Its text form is "left top right bottom", separated by white space.
class VEXG_EXPORT SubRect {
 public:
  SubRect() = default;
  SubRect(unsigned left, unsigned top, unsigned right, unsigned bottom);
  /// The bounding box of points given as x, y, x, y, …; the origin's pixel for none.
  explicit SubRect(const Array<unsigned>& points);
  SubRect(const SubRect&) = default;
  SubRect& operator=(const SubRect&) = default;
  virtual ~SubRect() = default;

  /// Pixels from left to right. In 64 bits, as the widest rectangle has 2^32.
  std::uint64_t Width() const { return std::uint64_t{right} - left + 1; }
  std::uint64_t Height() const { return std::uint64_t{bottom} - top + 1; }

  /// Each corner brought within the given bounds, then ordered: a rectangle wholly outside comes
  /// out as a strip along the bound.
  SubRect Clip(unsigned lowX, unsigned lowY, unsigned highX, unsigned highY) const;
  /// The same with 0, 0 for the low bounds.
  SubRect Clip(unsigned highX, unsigned highY) const { return Clip(0, 0, highX, highY); }

  friend bool operator==(const SubRect& a, const SubRect& b) {
    return a.left == b.left && a.top == b.top && a.right == b.right && a.bottom == b.bottom;
  }

  unsigned left = 0;
  unsigned top = 0;
  unsigned right = 0;
  unsigned bottom = 0;

 private:
  void Order();
};

VEXG_EXPORT std::ostream& operator<<(std::ostream& out, const SubRect& rect);
/// A text that breaks off fails the stream and leaves the default.
VEXG_EXPORT std::istream& operator>>(std::istream& in, SubRect& rect);

/// The size of the tiles of an iterator, and of the borders around them. Passed by value. All zero
/// means no preference.
///
/// Its text form is the first seven numbers, each followed by a blank, then "Invariable" or
/// "Variable" for borderClamp 0 or 1.
struct VEXG_EXPORT TileDimensions {
  unsigned width = 0;         ///< samples, without borders
  unsigned height = 0;        ///< lines, without borders
  unsigned bands = 0;         ///< 0: all bands of the raster
  unsigned borderLeft = 0;    ///< columns in front of the tile
  unsigned borderRight = 0;   ///< columns behind it
  unsigned borderTop = 0;     ///< lines above it
  unsigned borderBottom = 0;  ///< lines below it
  unsigned borderClamp = 0;   ///< 1: borders end at the raster's edges; 0: they stay and are padded

  bool HasBorders() const { return (borderLeft | borderRight | borderTop | borderBottom) != 0; }
  friend bool operator==(const TileDimensions&, const TileDimensions&) = default;
};

VEXG_EXPORT std::ostream& operator<<(std::ostream& out, const TileDimensions& dimensions);
/// A text that breaks off fails the stream and leaves all zero.
VEXG_EXPORT std::istream& operator>>(std::istream& in, TileDimensions& dimensions);

}  // namespace lumo
