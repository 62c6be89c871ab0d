#pragma once

#include <cmath>
#include <cstdint>
#include <vector>

#include "foundation/point.h"
#include "regions/scan_rules.h"

namespace lumo {

/// The tolerances of the scan, in pixels.
constexpr double kPolygonTolerance = 0.0001;  ///< of polygons
constexpr double kLineTolerance = 0.01;       ///< of lines and points

/// The column or row that a coordinate of a polygon lies in.
inline std::int64_t CellOf(double coordinate, ScanRules rules) {
  const double moved = coordinate + kPolygonTolerance;
  if (coordinate >= 0 || rules == ScanRules::kSteady) {
    return static_cast<std::int64_t>(std::floor(moved));
  }
  return static_cast<std::int64_t>(moved) - 1;
}

/// The column or row that a coordinate of a line or a point lies in.
inline std::int64_t LineCellOf(double coordinate) {
  return static_cast<std::int64_t>(std::floor(coordinate + kLineTolerance));
}

/// An edge of a polygon as it is scanned, from top to bottom: its ends lie on lines of the grid
/// where they were that near, else on pixel centres.
///
/// Step goes to each row in turn, from the first; then the columns of the row can be asked for.
class PixelCenterEdge {
 public:
  /// Bits of the flags.
  enum Flag : unsigned char {
    kOnColumnLine = 1,  ///< x lies on a line of the grid
    kOnRowLine = 2,     ///< y does
    kBottomEnd = 8,     ///< of an end: its other neighbour lies in a row above it
  };

  /// @param from       the end in the smaller row.
  /// @param bottomEnd  whether `to` is a kBottomEnd.
  PixelCenterEdge(const Point2D<double>& from, const Point2D<double>& to, bool bottomEnd,
                  ScanRules rules);

  /// Goes to row `row`: the first row, or the one after that of the last call.
  void Step(std::int64_t row);
  /// Goes to a row below the first at once; for one that begins far above the raster.
  void JumpTo(std::int64_t row);

  /// The first column of a span that begins at this edge.
  std::int64_t LeftColumn(std::int64_t row) const;
  /// The last column of a span that ends at this edge.
  std::int64_t RightColumn(std::int64_t row) const;
  /// True when the edge is done after `row`.
  bool EndsAfter(std::int64_t row) const;

  /// The column or row of a coordinate, by the rules of this edge.
  std::int64_t Cell(double coordinate) const { return CellOf(coordinate, rules); }
  /// The column of a running x, which rounding may have moved.
  std::int64_t RunningCell(double running) const;

  double slope = 0;  ///< change of x for each row
  double x0 = 0;     ///< the ends, as they were moved
  double y0 = 0;     ///< of the upper end
  double x1 = 0;     ///< of the lower end
  double y1 = 0;
  double x = 0;                  ///< running column, by which the edges of a row are ordered
  std::int64_t firstRow = 0;     ///< row of the upper end
  std::int64_t lastRow = 0;      ///< row of the lower end
  bool atEnd = false;            ///< the row is the last one of an edge with a kBottomEnd
  unsigned char startFlags = 0;  ///< bits of Flag, of the upper end
  unsigned char endFlags = 0;    ///< of the lower end
  double xTop = 0;               ///< x at the upper and the lower border of the row
  double xBottom = 0;
  ScanRules rules;
};

/// True when `a` stands left of `b` in their row.
bool IsLeftOf(const PixelCenterEdge& a, const PixelCenterEdge& b);

/// Puts the edges of a row in order.
void SortEdges(std::vector<PixelCenterEdge*>& edges);

}  // namespace lumo
