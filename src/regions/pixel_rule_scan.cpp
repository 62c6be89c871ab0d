#include <algorithm>
#include <cmath>

#include "regions/pixel_center_edge.h"
#include "regions/row_collector.h"
#include "regions/shape_scan.h"

// The scans of the common rules of pixels: centres and touched areas.

namespace lumo {
namespace {

constexpr double kSteady = 1e-9;  // by which rounding may have moved an edge off a centre

std::int64_t Floor(double value) {
  return static_cast<std::int64_t>(std::floor(value));
}

std::int64_t Ceil(double value) {
  return static_cast<std::int64_t>(std::ceil(value));
}

/// Where the edges of a ring pass the middle of rows, from row 0 to below a limit.
class Crossings {
 public:
  Crossings(const ScanVertices& vertices, std::int64_t rowLimit) {
    double top = vertices.front().y, bottom = top;
    for (const Point2D<double>& vertex : vertices) {
      top = std::min(top, vertex.y);
      bottom = std::max(bottom, vertex.y);
    }
    firstRow_ = std::max<std::int64_t>(Ceil(top - 0.5 - kSteady), 0);
    lastRow_ = std::min(Ceil(bottom - 0.5 - kSteady) - 1, rowLimit - 1);
    if (lastRow_ < firstRow_) return;
    ends_.resize(static_cast<std::size_t>(lastRow_ - firstRow_ + 2));
    ForEachEdge(vertices, [&](const Edge& edge) {
      for (std::int64_t row = edge.first; row <= edge.last; ++row) ++ends_[IndexOf(row) + 1];
    });
    for (std::size_t i = 1; i < ends_.size(); ++i) ends_[i] += ends_[i - 1];
    columns_.resize(ends_.back());
    std::vector<std::size_t> next(ends_.begin(), ends_.end() - 1);
    ForEachEdge(vertices, [&](const Edge& edge) {
      for (std::int64_t row = edge.first; row <= edge.last; ++row) {
        const double down = static_cast<double>(row) + 0.5 - edge.a.y;
        columns_[next[IndexOf(row)]++] =
            edge.a.x + down * (edge.b.x - edge.a.x) / (edge.b.y - edge.a.y);
      }
    });
  }

  SpanRows GetSpans() {
    SpanRows rows;
    if (lastRow_ < firstRow_) return rows;
    rows.Start(firstRow_);
    for (std::size_t i = 0; i + 1 < ends_.size(); ++i) {
      std::sort(columns_.begin() + static_cast<std::ptrdiff_t>(ends_[i]),
                columns_.begin() + static_cast<std::ptrdiff_t>(ends_[i + 1]));
      for (std::size_t at = ends_[i]; at + 1 < ends_[i + 1]; at += 2) {
        const std::int64_t first = Floor(columns_[at] + 0.5 + kSteady);
        const std::int64_t last = Floor(columns_[at + 1] + 0.5 + kSteady) - 1;
        if (first <= last) rows.Add(first, last);
      }
      rows.EndRow();
    }
    return rows;
  }

 private:
  struct Edge {
    Point2D<double> a;
    Point2D<double> b;
    std::int64_t first;  // row whose middle it passes
    std::int64_t last;
  };

  template <typename Work>
  void ForEachEdge(const ScanVertices& vertices, const Work& work) const {
    for (std::size_t i = 0; i < vertices.size(); ++i) {
      // From the top, so that polygons side by side see their common edge alike.
      Point2D<double> a = vertices[i];
      Point2D<double> b = vertices[i + 1 < vertices.size() ? i + 1 : 0];
      if (b < a) std::swap(a, b);
      const std::int64_t first = std::max(Ceil(a.y - 0.5 - kSteady), firstRow_);
      const std::int64_t last = std::min(Ceil(b.y - 0.5 - kSteady) - 1, lastRow_);
      if (first <= last) work(Edge{a, b, first, last});
    }
  }
  std::size_t IndexOf(std::int64_t row) const { return static_cast<std::size_t>(row - firstRow_); }

  std::int64_t firstRow_ = 0;
  std::int64_t lastRow_ = -1;
  std::vector<std::size_t> ends_;  // for each row, where its crossings end; one entry in front
  std::vector<double> columns_;
};

/// A coordinate that rounding may have moved off a line of the grid.
double OntoGrid(double value) {
  constexpr double kNear = 1e-6;
  const double nearest = std::round(value);
  return std::abs(value - nearest) <= kNear ? nearest : value;
}

/// Puts the pixels whose area a segment enters.
/// @param isLine  a segment along a line of the grid, which enters none, has those beyond it.
void PutTouched(Point2D<double> a, Point2D<double> b, bool isLine, RowCollector& rows) {
  a = {OntoGrid(a.x), OntoGrid(a.y)};
  b = {OntoGrid(b.x), OntoGrid(b.y)};
  if (b.y < a.y) std::swap(a, b);
  const bool isOnRowLine = a.y == b.y && a.y == std::floor(a.y);
  if (isOnRowLine && !isLine) return;
  const std::int64_t last = a.y == b.y ? Floor(a.y) : Ceil(b.y) - 1;
  for (std::int64_t row = std::max<std::int64_t>(Floor(a.y), 0);
       row <= std::min(last, rows.RowLimit() - 1); ++row) {
    const auto at = [&](double y) {
      return y <= a.y ? a.x : y >= b.y ? b.x : a.x + (y - a.y) / (b.y - a.y) * (b.x - a.x);
    };
    const double from = a.y == b.y ? a.x : at(static_cast<double>(row));
    const double to = a.y == b.y ? b.x : at(static_cast<double>(row) + 1);
    const double left = OntoGrid(std::min(from, to));
    const double right = OntoGrid(std::max(from, to));
    const std::int64_t first = Floor(left);
    const std::int64_t end = Ceil(right) - 1;
    if (first <= end || isLine) rows.Put(row, first, std::max(first, end));
  }
}

}  // namespace

SpanRows ScanCenters(const ScanVertices& vertices, std::int64_t rowLimit) {
  if (vertices.empty()) return {};
  return Crossings(vertices, rowLimit).GetSpans();
}

SpanRows ScanTouched(const ScanVertices& vertices, bool isHole, std::int64_t rowLimit) {
  const SpanRows inside = ScanCenters(vertices, rowLimit);
  RowCollector border(rowLimit);
  for (std::size_t i = 0; i < vertices.size(); ++i) {
    PutTouched(vertices[i], vertices[i + 1 < vertices.size() ? i + 1 : 0], false, border);
  }
  const SpanRows touched = border.GetRows();
  return CombineRows({{&inside, false}, {&touched, isHole}});
}

SpanRows ScanTouchedLine(const ScanVertices& vertices, std::int64_t rowLimit) {
  RowCollector rows(rowLimit);
  for (std::size_t i = 0; i < vertices.size(); ++i) {
    rows.Put(Floor(vertices[i].y), Floor(vertices[i].x), Floor(vertices[i].x));
    if (i + 1 < vertices.size()) PutTouched(vertices[i], vertices[i + 1], true, rows);
  }
  return rows.GetRows();
}

}  // namespace lumo
