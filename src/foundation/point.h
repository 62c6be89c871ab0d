#pragma once

namespace lumo {

/// A point of the plane. Points are ordered by y, and by x where y is equal: as a raster is read.
template <typename T>
struct Point2D {
  T x{};
  T y{};

  friend bool operator==(const Point2D&, const Point2D&) = default;
  friend bool operator<(const Point2D& a, const Point2D& b) {
    return a.y < b.y || (a.y == b.y && a.x < b.x);
  }
  friend bool operator>(const Point2D& a, const Point2D& b) { return b < a; }
};

}  // namespace lumo
