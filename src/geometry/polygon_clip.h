#pragma once

#include <span>

#include "geometry/polygon2d.h"

namespace lumo {

/// Names what Clip gives of two shapes.
enum class ClipOperation : unsigned {
  kDifference = 0,    ///< what lies in the first alone
  kIntersection = 1,  ///< what lies in both
  kUnion = 3,         ///< what lies in one of them at least
};

/// Combines two shapes (Vatti, A generic solution to polygon clipping, 1992). Inside is what an odd
/// number of rings of a shape goes round; hole flags don't matter, and rings may cross.
///
/// Coordinates count to 1/4096: closer vertices are one, and an edge of the result may lie so far
/// from that of the shape. Rings with less area than two such squares are left out.
/// @return a shape of closed rings with the label of `a`: each outer ring with a positive area, the
///         largest first, its holes behind it. One without rings, which isn't valid then, where
///         nothing lies; where a coordinate isn't finite, or beyond 10^12, where memory is short or
///         the library gives up it holds another error than PolygonErrorBadPolygon.
VEXG_EXPORT Polygon2D<double> Clip(ClipOperation operation, const Polygon2D<double>& a,
                                   const Polygon2D<double>& b);

/// The union of many shapes at once, by the rules of Clip. Its label is 0.
VEXG_EXPORT Polygon2D<double> UnionOf(std::span<const Polygon2D<double>> shapes);

}  // namespace lumo
