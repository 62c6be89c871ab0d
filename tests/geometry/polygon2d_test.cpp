#include "geometry/polygon2d.h"

#include <cmath>
#include <functional>
#include <geos_c.h>
#include <memory>
#include <numbers>
#include <random>

#include <gtest/gtest.h>

#include "geometry/polygon_errors.h"

namespace lumo {
namespace {

using M = PolygonMeasure;

/// A square of 10 with a hole of 2 by 4 in it, clockwise on axes that run right and down.
Contour2DArray<double> HollowFrame() {
  return {{{{0, 0}, {10, 0}, {10, 10}, {0, 10}, {0, 0}}, false},
          {{{1, 1}, {1, 5}, {3, 5}, {3, 1}, {1, 1}}, true}};
}

TEST(Polygon2D, MeasuresFollowFromRectangles) {
  const Polygon2D<double> frame(HollowFrame(), 5);
  EXPECT_EQ(frame.Label(), 5);
  EXPECT_FALSE(frame.HasMeasure(4));
  EXPECT_DOUBLE_EQ(frame.Measure(M::kSignedArea), 92);
  EXPECT_TRUE(frame.HasMeasure(27));
  EXPECT_DOUBLE_EQ(frame.Measure(M::kHolesSignedArea), -8);
  EXPECT_DOUBLE_EQ(frame.Measure(12), 8);
  EXPECT_DOUBLE_EQ(frame.Measure(M::kOuterSignedArea), 100);
  // Centroid by composition: square about (5, 5), hole about (2, 3).
  const double cx = (100 * 5.0 - 8 * 2.0) / 92, cy = (100 * 5.0 - 8 * 3.0) / 92;
  EXPECT_NEAR(frame.Measure(M::kCentroidX), cx, 1e-12);
  EXPECT_NEAR(frame.Measure(M::kCentroidY), cy, 1e-12);
  // Second moments by the theorem of parallel axes; a rectangle's own is side^2 / 12.
  const double ixx = (100 * (100 / 12.0 + 25) - 8 * (4 / 12.0 + 4)) / 92 - cx * cx;
  const double iyy = (100 * (100 / 12.0 + 25) - 8 * (16 / 12.0 + 9)) / 92 - cy * cy;
  const double ixy = (100 * 25.0 - 8 * 6.0) / 92 - cx * cy;
  EXPECT_NEAR(frame.Measure(M::kIxx), ixx, 1e-12);
  EXPECT_NEAR(frame.Measure(M::kIyy), iyy, 1e-12);
  EXPECT_NEAR(frame.Measure(M::kIxy), ixy, 1e-12);
  for (unsigned moment = 13; moment < 18; ++moment) EXPECT_EQ(frame.Measure(moment), 0);
  EXPECT_NEAR(frame.Measure(20), 5, 1e-12);
  EXPECT_DOUBLE_EQ(frame.Measure(M::kPerimeter), 52);
  EXPECT_DOUBLE_EQ(frame.Measure(M::kHolesPerimeter), 12);
  EXPECT_DOUBLE_EQ(frame.Measure(M::kOuterPerimeter), 40);
  EXPECT_EQ(frame.Measure(28), 0);
}

/// A ring about (0, 0) whose corners lie at growing angles and random distances.
Point2DArray<double> Star(std::mt19937& random, double nearest, double farthest, bool backwards) {
  std::uniform_real_distribution<double> distance(nearest, farthest);
  Point2DArray<double> ring;
  const int corners = 5 + static_cast<int>(random() % 40);
  for (int i = 0; i < corners; ++i) {
    const double angle = (backwards ? -2 : 2) * std::numbers::pi * i / corners;
    const double length = distance(random);
    ring.push_back({1000 + length * std::cos(angle), -500 + length * std::sin(angle)});
  }
  ring.push_back(ring.front());
  return ring;
}

TEST(Polygon2D, MeasuresAreThoseOfGeos) {
  const std::unique_ptr<GEOSContextHandle_HS, decltype(&GEOS_finish_r)> context(GEOS_init_r(),
                                                                                &GEOS_finish_r);
  GEOSContextHandle_t const geos = context.get();
  using Shape = std::unique_ptr<GEOSGeometry, std::function<void(GEOSGeometry*)>>;
  const auto own = [&](GEOSGeometry* made) {
    return Shape(made, [geos](GEOSGeometry* shape) { GEOSGeom_destroy_r(geos, shape); });
  };
  const auto ringOf = [&](const Point2DArray<double>& points) {
    GEOSCoordSequence* const sequence =
        GEOSCoordSeq_create_r(geos, static_cast<unsigned>(points.size()), 2);
    for (unsigned i = 0; i < points.size(); ++i) {
      GEOSCoordSeq_setXY_r(geos, sequence, i, points[i].x, points[i].y);
    }
    return GEOSGeom_createLinearRing_r(geos, sequence);
  };
  std::mt19937 random(11);
  for (int round = 0; round < 200; ++round) {
    const Contour2DArray<double> rings{{Star(random, 50, 90, false), false},
                                       {Star(random, 5, 25, true), true}};
    const Polygon2D<double> polygon(rings);
    GEOSGeometry* hole = ringOf(rings[1].points);
    const Shape shape = own(GEOSGeom_createPolygon_r(geos, ringOf(rings[0].points), &hole, 1));
    double area = 0, length = 0, x = 0, y = 0, hullArea = 0;
    GEOSArea_r(geos, shape.get(), &area);
    GEOSLength_r(geos, shape.get(), &length);
    const Shape centroid = own(GEOSGetCentroid_r(geos, shape.get()));
    GEOSGeomGetX_r(geos, centroid.get(), &x);
    GEOSGeomGetY_r(geos, centroid.get(), &y);
    GEOSArea_r(geos, own(GEOSConvexHull_r(geos, shape.get())).get(), &hullArea);
    EXPECT_NEAR(polygon.Measure(M::kSignedArea), area, 1e-6);
    EXPECT_NEAR(polygon.Measure(M::kPerimeter), length, 1e-8);
    EXPECT_NEAR(polygon.Measure(M::kCentroidX), x, 1e-6);
    EXPECT_NEAR(polygon.Measure(M::kCentroidY), y, 1e-6);
    EXPECT_NEAR(polygon.ConvexHull().Measure(M::kArea), hullArea, 1e-6);
  }
}

TEST(Polygon2D, MovesKeepWhatStaysTrue) {
  Polygon2D<double> frame(HollowFrame());
  const double ixx = frame.Measure(M::kIxx);
  frame.Translate(-3, 4);
  EXPECT_TRUE(frame.HasMeasure(static_cast<unsigned>(M::kIxx)));
  for (unsigned index : {0U, 3U, 6U, 7U, 13U, 14U, 20U, 21U}) EXPECT_FALSE(frame.HasMeasure(index));
  EXPECT_EQ(frame.Measure(M::kMinX), -3);
  EXPECT_NEAR(frame.Measure(M::kIxx), ixx, 1e-12);
  frame.Scale(2, 1);
  EXPECT_DOUBLE_EQ(frame.Measure(M::kSignedArea), 184);
  frame.Rotate(std::numbers::pi / 2, {0, 0});
  EXPECT_NEAR(frame.Measure(M::kSignedArea), 184, 1e-9);
  EXPECT_NEAR(frame.Measure(M::kMinX), -14, 1e-12);
  EXPECT_NEAR(frame.Measure(M::kMaxY), 14, 1e-12);
}

TEST(Polygon2D, HullLeavesOutHolesAndPointsWithin) {
  const Polygon2D<std::uint32_t> shape(
      {{{{5, 0}, {5, 5}, {10, 5}, {10, 10}, {0, 10}, {0, 3}, {5, 0}}, false},
       {{{1, 8}, {1, 9}, {2, 9}, {2, 8}, {1, 8}}, true}});
  const Polygon2D<std::uint32_t> hull = shape.ConvexHull();
  ASSERT_EQ(hull.Rings().size(), 1U);
  const Point2DArray<std::uint32_t> expected{{5, 0}, {10, 5}, {10, 10}, {0, 10}, {0, 3}, {5, 0}};
  EXPECT_EQ(hull.Rings()[0].points, expected);
  EXPECT_GT(hull.Measure(M::kSignedArea), 0);
  EXPECT_EQ(shape.BoundingRectangle().Measure(M::kArea), 100);
  EXPECT_FALSE(Polygon2D<double>().ConvexHull().IsValid());
}

TEST(Polygon2D, BadArraysMakeNoPolygon) {
  Array<bool> holes{ArrayDims(2)};
  holes[0] = false;
  holes[1] = true;
  Array<unsigned> starts{ArrayDims(2)};
  starts[0] = 0;
  starts[1] = 3;
  Array<double> coordinates{ArrayDims(12)};
  for (unsigned i = 0; i < 12; ++i) coordinates[i] = i;
  EXPECT_TRUE(Polygon2D<double>(1, holes, starts, coordinates).IsValid());
  for (const unsigned start : {0U, 6U, 4000000000U}) {
    starts[1] = start;
    const Polygon2D<double> bad(1, holes, starts, coordinates);
    EXPECT_EQ(bad.GetErrorState().code, PolygonErrorBadPolygon::Code) << start;
  }
  EXPECT_EQ(Polygon2D<double>().GetErrorState().code, PolygonErrorBadPolygon::Code);
  const Polygon2D<double> odd({{{{-0.6, 1.5}, {2.4, 9e9}}, false}});
  const Polygon2D<std::int32_t> whole(odd);
  EXPECT_EQ(whole.Rings()[0].points[0], (Point2D<std::int32_t>{-1, 2}));
  EXPECT_EQ(whole.Rings()[0].points[1].y, INT32_MAX);
}

}  // namespace
}  // namespace lumo
