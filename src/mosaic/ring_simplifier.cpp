#include "mosaic/ring_simplifier.h"

namespace lumo {
namespace {

__extension__ using Int128 = __int128;

// Products of three factors up to this size fit 64 bits.
constexpr std::int64_t kSmall = 1 << 20;

/// The squared distance of a point from the segment from a to b, as SimplifyRing counts it.
template <typename Wide>
double SquaredDistance(const Point2D<std::int32_t>& p, const Point2D<std::int32_t>& a,
                       const Point2D<std::int32_t>& b) {
  const Wide sx = Wide(b.x) - a.x, sy = Wide(b.y) - a.y;
  Wide dx = Wide(p.x) - a.x, dy = Wide(p.y) - a.y;
  const Wide dot = dx * sx + dy * sy;
  const Wide length = sx * sx + sy * sy;
  if (dot >= length && dot > 0) {
    dx = Wide(p.x) - b.x;
    dy = Wide(p.y) - b.y;
  } else if (dot > 0) {
    dx -= sx * dot / length;
    dy -= sy * dot / length;
  }
  return static_cast<double>(dx * dx + dy * dy);
}

/// The vertices that stay.
template <typename Wide>
std::vector<Point2D<std::int32_t>> Thinned(const std::vector<Point2D<std::int32_t>>& ring,
                                           double tolerance) {
  std::vector<Point2D<std::int32_t>> kept{ring.front()};
  std::vector<std::size_t> ends{ring.size() - 1};
  std::size_t anchor = 0;
  while (!ends.empty() && ends.back() != anchor) {
    const std::size_t end = ends.back();
    double farthest = -1;
    std::size_t at = anchor;
    for (std::size_t i = anchor + 1; i < end; ++i) {
      const double distance = SquaredDistance<Wide>(ring[i], ring[anchor], ring[end]);
      if (distance > farthest) {
        farthest = distance;
        at = i;
      }
    }
    if (at != anchor && farthest >= tolerance) {
      ends.push_back(at);
      continue;
    }
    kept.push_back(ring[end]);
    ends.pop_back();
    anchor = end;
  }
  return kept;
}

}  // namespace

std::vector<Point2D<std::int32_t>> SimplifyRing(const std::vector<Point2D<std::int32_t>>& ring,
                                                double tolerance, std::size_t fewest) {
  if (ring.size() <= fewest || ring.size() < 2 || !(tolerance >= 1e-15)) return ring;
  std::int64_t low[2] = {ring[0].x, ring[0].y}, high[2] = {ring[0].x, ring[0].y};
  for (const Point2D<std::int32_t>& p : ring) {
    const std::int64_t at[2] = {p.x, p.y};
    for (const int axis : {0, 1}) {
      low[axis] = std::min(low[axis], at[axis]);
      high[axis] = std::max(high[axis], at[axis]);
    }
  }
  const bool isSmall = high[0] - low[0] < kSmall && high[1] - low[1] < kSmall;
  return isSmall ? Thinned<std::int64_t>(ring, tolerance) : Thinned<Int128>(ring, tolerance);
}

}  // namespace lumo
