#include "regions/pixel_center_edge.h"

#include <algorithm>

namespace lumo {
namespace {

constexpr double kSteadyOrder = 1e-6;  // in the order of edges
constexpr double kSteadyRules = 1e-9;  // in the rules of columns

/// Compares the fractions of a row with a tolerance, which is 0 for the rules of the told form.
struct Comparison {
  explicit Comparison(ScanRules rules)
      : tolerance(rules == ScanRules::kSteady ? kSteadyRules : 0) {}
  bool Less(double a, double b) const { return a < b - tolerance; }
  bool AtMost(double a, double b) const { return a <= b + tolerance; }
  double tolerance;
};

/// Leaves a coordinate that lies on a line of the grid; moves another to its pixel's centre.
double Snap(double coordinate, ScanRules rules, unsigned char flag, unsigned char& flags) {
  const auto cell = static_cast<double>(CellOf(coordinate, rules));
  if (std::abs(coordinate - cell) <= kPolygonTolerance) {
    flags = static_cast<unsigned char>(flags | flag);
    return coordinate;
  }
  return cell + 0.5;
}

}  // namespace

PixelCenterEdge::PixelCenterEdge(const Point2D<double>& from, const Point2D<double>& to,
                                 bool bottomEnd, ScanRules scanRules)
    : rules(scanRules) {
  x0 = Snap(from.x, rules, kOnColumnLine, startFlags);
  y0 = Snap(from.y, rules, kOnRowLine, startFlags);
  x1 = Snap(to.x, rules, kOnColumnLine, endFlags);
  y1 = Snap(to.y, rules, kOnRowLine, endFlags);
  if (bottomEnd) endFlags = static_cast<unsigned char>(endFlags | kBottomEnd);
  firstRow = Cell(from.y);
  lastRow = Cell(to.y);
  slope = std::abs(y1 - y0) > 1e-10 ? (x1 - x0) / (y1 - y0) : 0;
}

void PixelCenterEdge::Step(std::int64_t row) {
  if (row == firstRow) {
    x = x0;
    xTop = (static_cast<double>(row) - y0) * slope + x0;
    atEnd = false;
  } else {
    xTop = xBottom;
    x += slope;
    atEnd = (endFlags & kBottomEnd) != 0 && row == lastRow;
  }
  xBottom = xTop + slope;
}

void PixelCenterEdge::JumpTo(std::int64_t row) {
  x = x0 + static_cast<double>(row - firstRow) * slope;
  xTop = (static_cast<double>(row) - y0) * slope + x0;
  xBottom = xTop + slope;
  atEnd = (endFlags & kBottomEnd) != 0 && row == lastRow;
}

std::int64_t PixelCenterEdge::RunningCell(double running) const {
  return rules == ScanRules::kSteady ? CellOf(running + kSteadyRules, rules)
                                     : CellOf(running, rules);
}

std::int64_t PixelCenterEdge::LeftColumn(std::int64_t row) const {
  const Comparison is(rules);
  const std::int64_t t = RunningCell(xTop);
  const std::int64_t b = RunningCell(xBottom);
  const double topPart = xTop - static_cast<double>(t);
  const double bottomPart = xBottom - static_cast<double>(b);
  if (t == b) return t;
  if (slope > 0) {
    if (row == firstRow) return Cell(x0);
    if (is.Less(1, slope)) {
      const std::int64_t column = is.Less(0.5, topPart) ? t + 1 : t;
      return row == lastRow && (endFlags & kOnColumnLine) != 0 ? column - 1 : column;
    }
    return is.AtMost(topPart, 0.5) || is.AtMost(bottomPart, 1 - topPart) ? t : b;
  }
  if (row == lastRow) return Cell(x1);
  if (is.Less(slope, -1)) {
    if (is.AtMost(bottomPart, 0.5)) return b;
    return row == firstRow && (startFlags & kOnColumnLine) != 0 ? b : b + 1;
  }
  return is.Less(0.5, bottomPart) && is.Less(1 - bottomPart, topPart) ? t : b;
}

std::int64_t PixelCenterEdge::RightColumn(std::int64_t row) const {
  const Comparison is(rules);
  const std::int64_t t = RunningCell(xTop);
  const std::int64_t b = RunningCell(xBottom);
  const double topPart = xTop - static_cast<double>(t);
  const double bottomPart = xBottom - static_cast<double>(b);
  if (t == b) {
    const bool isOnLine = (startFlags & endFlags & kOnColumnLine) != 0 && Cell(x0) == Cell(x1);
    return isOnLine ? t - 1 : t;
  }
  if (slope > 0) {
    if (row == lastRow) return Cell(x1);
    if (is.AtMost(slope, 1))
      return is.Less(bottomPart, 0.5) && is.Less(bottomPart, 1 - topPart) ? t : b;
    return is.Less(bottomPart, 0.5) ? b - 1 : b;
  }
  if (row == firstRow) return (startFlags & kOnColumnLine) != 0 ? Cell(x0) - 1 : Cell(x0);
  if (is.Less(slope, -1)) return is.AtMost(0.5, topPart) ? t : t - 1;
  return is.AtMost(0.5, topPart) || is.AtMost(1 - bottomPart, topPart) ? t : b;
}

bool PixelCenterEdge::EndsAfter(std::int64_t row) const {
  if (lastRow <= row) return true;
  return lastRow == row + 1 && ((endFlags & kOnRowLine) != 0 || (endFlags & kBottomEnd) == 0);
}

bool IsLeftOf(const PixelCenterEdge& a, const PixelCenterEdge& b) {
  const double tolerance = a.rules == ScanRules::kSteady ? kSteadyOrder : 0;
  if (std::abs(a.x - b.x) > tolerance) return a.x < b.x;
  const bool areBottomEnds = (a.endFlags & b.endFlags & PixelCenterEdge::kBottomEnd) != 0;
  return areBottomEnds ? a.xTop < b.xTop - tolerance : a.xBottom < b.xBottom - tolerance;
}

void SortEdges(std::vector<PixelCenterEdge*>& edges) {
  constexpr std::size_t kMany = 256;
  const auto byColumn = [](const PixelCenterEdge* a, const PixelCenterEdge* b) {
    return a->x < b->x;
  };
  if (edges.size() > kMany && !std::is_sorted(edges.begin(), edges.end(), byColumn)) {
    std::stable_sort(edges.begin(), edges.end(), byColumn);
  }
  // From row to row little changes, which insertion makes good at once. It also bears that the tie
  // rule and the tolerance are no order in the sense of std::sort.
  for (std::size_t i = 1; i < edges.size(); ++i) {
    PixelCenterEdge* const edge = edges[i];
    std::size_t at = i;
    for (; at != 0 && IsLeftOf(*edge, *edges[at - 1]); --at) edges[at] = edges[at - 1];
    edges[at] = edge;
  }
}

}  // namespace lumo
