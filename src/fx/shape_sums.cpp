#include "fx/shape_sums.h"

#include <algorithm>
#include <cmath>
#include <numbers>

namespace lumo {
namespace {

// Below these a shape has no such ratio.
constexpr double kTiny = 1e-10;
// Sides that differ by less are equal: what is left of a difference is rounding.
constexpr double kEqual = 1e-12;
// The greatest extent whose moments fit 64 bits.
constexpr std::int64_t kShortExtent = 1 << 14;

double Ratio(double value, double by, double guard) {
  return guard < kTiny ? 0 : value / by;
}

/// Twice the area of the triangle a, b, c; above 0 where they turn from x towards y.
Int128 Turn(const Point2D<std::int64_t>& a, const Point2D<std::int64_t>& b,
            const Point2D<std::int64_t>& c) {
  return Int128{b.x - a.x} * (c.y - a.y) - Int128{b.y - a.y} * (c.x - a.x);
}

/// factorA a b - factorC c d. In double where 128 bits do not hold it, unless it is 0 there.
double Difference(int factorA, Int128 a, Int128 b, int factorC, Int128 c, Int128 d) {
  using Long = long double;
  const Long first = factorA * static_cast<Long>(a) * static_cast<Long>(b);
  const Long second = factorC * static_cast<Long>(c) * static_cast<Long>(d);
  const Long most = std::ldexp(Long{1}, 126);
  if (std::abs(first) < most && std::abs(second) < most) {
    return static_cast<double>(factorA * a * b - factorC * c * d);
  }
  using Bits = UInt128;
  const Bits wrapped = static_cast<Bits>(a) * static_cast<Bits>(b) * static_cast<Bits>(factorA) -
                       static_cast<Bits>(c) * static_cast<Bits>(d) * static_cast<Bits>(factorC);
  return wrapped == 0 ? 0 : static_cast<double>(first - second);
}

/// The rings of a polygon, whichever way it holds them.
struct TracedRings {
  const TracedPolygon& polygon;

  std::size_t Count() const { return polygon.starts.size(); }
  bool IsHole(std::size_t ring) const { return polygon.holes[ring] != 0; }
  void Take(std::size_t ring, std::vector<Point2D<std::int64_t>>& to) const {
    const std::size_t begin = polygon.starts[ring];
    const std::size_t end =
        ring + 1 < Count() ? polygon.starts[ring + 1] : polygon.coordinates.size() / 2;
    to.clear();
    for (std::size_t at = begin; at < end; ++at) {
      to.push_back({polygon.coordinates[2 * at], polygon.coordinates[2 * at + 1]});
    }
  }
};

struct ContourRings {
  const Contour2DArray<std::uint32_t>& rings;

  std::size_t Count() const { return rings.size(); }
  bool IsHole(std::size_t ring) const { return rings[ring].hole; }
  void Take(std::size_t ring, std::vector<Point2D<std::int64_t>>& to) const {
    to.clear();
    for (const auto& point : rings[ring].points) to.push_back({point.x, point.y});
  }
};

}  // namespace

void ShapeSums::Length::Add(const Point& from, const Point& to, const PixelSize& size) {
  const std::int64_t dx = std::abs(to.x - from.x), dy = std::abs(to.y - from.y);
  if (dy == 0) {
    across += static_cast<std::uint64_t>(dx);
  } else if (dx == 0) {
    down += static_cast<std::uint64_t>(dy);
  } else {
    slanted += std::hypot(static_cast<double>(dx) * size.x, static_cast<double>(dy) * size.y);
  }
}

double ShapeSums::Length::In(const PixelSize& size) const {
  return static_cast<double>(across) * size.x + static_cast<double>(down) * size.y + slanted;
}

void ShapeSums::Add(const Polygon2D<std::uint32_t>& polygon, const PixelSize& size) {
  AddRings(ContourRings{polygon.Rings()}, size);
}

void ShapeSums::Add(const TracedPolygon& polygon, const PixelSize& size) {
  AddRings(TracedRings{polygon}, size);
}

/// Adds the sums over the edges of a ring. They may wrap on the way; the results fit.
/// @param ring  of points that are 0 or above.
template <typename Wide, typename Unsigned>
void ShapeSums::SumRing(const std::vector<Point>& ring, Moments& to) {
  Unsigned s = 0, x = 0, y = 0, xx = 0, yy = 0, xy = 0;
  for (std::size_t i = 0; i + 1 < ring.size(); ++i) {
    const auto x0 = static_cast<Unsigned>(ring[i].x), y0 = static_cast<Unsigned>(ring[i].y);
    const auto x1 = static_cast<Unsigned>(ring[i + 1].x), y1 = static_cast<Unsigned>(ring[i + 1].y);
    const Unsigned c = x0 * y1 - y0 * x1;
    s += c;
    x += (x0 + x1) * c;
    y += (y0 + y1) * c;
    xx += (x0 * x0 + x0 * x1 + x1 * x1) * c;
    yy += (y0 * y0 + y0 * y1 + y1 * y1) * c;
    xy += (2 * x0 * y0 + x0 * y1 + y0 * x1 + 2 * x1 * y1) * c;
  }
  to.s += static_cast<Wide>(s);
  to.x += static_cast<Wide>(x);
  to.y += static_cast<Wide>(y);
  to.xx += static_cast<Wide>(xx);
  to.yy += static_cast<Wide>(yy);
  to.xy += static_cast<Wide>(xy);
}

template <typename Rings>
void ShapeSums::AddRings(const Rings& rings, const PixelSize& size) {
  std::vector<Point> ring, outer;
  Point low{INT64_MAX, INT64_MAX}, high{};
  for (std::size_t i = 0; i < rings.Count(); ++i) {
    rings.Take(i, ring);
    for (const Point& point : ring) {
      low = {std::min(low.x, point.x), std::min(low.y, point.y)};
      high = {std::max(high.x, point.x), std::max(high.y, point.y)};
    }
  }
  if (low.x > high.x) return;
  const bool isShort = std::max(high.x - low.x, high.y - low.y) < kShortExtent;
  Moments moments;
  for (std::size_t i = 0; i < rings.Count(); ++i) {
    const bool isHole = rings.IsHole(i);
    rings.Take(i, ring);
    for (std::size_t at = 0; at + 1 < ring.size(); ++at) {
      length_.Add(ring[at], ring[at + 1], size);
      if (!isHole) outerLength_.Add(ring[at], ring[at + 1], size);
    }
    if (!isHole) outer.insert(outer.end(), ring.begin(), ring.end());
    for (Point& point : ring) point = {point.x - low.x, point.y - low.y};
    Moments ofHole;
    Moments& to = isHole ? ofHole : moments;
    const Int128 before = to.s;
    if (isShort) {
      SumRing<std::int64_t, std::uint64_t>(ring, to);
    } else {
      SumRing<Int128, UInt128>(ring, to);
    }
    area2_ += to.s - before;
    ++rings_;
    holes_ += isHole ? 1 : 0;
  }
  if (isEmpty_) origin_ = low;
  isEmpty_ = false;
  AddMoments(moments, low.x - origin_.x, low.y - origin_.y);
  outer.insert(outer.end(), hull_.begin(), hull_.end());
  hull_ = HullOf(std::move(outer));
}

/// Adds moments about an origin that lies so far from this one.
void ShapeSums::AddMoments(const Moments& from, std::int64_t byX, std::int64_t byY) {
  const Int128 a = byX, b = byY;
  outer_.s += from.s;
  outer_.x += from.x + 3 * a * from.s;
  outer_.y += from.y + 3 * b * from.s;
  outer_.xx += from.xx + 4 * a * from.x + 6 * a * a * from.s;
  outer_.yy += from.yy + 4 * b * from.y + 6 * b * b * from.s;
  outer_.xy += from.xy + 4 * b * from.x + 4 * a * from.y + 12 * a * b * from.s;
}

void ShapeSums::Merge(const ShapeSums& other) {
  if (other.isEmpty_) return;
  if (isEmpty_) {
    *this = other;
    return;
  }
  area2_ += other.area2_;
  AddMoments(other.outer_, other.origin_.x - origin_.x, other.origin_.y - origin_.y);
  for (const auto& [to, from] :
       {std::pair(&length_, &other.length_), std::pair(&outerLength_, &other.outerLength_)}) {
    to->across += from->across;
    to->down += from->down;
    to->slanted += from->slanted;
  }
  rings_ += other.rings_;
  holes_ += other.holes_;
  std::vector<Point> points = hull_;
  points.insert(points.end(), other.hull_.begin(), other.hull_.end());
  hull_ = HullOf(std::move(points));
}

/// The convex hull by monotone chains (Andrew, Another efficient algorithm for convex hulls in two
/// dimensions, 1979), without points that lie on its sides.
std::vector<ShapeSums::Point> ShapeSums::HullOf(std::vector<Point> points) {
  const auto isBefore = [](const Point& a, const Point& b) {
    return a.x < b.x || (a.x == b.x && a.y < b.y);
  };
  std::sort(points.begin(), points.end(), isBefore);
  points.erase(std::unique(points.begin(), points.end()), points.end());
  if (points.size() < 3) return points;
  std::vector<Point> hull;
  hull.reserve(16);
  const auto add = [&hull](const Point& point, std::size_t least) {
    while (hull.size() > least && Turn(hull[hull.size() - 2], hull.back(), point) <= 0) {
      hull.pop_back();
    }
    hull.push_back(point);
  };
  for (const Point& point : points) add(point, 1);
  const std::size_t lower = hull.size();
  for (auto point = points.rbegin() + 1; point != points.rend(); ++point) add(*point, lower);
  hull.pop_back();
  return hull;
}

ShapeSums::Spread ShapeSums::GetSpread(const PixelSize& size) const {
  const Moments& m = outer_;
  if (m.s <= 0) return {};
  const auto s = static_cast<double>(m.s);
  return {Difference(3, m.xx, m.s, 2, m.x, m.x) / (18 * s * s) * size.x * size.x,
          Difference(3, m.yy, m.s, 2, m.y, m.y) / (18 * s * s) * size.y * size.y,
          Difference(3, m.xy, m.s, 4, m.x, m.y) / (36 * s * s) * size.x * size.y};
}

/// Finds the main axis from the spread, and the box along it.
ShapeSums::Axes ShapeSums::GetAxes(const PixelSize& size) const {
  const Spread spread = GetSpread(size);
  const double sum = spread.xx + spread.yy;
  double d = spread.xx - spread.yy;
  if (std::abs(d) <= kEqual * sum) d = 0;
  // The axis runs along (cosine, sine), whose ratio is t.
  double theta = std::numbers::pi / 2, cosine = 0, sine = 1;
  if (spread.xy != 0) {
    const double s = std::hypot(2 * spread.xy, d);
    const double t = d < 0 ? 2 * spread.xy / (s - d) : (d + s) / (2 * spread.xy);
    theta = std::atan2(1.0, t);
    cosine = t / std::hypot(1.0, t);
    sine = 1 / std::hypot(1.0, t);
  } else if (d > 0) {
    theta = 0;
    cosine = 1;
    sine = 0;
  }
  double least[2] = {INFINITY, INFINITY}, most[2] = {-INFINITY, -INFINITY};
  for (const Point& point : hull_) {
    const double x = static_cast<double>(point.x - origin_.x) * size.x;
    const double y = static_cast<double>(point.y - origin_.y) * size.y;
    const double turned[2] = {cosine * x + sine * y, cosine * y - sine * x};
    for (unsigned i = 0; i < 2; ++i) {
      least[i] = std::min(least[i], turned[i]);
      most[i] = std::max(most[i], turned[i]);
    }
  }
  if (hull_.empty()) return {};
  const double width = most[0] - least[0], height = most[1] - least[1];
  const bool isWide = width - height > kEqual * width;
  double angle = isWide ? theta : theta - std::numbers::pi / 2;
  while (angle < 0) angle += std::numbers::pi;
  while (angle > std::numbers::pi) angle -= std::numbers::pi;
  const double degrees = angle * 180 / std::numbers::pi;
  return {isWide ? width : height, isWide ? height : width,
          std::abs(degrees) < kTiny ? 0 : degrees};
}

ShapeSums::Values ShapeSums::GetValues(const PixelSize& size, bool countsHoles) const {
  using Spatial = SpatialRegionAttributes;
  constexpr double kPi = std::numbers::pi;
  const double pixel = size.x * size.y;
  const double area = std::abs(static_cast<double>(area2_)) / 2 * pixel;
  const double outerArea = std::abs(static_cast<double>(outer_.s)) / 2 * pixel;
  const double length = length_.In(size), outerLength = outerLength_.In(size);
  Length around;
  Int128 hullArea2 = 0;
  for (std::size_t i = 0; i < hull_.size(); ++i) {
    const Point &from = hull_[i], &to = hull_[(i + 1) % hull_.size()];
    around.Add(from, to, size);
    hullArea2 += Turn(origin_, from, to);
  }
  const double hullLength = around.In(size);
  const double hullArea = std::abs(static_cast<double>(hullArea2)) / 2 * pixel;
  const Axes axes = GetAxes(size);
  const double majorSquare = axes.major * axes.major;

  Values values{};
  values[Spatial::kArea] = area;
  values[Spatial::kPerimeter] = length;
  values[Spatial::kCompactness] = Ratio(std::sqrt(4 * outerArea / kPi), outerLength, outerLength);
  values[Spatial::kConvexity] = Ratio(length, hullLength, hullLength);
  values[Spatial::kSolidity] = Ratio(area, hullArea, hullArea);
  values[Spatial::kRoundness] = Ratio(4 * area, kPi * majorSquare, majorSquare);
  values[Spatial::kFormFactor] = Ratio(4 * kPi * area, length * length, length);
  values[Spatial::kElongation] = Ratio(axes.major, axes.minor, axes.minor);
  values[Spatial::kRectangularFit] = Ratio(area, axes.minor * axes.major, majorSquare);
  values[Spatial::kMainDirection] = axes.degrees;
  values[Spatial::kMajorLength] = axes.major;
  values[Spatial::kMinorLength] = axes.minor;
  values[Spatial::kHoleCount] = countsHoles ? holes_ : static_cast<double>(rings_) - 1;
  values[Spatial::kHoleToSolidRatio] = Ratio(area, outerArea, outerArea);
  values[Spatial::kPresence] = 1;
  return values;
}

}  // namespace lumo
