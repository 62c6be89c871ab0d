#include "mosaic/seam_split.h"

#include <algorithm>
#include <cmath>

#include "geometry/polygon_clip.h"
#include "mosaic/seam_geometry.h"

namespace lumo {
namespace {

using Point = Point2D<double>;
using Points = std::vector<Point>;
using Outline = Polygon2D<double>;

// A vertex of the overlap this close to both outlines is a crossing, in pixels.
constexpr double kCrossingReach = 1.0;

// Squared: what is thinner has no corner.
constexpr double kLeastWidth = 100.0;

// How far a seam goes beyond the overlap, in pixels, so that it divides it wholly.
constexpr double kOvershoot = 2.0;

/// The corners that an overlap is taken for.
struct Shape {
  enum class Kind {
    kNone,      ///< too thin to be divided
    kTriangle,  ///< crossings a, b and apex c
    kOneSided,  ///< crossings a, b, and c, d on one side of them
    kTwoSided,  ///< crossings a, c, and b, d on either side
  };
  Kind kind = Kind::kNone;
  Point a, b, c, d;
  bool isApexInFirstArc = false;
};

/// The vertex of a part of an arc that lies farthest from a segment, and its squared distance; the
/// first of equal ones.
struct Farthest {
  std::size_t at = 0;
  double distance = 0;
};

Farthest FindFarthest(const Points& arc, std::size_t from, std::size_t to, const Point& s,
                      const Point& e) {
  Farthest farthest{from, 0};
  for (std::size_t i = from; i < to; ++i) {
    const double distance = SquaredDistanceToSegment(arc[i], s, e);
    if (distance > farthest.distance) farthest = {i, distance};
  }
  return farthest;
}

/// The ring of an overlap, turned so that it begins at one crossing; `second` is the other one.
struct CrossedRing {
  Points ring;
  std::size_t second = 0;

  const Point& A() const { return ring[0]; }
  const Point& B() const { return ring[second]; }
  Points FirstArc() const { return {ring.begin() + 1, ring.begin() + Offset()}; }
  Points SecondArc() const { return {ring.begin() + Offset() + 1, ring.end()}; }

 private:
  std::ptrdiff_t Offset() const { return static_cast<std::ptrdiff_t>(second); }
};

Points Reversed(Points points) {
  std::reverse(points.begin(), points.end());
  return points;
}

/// The edges of the outer rings of an outline by the rows that they lie in, to find those near a
/// point without a look at all: outlines that follow pixels have ten thousands.
class EdgeRows {
 public:
  explicit EdgeRows(const Outline& outline)
      : top_(outline.Measure(PolygonMeasure::kMinY)),
        rows_(RowOf(outline.Measure(PolygonMeasure::kMaxY)) + 1) {
    for (const Contour2D<double>& ring : outline.Rings()) {
      if (ring.hole) continue;
      for (std::size_t i = 0; i + 1 < ring.points.size(); ++i) {
        const Point &s = ring.points[i], &e = ring.points[i + 1];
        const std::size_t last = RowOf(std::max(s.y, e.y));
        for (std::size_t row = RowOf(std::min(s.y, e.y)); row <= last; ++row) {
          rows_[row].push_back({s, e});
        }
      }
    }
  }

  /// True when the point lies nearer to an edge than `reach`.
  bool IsNear(const Point& p, double reach) const {
    if (!(p.y + reach >= top_)) return false;
    const std::size_t last = std::min(RowOf(p.y + reach), rows_.size() - 1);
    for (std::size_t row = RowOf(p.y - reach); row <= last; ++row) {
      for (const auto& [s, e] : rows_[row]) {
        if (SquaredDistanceToSegment(p, s, e) < reach * reach) return true;
      }
    }
    return false;
  }

 private:
  struct Edge {
    Point s, e;
  };
  static constexpr double kHeight = 64;  // of a row, in pixels

  std::size_t RowOf(double y) const {
    constexpr double kMost = 1 << 20;
    return static_cast<std::size_t>(std::clamp((y - top_) / kHeight, 0.0, kMost));
  }

  const double top_;
  std::vector<std::vector<Edge>> rows_;
};

/// Finds the two crossings that lie farthest apart. False where there are fewer.
bool FindCrossings(const Outline& a, const Outline& b, Points ring, CrossedRing& crossed) {
  std::vector<std::size_t> crossings;
  const EdgeRows edgesOfA(a), edgesOfB(b);
  for (std::size_t i = 0; i < ring.size(); ++i) {
    if (edgesOfA.IsNear(ring[i], kCrossingReach) && edgesOfB.IsNear(ring[i], kCrossingReach)) {
      crossings.push_back(i);
    }
  }
  if (crossings.size() < 2) return false;
  std::size_t first = crossings[0], second = crossings[1];
  double farthest = -1;
  for (std::size_t i = 0; i < crossings.size(); ++i) {
    for (std::size_t j = i + 1; j < crossings.size(); ++j) {
      const double distance = SquaredLength(ring[crossings[i]], ring[crossings[j]]);
      if (distance <= farthest) continue;
      farthest = distance;
      first = crossings[i];
      second = crossings[j];
    }
  }
  std::rotate(ring.begin(), ring.begin() + static_cast<std::ptrdiff_t>(first), ring.end());
  crossed = {std::move(ring), second - first};
  return true;
}

/// The shape of an overlap with corners on one side of its crossings.
/// @param arc  the vertices of that side, from b on.
/// @param e    the one of them that lies farthest from both.
Shape OneSidedShape(const Point& a, const Point& b, const Points& arc, std::size_t e) {
  const Farthest before = FindFarthest(arc, 0, e, b, arc[e]);
  const Farthest after = FindFarthest(arc, e + 1, arc.size(), a, arc[e]);
  if (std::max(before.distance, after.distance) <= kLeastWidth) {
    return {Shape::Kind::kTriangle, a, b, arc[e], {}};
  }
  if (before.distance >= after.distance) {
    return {Shape::Kind::kOneSided, a, b, arc[before.at], arc[e]};
  }
  return {Shape::Kind::kOneSided, a, b, arc[e], arc[after.at]};
}

Shape FindShape(const CrossedRing& ring) {
  const Points firstArc = ring.FirstArc(), secondArc = ring.SecondArc();
  const Farthest first = FindFarthest(firstArc, 0, firstArc.size(), ring.A(), ring.B());
  const Farthest second = FindFarthest(secondArc, 0, secondArc.size(), ring.A(), ring.B());
  const bool isFirst = first.distance > kLeastWidth, isSecond = second.distance > kLeastWidth;
  if (isFirst && isSecond) {
    return {Shape::Kind::kTwoSided, ring.A(), firstArc[first.at], ring.B(), secondArc[second.at]};
  }
  if (isSecond) return OneSidedShape(ring.A(), ring.B(), secondArc, second.at);
  if (!isFirst) return {};
  Shape shape =
      OneSidedShape(ring.A(), ring.B(), Reversed(firstArc), firstArc.size() - 1 - first.at);
  shape.isApexInFirstArc = true;
  return shape;
}

/// The direction that halves the angle at p between two others. False where points coincide.
bool Bisect(const Point& p, const Point& u, const Point& w, Point& direction) {
  const double pu = std::hypot(u.x - p.x, u.y - p.y), pw = std::hypot(w.x - p.x, w.y - p.y);
  if (pu == 0 || pw == 0) return false;
  direction = {(u.x - p.x) / pu + (w.x - p.x) / pw, (u.y - p.y) / pu + (w.y - p.y) / pw};
  return true;
}

/// The point beyond p, seen from n.
Point Extend(const Point& n, const Point& p) {
  if (p.y == n.y) return {p.x + kOvershoot, p.y};
  if (p.x == n.x) return {p.x, p.y + kOvershoot};
  const double length = std::hypot(p.x - n.x, p.y - n.y);
  return {p.x + kOvershoot * (p.x - n.x) / length, p.y + kOvershoot * (p.y - n.y) / length};
}

Point Rounded(const Point& p) {
  return {std::trunc(p.x + 0.5), std::trunc(p.y + 0.5)};
}

bool TriangleSeam(const Shape& shape, Points& seam) {
  Point atA, atB, n;
  if (!Bisect(shape.a, shape.b, shape.c, atA) || !Bisect(shape.b, shape.a, shape.c, atB) ||
      !MeetLines(shape.a, atA, shape.b, atB, n)) {
    return false;
  }
  seam = {Extend(n, shape.a), n, Extend(n, shape.b)};
  return true;
}

bool QuadrilateralSeam(const Shape& shape, Points& seam) {
  const Point &a = shape.a, &b = shape.b, &c = shape.c, &d = shape.d;
  Point atA, atB, atC, atD, p1, p2, p3, p4;
  if (!Bisect(a, d, b, atA) || !Bisect(b, a, c, atB) || !Bisect(c, b, d, atC) ||
      !Bisect(d, c, a, atD) || !MeetLines(a, atA, b, atB, p1) || !MeetLines(a, atA, d, atD, p2) ||
      !MeetLines(c, atC, b, atB, p3) || !MeetLines(c, atC, d, atD, p4)) {
    return false;
  }
  const Point n1 = Rounded(SquaredLength(a, p2) > SquaredLength(a, p1) ? p1 : p2);
  const Point n2 = Rounded(SquaredLength(c, p4) > SquaredLength(c, p3) ? p3 : p4);
  const Point& end = shape.kind == Shape::Kind::kTwoSided ? c : b;
  seam = {Extend(n1, a), n1, n2, Extend(n2, end)};
  return true;
}

/// The two sides of a seam as closed outlines.
struct Sides {
  Outline x;  // of a triangle and a one-sided shape without the apex, of a two-sided one with b
  Outline y;
};

Sides CutRing(const CrossedRing& ring, const Shape& shape, const Points& seam) {
  const auto close = [](Points points, const Points& more) {
    points.insert(points.end(), more.begin(), more.end());
    points.push_back(points.front());
    return Outline({{std::move(points), false}});
  };
  // From the seam's begin along an arc to its end, and back along the seam.
  const auto side = [&](const Points& arc) {
    Points points{seam.front()};
    points.insert(points.end(), arc.begin(), arc.end());
    return close(std::move(points), Reversed(seam));
  };
  // Along the seam, and back along an arc.
  const auto otherSide = [&](const Points& arc) { return close(seam, arc); };
  if (shape.isApexInFirstArc) {
    return {side(Reversed(ring.SecondArc())), otherSide(Reversed(ring.FirstArc()))};
  }
  return {side(ring.FirstArc()), otherSide(ring.SecondArc())};
}

/// True when the edge of a lies farther from the apex side, or from the side with b, than that of
/// b.
bool IsAFarther(const Shape& shape, const Outline& a, const Outline& b, Form sides) {
  Points probes;
  const auto middle = [](const Point& p, const Point& q) {
    return Point{(p.x + q.x) / 2, (p.y + q.y) / 2};
  };
  switch (shape.kind) {
    case Shape::Kind::kTriangle:
      probes = {shape.c};
      break;
    case Shape::Kind::kOneSided:
      probes = {shape.c, shape.d};
      break;
    default:
      probes = {shape.b, middle(shape.a, shape.b),
                middle(shape.c, sides == Form::kTold ? shape.d : shape.b)};
  }
  double fromA = 0, fromB = 0;
  for (const Point& probe : probes) {
    fromA += DistanceToOutline(probe, a);
    fromB += DistanceToOutline(probe, b);
  }
  return fromA > fromB;
}

Outline Without(const Outline& outline, const Outline& part) {
  return Clip(ClipOperation::kDifference, outline, part);
}

/// Settles which parts both keep where one of them has come apart.
SplitOutcome Settle(const Outline& a, const Outline& b, const Outline& overlap, Outline& ofA,
                    Outline& ofB) {
  const bool isAWhole = CountOuterRings(ofA) == 1, isBWhole = CountOuterRings(ofB) == 1;
  if (isAWhole && !isBWhole) {
    ofB = Without(b, ofA);
  } else if (isBWhole && !isAWhole) {
    ofA = Without(a, ofB);
  } else if (!isAWhole && overlap.Rings().size() != 1) {
    return SplitOutcome::kComesApart;
  }
  return SplitOutcome::kDivided;
}

}  // namespace

SplitOutcome SplitOverlap(const Polygon2D<double>& a, const Polygon2D<double>& b,
                          const Polygon2D<double>& overlap, Form sides, Polygon2D<double>& ofA,
                          Polygon2D<double>& ofB) {
  if (overlap.Rings().empty()) return SplitOutcome::kImpossible;
  Points ring = overlap.Rings()[0].points;
  if (ring.size() > 1 && ring.front() == ring.back()) ring.pop_back();
  CrossedRing crossed;
  if (ring.size() < 3 || !FindCrossings(a, b, std::move(ring), crossed))
    return SplitOutcome::kImpossible;
  const Shape shape = FindShape(crossed);
  if (shape.kind == Shape::Kind::kNone) return SplitOutcome::kTooThin;
  Points seam;
  const bool isTriangle = shape.kind == Shape::Kind::kTriangle;
  if (!(isTriangle ? TriangleSeam(shape, seam) : QuadrilateralSeam(shape, seam)))
    return SplitOutcome::kImpossible;
  const Sides cut = CutRing(crossed, shape, seam);
  // The side that a lies farther from stays with a: it is x of a two-sided shape, else y.
  const bool losesX = IsAFarther(shape, a, b, sides) != (shape.kind == Shape::Kind::kTwoSided);
  ofA = Without(a, losesX ? cut.x : cut.y);
  ofB = Without(b, losesX ? cut.y : cut.x);
  if (IsEmptyOutline(ofA) || IsEmptyOutline(ofB)) return SplitOutcome::kImpossible;
  RemoveSpikes(ofA, kSpikeAngle);
  RemoveSpikes(ofB, kSpikeAngle);
  return Settle(a, b, overlap, ofA, ofB);
}

}  // namespace lumo
