#include "geometry/polygon_clip.h"

#include <cmath>
#include <geos_c.h>
#include <limits>
#include <random>

#include <gtest/gtest.h>

#include "foundation/errors.h"

namespace lumo {
namespace {

using Shape = Polygon2D<double>;
constexpr double kPi = 3.14159265358979323846;

Shape Box(double x0, double y0, double x1, double y1) {
  return Shape({{{{x0, y0}, {x1, y0}, {x1, y1}, {x0, y1}, {x0, y0}}}});
}

double AreaOf(const Shape& shape) {
  return shape.Measure(PolygonMeasure::kArea);
}

/// A closed star of random spikes round a point.
Contour2D<double> Star(std::mt19937& random, double x, double y, double inner, double outer,
                       bool isHole) {
  std::uniform_real_distribution<double> radius(inner, outer);
  const unsigned count = 3 + random() % 30;
  Contour2D<double> ring;
  ring.hole = isHole;
  for (unsigned i = 0; i < count; ++i) {
    const double angle = 2 * kPi * (isHole ? count - i : i) / count, r = radius(random);
    ring.points.push_back({x + r * std::cos(angle), y + r * std::sin(angle)});
  }
  ring.points.push_back(ring.points.front());
  return ring;
}

/// One or two separate stars, some with a hole.
Shape RandomShape(std::mt19937& random) {
  std::uniform_real_distribution<double> place(900, 1100);
  Contour2DArray<double> rings;
  const double x = place(random), y = place(random);
  rings.push_back(Star(random, x, y, 40, 100, false));
  if (random() % 2 == 0) rings.push_back(Star(random, x, y, 5, 15, true));  // within any star
  if (random() % 3 == 0) rings.push_back(Star(random, x + 300, y, 30, 90, false));
  return Shape(std::move(rings), 5);
}

/// Shapes of the other library, that compares.
class Geos {
 public:
  Geos() : context_(GEOS_init_r()) {}
  ~Geos() {
    for (GEOSGeometry* geometry : made_) GEOSGeom_destroy_r(context_, geometry);
    GEOS_finish_r(context_);
  }

  /// The area by which `found` differs from what the other library makes of two shapes.
  double Difference(ClipOperation operation, const Shape& a, const Shape& b, const Shape& found) {
    const auto* const x = Make(a);
    const auto* const y = Make(b);
    const auto* const expected =
        Keep(operation == ClipOperation::kDifference     ? GEOSDifference_r(context_, x, y)
             : operation == ClipOperation::kIntersection ? GEOSIntersection_r(context_, x, y)
                                                         : GEOSUnion_r(context_, x, y));
    double area = -1;
    GEOSArea_r(context_, Keep(GEOSSymDifference_r(context_, expected, Make(found))), &area);
    return area;
  }

 private:
  GEOSGeometry* Keep(GEOSGeometry* geometry) {
    made_.push_back(geometry);
    return geometry;
  }

  /// Each ring a polygon; those of holes are taken off the rest.
  const GEOSGeometry* Make(const Shape& shape) {
    GEOSGeometry* all = Keep(GEOSGeom_createEmptyPolygon_r(context_));
    for (const bool isHole : {false, true}) {
      for (const Contour2D<double>& ring : shape.Rings()) {
        if (ring.hole != isHole) continue;
        auto* const points =
            GEOSCoordSeq_create_r(context_, static_cast<unsigned>(ring.points.size()), 2);
        for (unsigned i = 0; i < ring.points.size(); ++i) {
          GEOSCoordSeq_setXY_r(context_, points, i, ring.points[i].x, ring.points[i].y);
        }
        GEOSGeometry* const polygon = GEOSGeom_createPolygon_r(
            context_, GEOSGeom_createLinearRing_r(context_, points), nullptr, 0);
        const GEOSGeometry* const whole = Keep(GEOSMakeValid_r(context_, Keep(polygon)));
        all = Keep(isHole ? GEOSDifference_r(context_, all, whole)
                          : GEOSUnion_r(context_, all, whole));
      }
    }
    return all;
  }

  GEOSContextHandle_t context_;
  std::vector<GEOSGeometry*> made_;
};

TEST(PolygonClip, AreasOfRandomShapesAddUp) {
  std::mt19937 random(17);
  for (int round = 0; round < 150; ++round) {
    SCOPED_TRACE(round);
    const Shape a = RandomShape(random), b = RandomShape(random);
    const Shape both = Clip(ClipOperation::kIntersection, a, b);
    const Shape onlyA = Clip(ClipOperation::kDifference, a, b);
    const Shape either = Clip(ClipOperation::kUnion, a, b);
    EXPECT_NEAR(AreaOf(onlyA) + AreaOf(both), AreaOf(a), 0.5);
    EXPECT_NEAR(AreaOf(either), AreaOf(a) + AreaOf(b) - AreaOf(both), 0.5);
    const std::vector<Shape> shapes{a, b};
    EXPECT_NEAR(AreaOf(UnionOf(shapes)), AreaOf(either), 0.5);
    Geos geos;
    EXPECT_LT(geos.Difference(ClipOperation::kIntersection, a, b, both), 0.5);
    EXPECT_LT(geos.Difference(ClipOperation::kDifference, a, b, onlyA), 0.5);
    EXPECT_LT(geos.Difference(ClipOperation::kUnion, a, b, either), 0.5);
    for (const Shape* const shape : {&both, &onlyA, &either}) {
      EXPECT_EQ(shape->Label(), 5);
      for (const Contour2D<double>& ring : shape->Rings()) {
        EXPECT_EQ(ring.points.front(), ring.points.back());
        EXPECT_EQ(Shape({ring}).Measure(PolygonMeasure::kSignedArea) < 0, ring.hole);
      }
    }
  }
}

TEST(PolygonClip, ManyShapesAtOnceAreThoseOneByOne) {
  std::mt19937 random(23);
  for (int round = 0; round < 40; ++round) {
    std::vector<Shape> shapes(2 + random() % 30);
    Shape all;
    for (Shape& shape : shapes) {
      shape = RandomShape(random);
      // Parts that share borders, as those that seams leave.
      if (all.IsValid() && round % 2 == 0) shape = Clip(ClipOperation::kDifference, shape, all);
      all = Clip(ClipOperation::kUnion, all, shape);
    }
    EXPECT_NEAR(AreaOf(UnionOf(shapes)), AreaOf(all), 1) << round;
  }
}

TEST(PolygonClip, AThousandthOfAPixelSurvives) {
  for (const double far : {0.0, 70000.0, 3e6}) {
    const Shape strip = Clip(ClipOperation::kDifference, Box(far, 0, far + 1000, 1000),
                             Box(far + 0.001, -1, far + 1001, 1001));
    EXPECT_NEAR(AreaOf(strip), 1, 0.3) << far;
    const Shape speck = Clip(ClipOperation::kIntersection, Box(far, 0, far + 1, 1),
                             Box(far + 0.999, 0.999, far + 2, 2));
    EXPECT_NEAR(AreaOf(speck), 1e-6, 4e-7) << far;
  }
}

TEST(PolygonClip, EmptyAndDegenerateShapesHaveAnOutcome) {
  const Shape box = Box(0, 0, 10, 10), none;
  EXPECT_FALSE(Clip(ClipOperation::kIntersection, box, none).IsValid());
  EXPECT_FALSE(Clip(ClipOperation::kIntersection, box, Box(10, 0, 20, 10)).IsValid());
  EXPECT_FALSE(Clip(ClipOperation::kDifference, box, Box(-1, -1, 11, 11)).IsValid());
  EXPECT_FALSE(Clip(ClipOperation::kDifference, none, box).IsValid());
  EXPECT_EQ(AreaOf(Clip(ClipOperation::kDifference, box, none)), 100);
  EXPECT_EQ(AreaOf(Clip(ClipOperation::kUnion, none, box)), 100);
  EXPECT_FALSE(UnionOf({}).IsValid());

  const Shape line({{{{0, 0}, {5, 5}, {0, 0}}}}), point({{{{3, 3}}}});
  for (const Shape* const flat : {&line, &point}) {
    EXPECT_EQ(AreaOf(Clip(ClipOperation::kDifference, box, *flat)), 100);
    EXPECT_FALSE(Clip(ClipOperation::kIntersection, box, *flat).IsValid());
  }
  // A ring that crosses itself, and one that is there twice: what is inside an even number of times
  // is outside.
  const Shape bow({{{{0, 0}, {10, 10}, {10, 0}, {0, 10}, {0, 0}}}});
  EXPECT_EQ(AreaOf(Clip(ClipOperation::kIntersection, box, bow)), 50);
  const Shape twice({box.Rings()[0], box.Rings()[0]});
  EXPECT_FALSE(Clip(ClipOperation::kIntersection, box, twice).IsValid());

  for (const double wrong : {1e13, HUGE_VAL, std::numeric_limits<double>::quiet_NaN()}) {
    const Shape lost = Clip(ClipOperation::kUnion, box, Box(0, 0, wrong, 1));
    EXPECT_EQ(lost.GetErrorState().code, ObjectErrorNotConstructed::Code);
  }
}

TEST(PolygonClip, TheLargestRingComesFirst) {
  const Shape comb(
      {{{{0, 0}, {9, 0}, {9, 20}, {6, 20}, {6, 5}, {3, 5}, {3, 10}, {0, 10}, {0, 0}}}});
  const Shape teeth = Clip(ClipOperation::kIntersection, comb, Box(-1, 6, 10, 30));
  ASSERT_EQ(teeth.Rings().size(), 2U);
  EXPECT_EQ(AreaOf(Shape({teeth.Rings()[0]})), 3 * 14);
  EXPECT_EQ(AreaOf(Shape({teeth.Rings()[1]})), 3 * 4);
}

}  // namespace
}  // namespace lumo
