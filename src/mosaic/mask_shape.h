#pragma once

#include <vector>

#include "foundation/sub_rect.h"
#include "geometry/polygon2d.h"
#include "regions/span_rows.h"

namespace lumo {

/// A polygon on the grid of a mosaic: the pixels whose centre lies in it, and how far pixels lie
/// from its border. Polygons that share a border have no pixel in common, and none between them.
///
/// Cost:    4 bytes a line, 8 a span and 32 an edge. Distances cost the pixels near the border.
/// Threads: any number.
class MaskShape {
 public:
  /// @param rings  in pixels of the grid; a hole lies within a ring that is larger.
  /// @param lines  of the grid.
  MaskShape(Contour2DArray<double> rings, unsigned lines);

  const SpanRows& Rows() const { return rows_; }

  /// False when no pixel of the rectangle can be nearer to the border than `limit`.
  bool MayBeNear(const SubRect& rect, double limit) const;
  /// Computes how far the centres of pixels lie from the border: above 0 inside, below 0 outside,
  /// and not beyond `limit`.
  /// @param distances  [out] of the pixels of the rectangle, line by line.
  /// @return false when no pixel is nearer than the limit; all are at it then.
  bool Distances(const SubRect& rect, float limit, float* distances) const;

 private:
  struct Edge {
    double fromX, fromY, toX, toY;
  };
  static bool MayBeNear(const Edge& edge, const SubRect& rect, double limit);
  static void AddEdge(const Edge& edge, const SubRect& rect, double limit, float* distances);

  SpanRows rows_;
  std::vector<Edge> edges_;
};

}  // namespace lumo
