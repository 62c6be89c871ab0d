#pragma once

#include <cmath>

#include "geometry/polygon2d.h"

namespace lumo {

// Measures and repairs of outlines in pixels, as seams need them.

/// The squared distance of two points.
inline double SquaredLength(const Point2D<double>& a, const Point2D<double>& b) {
  return (b.x - a.x) * (b.x - a.x) + (b.y - a.y) * (b.y - a.y);
}

/// The squared distance of a point from the segment from `s` to `e`.
VEXG_EXPORT double SquaredDistanceToSegment(const Point2D<double>& p, const Point2D<double>& s,
                                            const Point2D<double>& e);

/// The least distance of a point from the edges of the outer rings, which are closed; infinite
/// where there are none.
VEXG_EXPORT double DistanceToOutline(const Point2D<double>& p, const Polygon2D<double>& polygon);

/// True for a polygon without a ring, and for one whose single ring has no vertex.
VEXG_EXPORT bool IsEmptyOutline(const Polygon2D<double>& polygon);

/// The number of outer rings that have vertices.
VEXG_EXPORT unsigned CountOuterRings(const Polygon2D<double>& polygon);

/// The point where the line through `a` along `u` meets that through `b` along `v`. False where
/// they are parallel.
VEXG_EXPORT bool MeetLines(const Point2D<double>& a, const Point2D<double>& u,
                           const Point2D<double>& b, const Point2D<double>& v,
                           Point2D<double>& meeting);

/// The angle below which a vertex of a seam's outlines is a spike, in radians.
inline const double kSpikeAngle = std::asin(0.0001);

/// Takes vertices out of the rings whose angle is below `limit`, in radians, with one neighbour
/// within 0.25 pixels of the edge to the other: what clipping leaves of edges that nearly agree. A
/// vertex that is there twice counts as such a one. Rings that are left are closed; one of fewer
/// than three vertices goes. Without a ring the polygon isn't valid any more.
VEXG_EXPORT void RemoveSpikes(Polygon2D<double>& polygon, double limit);

/// Takes out the rings, holes as well, that have an area below `limit`, in square pixels. Without a
/// ring the polygon isn't valid any more.
VEXG_EXPORT void RemoveSmallRings(Polygon2D<double>& polygon, double limit);

/// The least and the greatest coordinates of an outline, for a quick look whether two may meet.
struct OutlineBox {
  double minX = 0, minY = 0, maxX = 0, maxY = 0;

  explicit OutlineBox(const Polygon2D<double>& polygon)
      : minX(polygon.Measure(PolygonMeasure::kMinX)),
        minY(polygon.Measure(PolygonMeasure::kMinY)),
        maxX(polygon.Measure(PolygonMeasure::kMaxX)),
        maxY(polygon.Measure(PolygonMeasure::kMaxY)) {}

  bool Meets(const OutlineBox& other) const {
    return minX <= other.maxX && other.minX <= maxX && minY <= other.maxY && other.minY <= maxY;
  }
};

}  // namespace lumo
