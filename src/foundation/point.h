#pragma once

namespace lumo {

/// A point of the plane, in whatever coordinates its holder has: pixels, pixel corners or map
/// units. Points are ordered by y, and by x where y is equal: as a raster is read. A new one is the
/// origin.
template <typename T>
struct Point2D {
  T x{};
  T y{};

  friend bool operator==(const Point2D&, const Point2D&) = default;
  /// Orders as a raster is read; without a meaning for NaN.
  friend bool operator<(const Point2D& a, const Point2D& b) {
    return a.y < b.y || (a.y == b.y && a.x < b.x);
  }
  friend bool operator>(const Point2D& a, const Point2D& b) { return b < a; }
};

}  // namespace lumo
