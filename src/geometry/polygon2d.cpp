#include "geometry/polygon2d.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include "foundation/type_code.h"
#include "geometry/polygon_errors.h"

namespace lumo {
namespace {

// Below this area a shape has no centroid, and closer angles are one.
constexpr double kTiny = 1e-10;

constexpr unsigned kFirstOfGroup[] = {4, 11, 18};  // by RingGroup
constexpr unsigned kPerimeterOfGroup[] = {25, 26, 27};
constexpr unsigned kAreasAndMoments = 7;

/// The sums over the edges of closed rings.
struct RingSums {
  double s = 0, sx = 0, sy = 0, sxx = 0, sxy = 0, syy = 0;
  double perimeter = 0;

  void AddEdge(double x0, double y0, double x1, double y1) {
    const double c = x0 * y1 - x1 * y0;
    s += c;
    sx += (x0 + x1) * c;
    sy += (y0 + y1) * c;
    sxx += (x0 * x0 + x0 * x1 + x1 * x1) * c;
    syy += (y0 * y0 + y0 * y1 + y1 * y1) * c;
    sxy += (2 * x0 * y0 + x0 * y1 + x1 * y0 + 2 * x1 * y1) * c;
    perimeter += std::hypot(x1 - x0, y1 - y0);
  }

  /// Signed area, area, centroid, Ixx, Ixy, Iyy.
  std::array<double, kAreasAndMoments> Measures() const {
    const double area = s / 2;
    if (!(area >= kTiny)) return {area, std::abs(area), 0, 0, 0, 0, 0};
    const double cx = sx / (6 * area), cy = sy / (6 * area);
    return {area,
            std::abs(area),
            cx,
            cy,
            sxx / (12 * area) - cx * cx,
            sxy / (24 * area) - cx * cy,
            syy / (12 * area) - cy * cy};
  }
};

template <typename T>
T FromDouble(double value) {
  if constexpr (std::is_floating_point_v<T>) return value;
  const double whole = std::floor(value + 0.5);
  if (!(whole > static_cast<double>(std::numeric_limits<T>::lowest()))) {
    return std::numeric_limits<T>::lowest();
  }
  return whole < static_cast<double>(std::numeric_limits<T>::max()) ? static_cast<T>(whole)
                                                                    : std::numeric_limits<T>::max();
}

Point2D<double> Doubled(const auto& point) {
  return {static_cast<double>(point.x), static_cast<double>(point.y)};
}

/// Above 0 where c lies to the left of the line from a to b, on axes that run right and up.
double Turn(const Point2D<double>& a, const Point2D<double>& b, const Point2D<double>& c) {
  return (b.x - a.x) * (c.y - a.y) - (b.y - a.y) * (c.x - a.x);
}

/// A point of a hull by its direction from the pivot.
struct Seen {
  Point2D<double> point;
  double angle;
  double distance;
};

/// The points by angle round the pivot, one for each angle: the farthest.
std::vector<Seen> SortedRound(const Point2D<double>& pivot,
                              const std::vector<Point2D<double>>& points) {
  std::vector<Seen> seen;
  for (const Point2D<double>& point : points) {
    const double dx = point.x - pivot.x, dy = point.y - pivot.y;
    if (dx != 0 || dy != 0) seen.push_back({point, std::atan2(dy, dx), std::hypot(dx, dy)});
  }
  std::sort(seen.begin(), seen.end(), [](const Seen& a, const Seen& b) {
    return a.angle < b.angle || (a.angle == b.angle && a.distance < b.distance);
  });
  std::vector<Seen> kept;
  for (const Seen& one : seen) {
    if (kept.empty() || one.angle - kept.back().angle > kTiny) {
      kept.push_back(one);
    } else if (one.distance > kept.back().distance) {
      kept.back() = one;
    }
  }
  return kept;
}

}  // namespace

const unsigned Polygon2DObject::TypeCode = GloballyUniqueObjectTypeCode("Polygon2D");

bool Polygon2DObject::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

template <typename T>
Polygon2D<T>::Polygon2D(Contour2DArray<T> rings, double label) : rings_(std::move(rings)) {
  SetLabel(label);
  CheckRings();
}

template <typename T>
Polygon2D<T>::Polygon2D(double label, const Array<bool>& holes, const Array<unsigned>& starts,
                        const Array<T>& coordinates) {
  SetLabel(label);
  const unsigned vertices = coordinates.GetCount() / 2, count = holes.GetCount();
  bool fits = holes.IsValid() && starts.IsValid() && coordinates.IsValid() &&
              coordinates.GetCount() % 2 == 0 && starts.GetCount() == count && count != 0 &&
              starts[0] == 0;
  for (unsigned ring = 0; fits && ring < count; ++ring) {
    const unsigned begin = starts[ring], end = ring + 1 < count ? starts[ring + 1] : vertices;
    fits = begin < end && end <= vertices;
    if (!fits) break;
    Contour2D<T> contour;
    contour.hole = holes[ring];
    for (unsigned at = begin; at < end; ++at) {
      contour.points.push_back({coordinates[2 * at], coordinates[2 * at + 1]});
    }
    rings_.push_back(std::move(contour));
  }
  if (!fits) rings_.clear();
  CheckRings();
}

template <typename T>
template <typename U>
Polygon2D<T>::Polygon2D(const Polygon2D<U>& other) {
  SetLabel(other.Label());
  for (const Contour2D<U>& ring : other.Rings()) {
    Contour2D<T> contour;
    contour.hole = ring.hole;
    for (const Point2D<U>& point : ring.points) {
      contour.points.push_back({FromDouble<T>(static_cast<double>(point.x)),
                                FromDouble<T>(static_cast<double>(point.y))});
    }
    rings_.push_back(std::move(contour));
  }
  CheckRings();
}

template <typename T>
void Polygon2D<T>::CheckRings() {
  if (rings_.empty()) SetErrorState(PolygonErrorBadPolygon());
}

template <typename T>
void Polygon2D<T>::SetRings(Contour2DArray<T> rings) {
  rings_ = std::move(rings);
  ForgetMeasures();
  ClearErrorState();
  CheckRings();
}

template <typename T>
void Polygon2D<T>::ForgetMeasures() {
  for (Polygon2DAttribute& measure : measures_) measure.valid = false;
}

template <typename T>
double Polygon2D<T>::Measure(unsigned index) const {
  if (index >= kMeasures) return 0;
  if (!measures_[index].valid) FillMeasures();
  return measures_[index].value;
}

template <typename T>
void Polygon2D<T>::FillMeasures() const {
  const auto set = [this](unsigned index, double value) { measures_[index] = {value, 13, true}; };
  RingSums sums[3];
  double box[4] = {0, 0, 0, 0};
  bool isFirst = true;
  for (const Contour2D<T>& ring : rings_) {
    RingSums& group =
        sums[static_cast<unsigned>(ring.hole ? RingGroup::kHoles : RingGroup::kOuter)];
    for (std::size_t i = 0; i < ring.points.size(); ++i) {
      const Point2D<double> at = Doubled(ring.points[i]);
      if (isFirst || at.x < box[0]) box[0] = at.x;
      if (isFirst || at.y < box[1]) box[1] = at.y;
      if (isFirst || at.x > box[2]) box[2] = at.x;
      if (isFirst || at.y > box[3]) box[3] = at.y;
      isFirst = false;
      if (i + 1 == ring.points.size()) break;
      const Point2D<double> next = Doubled(ring.points[i + 1]);
      sums[0].AddEdge(at.x, at.y, next.x, next.y);
      group.AddEdge(at.x, at.y, next.x, next.y);
    }
  }
  for (unsigned i = 0; i < 4; ++i) set(i, box[i]);
  for (unsigned group = 0; group < 3; ++group) {
    const auto measures = sums[group].Measures();
    for (unsigned i = 0; i < kAreasAndMoments; ++i) set(kFirstOfGroup[group] + i, measures[i]);
    set(kPerimeterOfGroup[group], sums[group].perimeter);
  }
}

template <typename T>
template <typename Change>
void Polygon2D<T>::Transform(Change&& change) {
  for (Contour2D<T>& ring : rings_) {
    for (Point2D<T>& point : ring.points) {
      const Point2D<double> changed = change(Doubled(point));
      point = {FromDouble<T>(changed.x), FromDouble<T>(changed.y)};
    }
  }
}

template <typename T>
void Polygon2D<T>::Rotate(double angle, const Point2D<double>& about) {
  const double cosine = std::cos(angle), sine = std::sin(angle);
  Transform([&](const Point2D<double>& point) {
    const double dx = point.x - about.x, dy = point.y - about.y;
    return Point2D<double>{about.x + cosine * dx - sine * dy, about.y + sine * dx + cosine * dy};
  });
  ForgetMeasures();
}

template <typename T>
void Polygon2D<T>::Scale(double factorX, double factorY) {
  Transform([&](const Point2D<double>& point) {
    return Point2D<double>{point.x * factorX, point.y * factorY};
  });
  ForgetMeasures();
}

template <typename T>
void Polygon2D<T>::Translate(double byX, double byY) {
  Transform([&](const Point2D<double>& point) {
    return Point2D<double>{point.x + byX, point.y + byY};
  });
  for (unsigned index = 0; index < 4; ++index) measures_[index].valid = false;
  for (const unsigned first : kFirstOfGroup) {
    measures_[first + 2].valid = measures_[first + 3].valid = false;
  }
}

template <typename T>
void Polygon2D<T>::CloseRings() {
  for (Contour2D<T>& ring : rings_) {
    if (!ring.points.empty() && ring.points.front() != ring.points.back()) {
      ring.points.push_back(ring.points.front());
      ForgetMeasures();
    }
  }
}

template <typename T>
Polygon2D<T> Polygon2D<T>::ConvexHull() const {
  std::vector<Point2D<double>> points;
  for (const Contour2D<T>& ring : rings_) {
    if (ring.hole) continue;
    for (const Point2D<T>& point : ring.points) points.push_back(Doubled(point));
  }
  if (points.empty()) return {};
  double lowest = points.front().y;
  for (const Point2D<double>& point : points) lowest = std::min(lowest, point.y);
  Point2D<double> pivot{std::numeric_limits<double>::infinity(), lowest};
  for (const Point2D<double>& point : points) {
    if (point.y - lowest <= kTiny && point.x < pivot.x) pivot = point;
  }
  std::vector<Point2D<double>> hull{pivot};
  for (const Seen& one : SortedRound(pivot, points)) {
    while (hull.size() > 1 && Turn(hull[hull.size() - 2], hull.back(), one.point) <= 0) {
      hull.pop_back();
    }
    hull.push_back(one.point);
  }
  Contour2D<T> ring;
  for (const Point2D<double>& point : hull) {
    ring.points.push_back({FromDouble<T>(point.x), FromDouble<T>(point.y)});
  }
  ring.points.push_back(ring.points.front());
  return Polygon2D({std::move(ring)}, Label());
}

template <typename T>
Polygon2D<T> Polygon2D<T>::BoundingRectangle() const {
  if (rings_.empty()) return {};
  const auto side = [this](PolygonMeasure measure) { return FromDouble<T>(Measure(measure)); };
  const T left = side(PolygonMeasure::kMinX), top = side(PolygonMeasure::kMinY);
  const T right = side(PolygonMeasure::kMaxX), bottom = side(PolygonMeasure::kMaxY);
  Contour2D<T> ring;
  ring.points = {{left, top}, {right, top}, {right, bottom}, {left, bottom}, {left, top}};
  return Polygon2D({std::move(ring)}, Label());
}

template class Polygon2D<std::uint32_t>;
template class Polygon2D<std::int32_t>;
template class Polygon2D<double>;

template VEXG_EXPORT Polygon2D<std::uint32_t>::Polygon2D(const Polygon2D<std::int32_t>&);
template VEXG_EXPORT Polygon2D<std::uint32_t>::Polygon2D(const Polygon2D<double>&);
template VEXG_EXPORT Polygon2D<std::int32_t>::Polygon2D(const Polygon2D<std::uint32_t>&);
template VEXG_EXPORT Polygon2D<std::int32_t>::Polygon2D(const Polygon2D<double>&);
template VEXG_EXPORT Polygon2D<double>::Polygon2D(const Polygon2D<std::uint32_t>&);
template VEXG_EXPORT Polygon2D<double>::Polygon2D(const Polygon2D<std::int32_t>&);

}  // namespace lumo
