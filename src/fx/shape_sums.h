#pragma once

#include <cstdint>
#include <vector>

#include "fx/region_kinds.h"
#include "geometry/boundary_tracer.h"
#include "geometry/polygon2d.h"
#include "stats/exact_stats_accumulator.h"

namespace lumo {

/// The size of a pixel in map units; above 0.
struct PixelSize {
  double x = 1;
  double y = 1;
};

/// Adds up the rings of a region whose vertices are corners of pixels: areas and moments as exact
/// integers, lengths, and the convex hull. Shapes of one region can be joined.
///
///     ShapeSums shape;
///     shape.Add(polygon, size);
///     const ShapeValues values = shape.GetValues(size, false);
///
/// Threads: one at a time.
class VEXG_EXPORT ShapeSums {
 public:
  using Values = std::array<double, SpatialRegionAttributes::kAttributes>;

  /// Adds the rings of a polygon; its label is not looked at.
  void Add(const Polygon2D<std::uint32_t>& polygon, const PixelSize& size);
  void Add(const TracedPolygon& polygon, const PixelSize& size);
  /// Adds what another one has.
  void Merge(const ShapeSums& other);

  /// The attributes, as docs/attributes.md has their formulas.
  /// @param countsHoles  the hole count is that of hole rings, else of all rings but one.
  Values GetValues(const PixelSize& size, bool countsHoles) const;

 private:
  using Point = Point2D<std::int64_t>;

  /// Sums over the edges of rings from (x0, y0) to (x1, y1), with c = x0 y1 - y0 x1.
  struct Moments {
    Int128 s = 0;   // c
    Int128 x = 0;   // (x0 + x1) c
    Int128 y = 0;   // (y0 + y1) c
    Int128 xx = 0;  // (x0^2 + x0 x1 + x1^2) c
    Int128 yy = 0;  // (y0^2 + y0 y1 + y1^2) c
    Int128 xy = 0;  // (2 x0 y0 + x0 y1 + y0 x1 + 2 x1 y1) c
  };

  /// The length of edges: those along the axes in pixels, the others in map units.
  struct Length {
    std::uint64_t across = 0;
    std::uint64_t down = 0;
    double slanted = 0;

    void Add(const Point& from, const Point& to, const PixelSize& size);
    double In(const PixelSize& size) const;
  };

  /// Central moments of second order over the area, in map units.
  struct Spread {
    double xx = 0;
    double yy = 0;
    double xy = 0;
  };

  /// The sides of the box along the main axis, and the angle of that in degrees.
  struct Axes {
    double major = 0;
    double minor = 0;
    double degrees = 0;
  };

  template <typename Rings>
  void AddRings(const Rings& rings, const PixelSize& size);
  template <typename Wide, typename Unsigned>
  static void SumRing(const std::vector<Point>& ring, Moments& to);
  void AddMoments(const Moments& from, std::int64_t byX, std::int64_t byY);
  static std::vector<Point> HullOf(std::vector<Point> points);
  Spread GetSpread(const PixelSize& size) const;
  Axes GetAxes(const PixelSize& size) const;

  bool isEmpty_ = true;
  Point origin_;      // of the moments
  Int128 area2_ = 0;  // twice the signed area of all rings
  Moments outer_;     // of those that are no holes
  Length length_;
  Length outerLength_;
  std::uint32_t rings_ = 0;
  std::uint32_t holes_ = 0;
  std::vector<Point> hull_;  // in order, not closed
};

}  // namespace lumo
