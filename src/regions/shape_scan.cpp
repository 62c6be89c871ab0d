#include "regions/shape_scan.h"

#include <algorithm>
#include <cmath>
#include <numeric>

#include "regions/pixel_center_edge.h"
#include "regions/row_collector.h"

namespace lumo {
namespace {

constexpr double kFarthest = 4503599627370496.0;  // 2^52: cells and halves of them are exact below
/// How far above the raster edges are still followed row by row.
constexpr std::int64_t kRunUp = 1 << 12;

/// Follows the edges of one polygon from row to row.
class PolygonScanner {
 public:
  PolygonScanner(ScanVertices vertices, ScanRules rules);

  SpanRows Scan(std::int64_t rowLimit);

 private:
  const Point2D<double>& Before(std::size_t vertex, std::size_t steps = 1) const {
    return vertices_[(vertex + vertices_.size() - steps) % vertices_.size()];
  }
  const Point2D<double>& After(std::size_t vertex, std::size_t steps = 1) const {
    return vertices_[(vertex + steps) % vertices_.size()];
  }
  std::int64_t RowOf(const Point2D<double>& point) const { return CellOf(point.y, rules_); }
  bool IsClockwise() const;
  bool IsBottomSide(const Point2D<double>& vertex, const Point2D<double>& before) const;
  void AddEdge(const Point2D<double>& from, const Point2D<double>& to,
               const Point2D<double>& beyond);
  void AddVertex(std::size_t vertex, std::int64_t row);
  void AddVerticesAbove(std::int64_t row);
  void PutRow(std::int64_t row, SpanRows& rows);

  ScanVertices vertices_;
  ScanRules rules_;
  bool isForward_ = true;
  std::vector<std::size_t> order_;      // of the vertices, by y
  std::size_t next_ = 0;                // of `order_`
  std::vector<PixelCenterEdge> edges_;  // whose memory stays in place
  std::vector<PixelCenterEdge*> active_;
  std::vector<ColumnSpan> flat_;
  std::vector<ColumnSpan> spans_;  // of the row
};

PolygonScanner::PolygonScanner(ScanVertices vertices, ScanRules rules)
    : vertices_(std::move(vertices)), rules_(rules) {
  if (rules_ == ScanRules::kSteady) {
    vertices_.erase(std::unique(vertices_.begin(), vertices_.end()), vertices_.end());
    while (vertices_.size() > 1 && vertices_.back() == vertices_.front()) vertices_.pop_back();
  } else if (vertices_.size() > 1 && vertices_.back() == vertices_.front()) {
    vertices_.pop_back();
  }
  edges_.reserve(vertices_.size());
  order_.resize(vertices_.size());
  std::iota(order_.begin(), order_.end(), std::size_t{0});
  std::stable_sort(order_.begin(), order_.end(), [this](std::size_t a, std::size_t b) {
    return vertices_[a].y < vertices_[b].y;
  });
  isForward_ = !IsClockwise();
}

/// Whether the ring turns clockwise on a grid whose y grows downward, by the turn at its topmost
/// vertex.
bool PolygonScanner::IsClockwise() const {
  const auto top = static_cast<std::size_t>(std::min_element(vertices_.begin(), vertices_.end()) -
                                            vertices_.begin());
  const Point2D<double> v = vertices_[top];
  Point2D<double> a = v;
  Point2D<double> b = v;
  for (std::size_t i = 1; i < vertices_.size() && a == v; ++i) a = Before(top, i);
  for (std::size_t i = 1; i < vertices_.size() && b == v; ++i) b = After(top, i);
  return (b.y - v.y) * (a.x - v.x) - (a.y - v.y) * (b.x - v.x) < 0;
}

/// Whether the piece along a row between a vertex and the one before it counts: it is a lower side
/// of the polygon, which lies above it.
bool PolygonScanner::IsBottomSide(const Point2D<double>& vertex,
                                  const Point2D<double>& before) const {
  if (std::abs(vertex.x - before.x) <= kPolygonTolerance) return false;
  const auto isOnLine = [&](double y) {
    return std::abs(y - static_cast<double>(CellOf(y, rules_))) <= kPolygonTolerance;
  };
  if (isOnLine(vertex.y) && isOnLine(before.y)) return false;
  return isForward_ ? before.x < vertex.x : vertex.x < before.x;
}

void PolygonScanner::AddEdge(const Point2D<double>& from, const Point2D<double>& to,
                             const Point2D<double>& beyond) {
  const bool isBottomEnd = RowOf(beyond) < RowOf(to);
  active_.push_back(&edges_.emplace_back(from, to, isBottomEnd, rules_));
}

void PolygonScanner::AddVertex(std::size_t vertex, std::int64_t row) {
  const Point2D<double>& at = vertices_[vertex];
  const Point2D<double>& before = Before(vertex);
  const Point2D<double>& after = After(vertex);
  if (row < RowOf(before)) {
    AddEdge(at, before, Before(vertex, 2));
  } else if (row == RowOf(before) && IsBottomSide(at, before)) {
    const PixelCenterEdge piece(at, before, false, rules_);
    const std::int64_t a = piece.Cell(piece.x0);
    const std::int64_t b = piece.Cell(piece.x1);
    flat_.push_back({ClampColumn(std::min(a, b)), ClampColumn(std::max(a, b))});
  }
  if (row < RowOf(after)) AddEdge(at, after, After(vertex, 2));
}

/// Begins at a row below the first: takes the edges that reach it, as they stand there.
void PolygonScanner::AddVerticesAbove(std::int64_t row) {
  for (; next_ < order_.size() && RowOf(vertices_[order_[next_]]) < row; ++next_) {
    AddVertex(order_[next_], RowOf(vertices_[order_[next_]]));
  }
  flat_.clear();
  std::erase_if(active_, [&](const PixelCenterEdge* edge) { return edge->EndsAfter(row - 1); });
  for (PixelCenterEdge* const edge : active_) edge->JumpTo(row - 1);
}

void PolygonScanner::PutRow(std::int64_t row, SpanRows& rows) {
  spans_.clear();
  for (std::size_t i = 0; i + 1 < active_.size(); i += 2) {
    const std::int64_t first = active_[i]->LeftColumn(row);
    const std::int64_t last = std::max(first, active_[i + 1]->RightColumn(row));
    spans_.push_back({ClampColumn(first), ClampColumn(last)});
  }
  if (!flat_.empty()) {
    spans_.insert(spans_.end(), flat_.begin(), flat_.end());
    MergeSpans(spans_);
    flat_.clear();
  }
  if (row < 0) return;
  for (const ColumnSpan& span : spans_) rows.Add(span.first, span.last);
  rows.EndRow();
}

SpanRows PolygonScanner::Scan(std::int64_t rowLimit) {
  SpanRows rows;
  std::int64_t first = RowOf(vertices_[order_.front()]);
  const std::int64_t last = std::min(RowOf(vertices_[order_.back()]), rowLimit - 1);
  rows.Start(std::max<std::int64_t>(first, 0));
  if (last < 0) return rows;
  if (first < -kRunUp) {
    first = -kRunUp;
    AddVerticesAbove(first);
  }
  for (std::int64_t row = first; row <= last; ++row) {
    for (; next_ < order_.size() && RowOf(vertices_[order_[next_]]) == row; ++next_) {
      AddVertex(order_[next_], row);
    }
    for (PixelCenterEdge* const edge : active_) edge->Step(row);
    SortEdges(active_);
    PutRow(row, rows);
    std::erase_if(active_, [&](const PixelCenterEdge* edge) { return edge->EndsAfter(row); });
  }
  return rows;
}

/// numerator / denominator rounded down; the denominator is above 0.
__extension__ using Wide = __int128;
std::int64_t DivideDown(Wide numerator, Wide denominator) {
  Wide quotient = numerator / denominator;
  if (numerator % denominator < 0) --quotient;
  return static_cast<std::int64_t>(quotient);
}

/// Puts the pixels of a segment, row by row. In the algorithm err = dx - dy at the start; x steps
/// where 2 err > -dy, y where 2 err < dx. After i steps of x and j of y err = (j + 1) dx - (i + 1)
/// dy, so that the columns of row j follow at once: where dx >= dy, i with (2 j - 1) dx < 2 i dy <=
/// (2 j + 1) dx; else the one i = ceil((2 j dx - dy) / (2 dy)).
void PutSegment(Point2D<std::int64_t> from, Point2D<std::int64_t> to, RowCollector& rows) {
  if (to.y < from.y) std::swap(from, to);
  const std::int64_t dx = std::abs(to.x - from.x);
  const std::int64_t dy = to.y - from.y;
  const std::int64_t direction = to.x < from.x ? -1 : 1;
  const auto put = [&](std::int64_t j, std::int64_t first, std::int64_t last) {
    const std::int64_t a = from.x + direction * first;
    const std::int64_t b = from.x + direction * last;
    rows.Put(from.y + j, std::min(a, b), std::max(a, b));
  };
  if (dy == 0) {
    put(0, 0, dx);
    return;
  }
  const std::int64_t end = std::min(dy, rows.RowLimit() - 1 - from.y);
  for (std::int64_t j = std::max<std::int64_t>(0, -from.y); j <= end; ++j) {
    if (dx >= dy) {
      const std::int64_t first = j == 0 ? 0 : DivideDown(Wide{2 * j - 1} * dx, Wide{2} * dy) + 1;
      put(j, first, std::min(dx, DivideDown(Wide{2 * j + 1} * dx, Wide{2} * dy)));
    } else {
      const std::int64_t i = -DivideDown(-(Wide{2 * j} * dx - dy), Wide{2} * dy);
      put(j, i, i);
    }
  }
}

Point2D<std::int64_t> LineCellOf(const Point2D<double>& point) {
  return {lumo::LineCellOf(point.x), lumo::LineCellOf(point.y)};
}

}  // namespace

bool AreScannable(const ScanVertices& vertices) {
  return std::all_of(vertices.begin(), vertices.end(), [](const Point2D<double>& vertex) {
    return std::abs(vertex.x) <= kFarthest && std::abs(vertex.y) <= kFarthest;
  });
}

SpanRows ScanPolygon(ScanVertices vertices, ScanRules rules, std::int64_t rowLimit) {
  if (vertices.empty()) return {};
  return PolygonScanner(std::move(vertices), rules).Scan(rowLimit);
}

SpanRows ScanLine(const ScanVertices& vertices, std::int64_t rowLimit) {
  RowCollector rows(rowLimit);
  for (std::size_t i = 0; i < vertices.size(); ++i) {
    const Point2D<std::int64_t> cell = LineCellOf(vertices[i]);
    rows.Put(cell.y, cell.x, cell.x);
    if (i + 1 < vertices.size()) PutSegment(cell, LineCellOf(vertices[i + 1]), rows);
  }
  return rows.GetRows();
}

SpanRows ScanPoints(const ScanVertices& vertices, std::int64_t rowLimit) {
  RowCollector rows(rowLimit);
  for (const Point2D<double>& vertex : vertices) {
    const Point2D<std::int64_t> cell = LineCellOf(vertex);
    rows.Put(cell.y, cell.x, cell.x);
  }
  return rows.GetRows();
}

}  // namespace lumo
