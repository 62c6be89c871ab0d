#include "mosaic/mask_shape.h"

#include <algorithm>
#include <cmath>

#include "regions/shape_scan.h"

namespace lumo {
namespace {

double AreaOf(const Point2DArray<double>& ring) {
  double twice = 0;
  for (std::size_t i = 0; i < ring.size(); ++i) {
    const Point2D<double>&a = ring[i], &b = ring[(i + 1) % ring.size()];
    twice += a.x * b.y - b.x * a.y;
  }
  return std::abs(twice) / 2;
}

}  // namespace

MaskShape::MaskShape(Contour2DArray<double> rings, unsigned lines) {
  // A ring inside a hole of another comes behind the hole.
  std::stable_sort(rings.begin(), rings.end(), [](const auto& a, const auto& b) {
    return AreaOf(a.points) > AreaOf(b.points);
  });
  std::vector<SpanRows> scanned;
  std::vector<PartRows> parts;
  scanned.reserve(rings.size());
  for (const Contour2D<double>& ring : rings) {
    if (ring.points.size() < 3 || !AreScannable(ring.points)) continue;
    scanned.push_back(ScanCenters(ring.points, lines));
    parts.push_back({&scanned.back(), ring.hole});
    for (std::size_t i = 0; i < ring.points.size(); ++i) {
      const Point2D<double>&a = ring.points[i], &b = ring.points[(i + 1) % ring.points.size()];
      if (!(a == b)) edges_.push_back({a.x, a.y, b.x, b.y});
    }
  }
  rows_ = CombineRows(parts);
}

/// Takes the distances to an edge in where they are less.
void MaskShape::AddEdge(const Edge& edge, const SubRect& rect, double limit, float* distances) {
  const double lowY = std::min(edge.fromY, edge.toY) - limit;
  const double highY = std::max(edge.fromY, edge.toY) + limit;
  const double dx = edge.toX - edge.fromX, dy = edge.toY - edge.fromY;
  const double lengthSquared = dx * dx + dy * dy;
  const unsigned width = rect.Width();
  const auto firstLine = static_cast<std::int64_t>(std::ceil(lowY - 0.5));
  const auto lastLine = static_cast<std::int64_t>(std::floor(highY - 0.5));
  const std::int64_t top = std::max<std::int64_t>(firstLine, rect.top);
  const std::int64_t bottom = std::min<std::int64_t>(lastLine, rect.bottom);
  for (std::int64_t line = top; line <= bottom; ++line) {
    const double y = static_cast<double>(line) + 0.5;
    // The part of the edge that is within the limit of the line.
    double from = 0, to = 1;
    if (dy != 0) {
      const double a = (y - limit - edge.fromY) / dy, b = (y + limit - edge.fromY) / dy;
      from = std::clamp(std::min(a, b), 0.0, 1.0);
      to = std::clamp(std::max(a, b), 0.0, 1.0);
    }
    const double xa = edge.fromX + from * dx, xb = edge.fromX + to * dx;
    const double lowX = std::ceil(std::min(xa, xb) - limit - 0.5);
    const double highX = std::floor(std::max(xa, xb) + limit - 0.5);
    if (!(lowX <= rect.right && highX >= rect.left)) continue;
    const auto left = static_cast<unsigned>(std::max(lowX, double(rect.left)));
    const auto right = static_cast<unsigned>(std::min(highX, double(rect.right)));
    float* const row = distances + static_cast<std::size_t>(line - rect.top) * width;
    for (unsigned column = left; column <= right; ++column) {
      const double x = column + 0.5;
      const double along = ((x - edge.fromX) * dx + (y - edge.fromY) * dy) / lengthSquared;
      const double at = along < 0 ? 0 : along > 1 ? 1 : along;
      const double offX = x - (edge.fromX + at * dx), offY = y - (edge.fromY + at * dy);
      const auto distance = static_cast<float>(std::sqrt(offX * offX + offY * offY));
      float& least = row[column - rect.left];
      if (distance < least) least = distance;
    }
  }
}

/// Compares the distance of the rectangle's middle, which is at most half a diagonal from any of
/// its pixels.
bool MaskShape::MayBeNear(const Edge& edge, const SubRect& rect, double limit) {
  const double x = (double(rect.left) + rect.right + 1) / 2;
  const double y = (double(rect.top) + rect.bottom + 1) / 2;
  const double reach = limit + std::hypot(rect.Width(), rect.Height()) / 2 + 1;
  const double dx = edge.toX - edge.fromX, dy = edge.toY - edge.fromY;
  const double along =
      std::clamp(((x - edge.fromX) * dx + (y - edge.fromY) * dy) / (dx * dx + dy * dy), 0.0, 1.0);
  return std::hypot(x - (edge.fromX + along * dx), y - (edge.fromY + along * dy)) <= reach;
}

bool MaskShape::MayBeNear(const SubRect& rect, double limit) const {
  return std::any_of(edges_.begin(), edges_.end(),
                     [&](const Edge& edge) { return MayBeNear(edge, rect, limit); });
}

bool MaskShape::Distances(const SubRect& rect, float limit, float* distances) const {
  const std::size_t count = std::size_t{rect.Width()} * rect.Height();
  std::fill(distances, distances + count, limit);
  for (const Edge& edge : edges_) {
    if (MayBeNear(edge, rect, double(limit))) AddEdge(edge, rect, limit, distances);
  }
  const bool isAnyNear =
      std::any_of(distances, distances + count, [&](float distance) { return distance < limit; });
  // Pixels in no span lie outside.
  for (unsigned line = rect.top; line <= rect.bottom; ++line) {
    float* const row = distances + std::size_t{line - rect.top} * rect.Width();
    std::int64_t next = rect.left;
    const auto leave = [&](std::int64_t end) {
      for (; next < end; ++next) row[next - rect.left] = -row[next - rect.left];
    };
    for (const ColumnSpan* span = rows_.Begin(line); span != rows_.End(line); ++span) {
      if (span->last < next) continue;
      if (span->first > std::int64_t{rect.right}) break;
      leave(std::min<std::int64_t>(span->first, std::int64_t{rect.right} + 1));
      next = std::max<std::int64_t>(next, std::int64_t{span->last} + 1);
    }
    leave(std::int64_t{rect.right} + 1);
  }
  return isAnyNear;
}

}  // namespace lumo
