#pragma once

#include <array>
#include <cstdint>
#include <vector>

#include "foundation/array.h"
#include "foundation/object.h"
#include "foundation/point.h"
#include "foundation/pointer.h"
#include "geometry/polygon_errors.h"

namespace lumo {

/// The vertices of a ring, a line or a set of points.
template <typename T>
using Point2DArray = std::vector<Point2D<T>>;

/// One ring of a polygon. A closed one repeats its first vertex as its last.
template <typename T>
struct Contour2D {
  Point2DArray<T> points;
  bool hole = false;
};

/// The rings of a polygon.
template <typename T>
using Contour2DArray = std::vector<Contour2D<T>>;

/// A number that belongs to a polygon.
struct Polygon2DAttribute {
  double value = 0;
  unsigned kind = 13;  ///< 13 for a measure, 6 for a label
  bool valid = false;  ///< the value is at hand
};

/// Names the rings that a measure is of.
enum class RingGroup : unsigned {
  kAll = 0,
  kHoles = 1,  ///< those whose hole flag is set
  kOuter = 2,
};

/// The places of a polygon's 28 measures. Those of Group follow each other in each RingGroup.
enum class PolygonMeasure : unsigned {
  kMinX = 0,
  kMinY = 1,
  kMaxX = 2,
  kMaxY = 3,
  kSignedArea = 4,
  kArea = 5,
  kCentroidX = 6,
  kCentroidY = 7,
  kIxx = 8,  ///< second moments about the centroid, over the area
  kIxy = 9,
  kIyy = 10,
  kHolesSignedArea = 11,  ///< then the six that follow it above, of holes
  kOuterSignedArea = 18,  ///< and of outer rings
  kPerimeter = 25,
  kHolesPerimeter = 26,
  kOuterPerimeter = 27,
};

/// Base of the polygons of all coordinate types, which share one type code.
class VEXG_EXPORT Polygon2DObject : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;
};

/// A shape with holes, its label and its measures. Exists for std::uint32_t, std::int32_t, double.
///
/// The measures of a closed ring with vertices (x_i, y_i) are sums over its edges, in double, with
/// c_i = x_i y_(i+1) - x_(i+1) y_i (Steger, On the calculation of arbitrary moments of polygons,
/// 1996): signed area A = sum c_i / 2, centroid and second moments over A. They are computed when
/// one is asked for, all at once, and kept until the shape changes. Where A is below 1e-10,
/// centroid and moments are 0; so they are for holes alone, whose area is negative.
///
/// Threads: one at a time, readers included, since measures are filled in when they are read.
/// Failure: a polygon without a ring, or of arrays that do not fit each other, holds
///          PolygonErrorBadPolygon.
///
///     Polygon2D<double> square({{{{0, 0}, {4, 0}, {4, 4}, {0, 4}, {0, 0}}}}, 7);
///     const double area = square.Measure(PolygonMeasure::kArea);            // 16
///     const double perimeter = square.Measure(PolygonMeasure::kPerimeter);  // 16
template <typename T>
class Polygon2D : public Polygon2DObject {
 public:
  static constexpr unsigned kMeasures = 28;

  /// A polygon without a ring.
  Polygon2D() { SetErrorState(PolygonErrorBadPolygon()); }
  /// @param rings  the outer ring and its holes, closed for the measures to have a meaning.
  explicit Polygon2D(Contour2DArray<T> rings, double label = 0);
  /// A polygon of arrays, as files hold it.
  /// @param holes        for each ring, whether it is a hole.
  /// @param starts       for each ring, the index of its first vertex; ascending from 0.
  /// @param coordinates  x, y of all vertices.
  Polygon2D(double label, const Array<bool>& holes, const Array<unsigned>& starts,
            const Array<T>& coordinates);
  /// The same shape in another coordinate type; towards integers each value v becomes
  /// floor(v + 0.5).
  template <typename U>
  explicit Polygon2D(const Polygon2D<U>& other);

  /// The rings, in the order in which they were given.
  const Contour2DArray<T>& Rings() const { return rings_; }
  /// The label, as a number that a double holds.
  double Label() const { return label_[0].value; }
  void SetLabel(double label) { label_[0] = {label, 6, true}; }
  /// Replaces the shape; its measures are forgotten.
  void SetRings(Contour2DArray<T> rings);

  /// A measure by its place, 0 to 27; 0 for another.
  double Measure(unsigned index) const;
  double Measure(PolygonMeasure measure) const { return Measure(static_cast<unsigned>(measure)); }
  /// True when a measure is at hand.
  bool HasMeasure(unsigned index) const { return index < kMeasures && measures_[index].valid; }

  /// Turns the shape by an angle in radians, from x towards y, about a point.
  void Rotate(double angle, const Point2D<double>& about);
  /// Multiplies all coordinates.
  void Scale(double factorX, double factorY);
  /// Moves the shape. All measures stay but the bounding box and the centroids.
  void Translate(double byX, double byY);
  /// Lets each ring that doesn't end where it began do so.
  void CloseRings();

  /// The convex hull of the outer rings, one closed ring from its lowest point on by growing angle
  /// (Graham, An efficient algorithm for determining the convex hull, 1972). Points within 1e-10 of
  /// each other's angle count as one, the farther.
  Polygon2D ConvexHull() const;
  /// The bounding box as a closed ring.
  Polygon2D BoundingRectangle() const;

 private:
  void ForgetMeasures();
  void FillMeasures() const;
  template <typename Change>
  void Transform(Change&& change);
  void CheckRings();

  Contour2DArray<T> rings_;
  mutable std::array<Polygon2DAttribute, kMeasures> measures_;
  std::array<Polygon2DAttribute, 1> label_{{{0, 6, true}}};
};

template <typename T>
using Polygon2DPtr = Pointer<Polygon2D<T>>;

extern template class VEXG_EXPORT Polygon2D<std::uint32_t>;
extern template class VEXG_EXPORT Polygon2D<std::int32_t>;
extern template class VEXG_EXPORT Polygon2D<double>;

}  // namespace lumo
