#include "mosaic/seam_geometry.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace lumo {
namespace {

using Point = Point2D<double>;

// The neighbour of a spike lies this near to the edge to the other one, squared.
constexpr double kSpikeWidth = 0.25 * 0.25;

/// The angle at v between u and w, by the law of cosines; 0 where two of them are one.
double AngleAt(const Point& v, const Point& u, const Point& w) {
  const double vu = SquaredLength(v, u), vw = SquaredLength(v, w), uw = SquaredLength(u, w);
  if (vu == 0 || vw == 0) return 0;
  return std::acos(std::clamp((vu + vw - uw) / (2 * std::sqrt(vu) * std::sqrt(vw)), -1.0, 1.0));
}

bool IsSpike(const Point& v, const Point& u, const Point& w, double limit) {
  return AngleAt(v, u, w) < limit && (SquaredDistanceToSegment(u, v, w) <= kSpikeWidth ||
                                      SquaredDistanceToSegment(w, v, u) <= kSpikeWidth);
}

void RemoveSpikes(Point2DArray<double>& ring, double limit) {
  if (ring.size() > 1 && ring.front() == ring.back()) ring.pop_back();
  for (std::size_t i = 0; i < ring.size() && ring.size() >= 3;) {
    const std::size_t last = ring.size() - 1;
    if (!IsSpike(ring[i], ring[i == 0 ? last : i - 1], ring[i == last ? 0 : i + 1], limit)) {
      ++i;
      continue;
    }
    // The vertices before have their neighbours still, but for the one beside it.
    ring.erase(ring.begin() + static_cast<std::ptrdiff_t>(i));
    i = i == 0 || i == last ? 0 : i - 1;
  }
}

/// Replaces the rings by those that are left.
void SetOrEmpty(Polygon2D<double>& polygon, Contour2DArray<double> rings) {
  polygon.SetRings(std::move(rings));
  polygon.CloseRings();
}

}  // namespace

double SquaredDistanceToSegment(const Point2D<double>& p, const Point2D<double>& s,
                                const Point2D<double>& e) {
  const double dx = e.x - s.x, dy = e.y - s.y;
  const double t = ((p.x - s.x) * dx + (p.y - s.y) * dy) / (dx * dx + dy * dy);
  if (!(t >= 0 && t <= 1)) return std::min(SquaredLength(p, s), SquaredLength(p, e));
  return SquaredLength(p, {s.x + t * dx, s.y + t * dy});
}

double DistanceToOutline(const Point2D<double>& p, const Polygon2D<double>& polygon) {
  double least = std::numeric_limits<double>::infinity();
  for (const Contour2D<double>& ring : polygon.Rings()) {
    if (ring.hole) continue;
    for (std::size_t i = 0; i + 1 < ring.points.size(); ++i) {
      least = std::min(least, SquaredDistanceToSegment(p, ring.points[i], ring.points[i + 1]));
    }
  }
  return std::sqrt(least);
}

bool IsEmptyOutline(const Polygon2D<double>& polygon) {
  const Contour2DArray<double>& rings = polygon.Rings();
  return rings.empty() || (rings.size() == 1 && rings[0].points.empty());
}

unsigned CountOuterRings(const Polygon2D<double>& polygon) {
  return static_cast<unsigned>(
      std::count_if(polygon.Rings().begin(), polygon.Rings().end(),
                    [](const auto& ring) { return !ring.hole && !ring.points.empty(); }));
}

bool MeetLines(const Point2D<double>& a, const Point2D<double>& u, const Point2D<double>& b,
               const Point2D<double>& v, Point2D<double>& meeting) {
  constexpr double kParallel = 1e-12;  // sine of the angle
  const double cross = u.x * v.y - u.y * v.x;
  const double scale = std::hypot(u.x, u.y) * std::hypot(v.x, v.y);
  if (!(std::abs(cross) > kParallel * scale)) return false;
  const double t = ((b.x - a.x) * v.y - (b.y - a.y) * v.x) / cross;
  meeting = {a.x + t * u.x, a.y + t * u.y};
  return true;
}

void RemoveSpikes(Polygon2D<double>& polygon, double limit) {
  Contour2DArray<double> rings = polygon.Rings();
  for (Contour2D<double>& ring : rings) RemoveSpikes(ring.points, limit);
  std::erase_if(rings, [](const auto& ring) { return ring.points.size() < 3; });
  SetOrEmpty(polygon, std::move(rings));
}

void RemoveSmallRings(Polygon2D<double>& polygon, double limit) {
  Contour2DArray<double> rings = polygon.Rings();
  std::erase_if(rings, [&](const auto& ring) {
    return Polygon2D<double>({ring}).Measure(PolygonMeasure::kArea) < limit;
  });
  SetOrEmpty(polygon, std::move(rings));
}

}  // namespace lumo
