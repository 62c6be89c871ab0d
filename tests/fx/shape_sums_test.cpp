#include "fx/shape_sums.h"

#include <cmath>
#include <filesystem>
#include <geos_c.h>
#include <map>
#include <random>

#include "commands/catalog.h"
#include "foundation/fault.h"
#include "fx/region_kinds.h"
#include "geometry/fxv_file.h"
#include "geometry/label_vectorizer.h"
#include "support/file_bytes.h"
#include "support/run_command.h"
#include "support/temporary_directory.h"
#include "support/test_rasters.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using Spatial = SpatialRegionAttributes;
using Values = ShapeSums::Values;

/// Polygons by label, in the order of the vectorizer.
struct Polygons final : LabelPolygonSink {
  Polygons(const std::vector<std::int32_t>& labels, std::uint32_t width) {
    LabelVectorizer<std::int32_t> vectorizer(width, *this);
    for (std::size_t at = 0; at < labels.size(); at += width) {
      vectorizer.AddLine(labels.data() + at, nullptr);
    }
    vectorizer.Finish();
  }
  bool Take(double label, TracedPolygon& polygon) override {
    found.emplace_back(static_cast<std::int32_t>(label), polygon);
    return true;
  }
  /// The first polygon of a label.
  const TracedPolygon& Of(std::int32_t label) const {
    for (const auto& [other, polygon] : found) {
      if (other == label) return polygon;
    }
    return found.front().second;
  }

  std::vector<std::pair<std::int32_t, TracedPolygon>> found;
};

Polygon2D<double> Doubled(const TracedPolygon& polygon) {
  Contour2DArray<double> rings;
  for (std::size_t ring = 0; ring < polygon.starts.size(); ++ring) {
    const std::size_t end = ring + 1 < polygon.starts.size() ? polygon.starts[ring + 1]
                                                             : polygon.coordinates.size() / 2;
    rings.emplace_back();
    rings.back().hole = polygon.holes[ring] != 0;
    for (std::size_t i = polygon.starts[ring]; i < end; ++i) {
      rings.back().points.push_back({static_cast<double>(polygon.coordinates[2 * i]),
                                     static_cast<double>(polygon.coordinates[2 * i + 1])});
    }
  }
  return Polygon2D<double>(std::move(rings));
}

/// The attributes step by step, in doubles: move, hull, scale, measure, turn.
Values SlowValues(const TracedPolygon& traced, const PixelSize& size) {
  using M = PolygonMeasure;
  Polygon2D<double> polygon = Doubled(traced);
  polygon.Translate(-polygon.Measure(M::kMinX), -polygon.Measure(M::kMinY));
  Polygon2D<double> hull = polygon.ConvexHull();
  polygon.Scale(size.x, size.y);
  hull.Scale(size.x, size.y);
  const double area = polygon.Measure(M::kArea), length = polygon.Measure(M::kPerimeter);
  // The seven measures of outer rings follow each other.
  const auto outer = [&](M measure) {
    return polygon.Measure(static_cast<unsigned>(measure) + 14);
  };
  const double outerArea = outer(M::kArea), outerLength = polygon.Measure(M::kOuterPerimeter);
  const double xx = outer(M::kIxx), yy = outer(M::kIyy), xy = outer(M::kIxy);
  const double d = xx - yy, s = std::sqrt(4 * xy * xy + d * d);
  const double theta = std::atan2(1.0, (d + s) / (2 * xy + 1e-20));
  Polygon2D<double> turned = polygon;
  turned.Rotate(-theta, {outer(M::kCentroidX), outer(M::kCentroidY)});
  const double width = turned.Measure(M::kMaxX) - turned.Measure(M::kMinX);
  const double height = turned.Measure(M::kMaxY) - turned.Measure(M::kMinY);
  const double major = std::max(width, height), minor = std::min(width, height);
  double angle = width > height ? theta : theta - M_PI / 2;
  if (angle < 0) angle += M_PI;
  return {area,
          length,
          std::sqrt(4 * outerArea / M_PI) / outerLength,
          length / hull.Measure(M::kPerimeter),
          area / hull.Measure(M::kArea),
          4 * area / (M_PI * major * major),
          4 * M_PI * area / (length * length),
          major / minor,
          area / (minor * major),
          angle * 180 / M_PI,
          major,
          minor,
          static_cast<double>(polygon.Rings().size()) - 1,
          area / outerArea,
          1};
}

Values ValuesOf(const TracedPolygon& polygon, const PixelSize& size) {
  ShapeSums shape;
  shape.Add(polygon, size);
  return shape.GetValues(size, false);
}

/// Blobs of few labels, of which some have holes.
std::vector<std::int32_t> MakeBlobs(unsigned width, unsigned height, unsigned seed) {
  std::mt19937 random(seed);
  std::vector<std::int32_t> labels(std::size_t{width} * height);
  for (std::size_t i = 0; i < labels.size(); ++i) {
    const unsigned from = random() % 10;
    if (from < 4 && i % width != 0) {
      labels[i] = labels[i - 1];
    } else if (from < 8 && i >= width) {
      labels[i] = labels[i - width];
    } else {
      labels[i] = static_cast<std::int32_t>(random() % 9);
    }
  }
  return labels;
}

TEST(ShapeSums, HaveTheValuesOfTheFormulas) {
  const Polygons polygons(MakeBlobs(90, 70, 1), 90);
  ASSERT_GT(polygons.found.size(), 500U);
  std::size_t holes = 0;
  for (const PixelSize& size : {PixelSize{1, 1}, PixelSize{2.5, 0.75}}) {
    for (const auto& [label, polygon] : polygons.found) {
      const Values got = ValuesOf(polygon, size), want = SlowValues(polygon, size);
      holes += got[Spatial::kHoleCount] > 0 ? 1 : 0;
      // Where the sides of the box are equal but for rounding, either may be the longer one.
      const bool isTie = want[Spatial::kElongation] < 1 + 1e-9;
      for (unsigned i = 0; i < Spatial::kAttributes; ++i) {
        if (isTie && i == Spatial::kMainDirection) continue;
        EXPECT_NEAR(got[i], want[i], 1e-9 * std::max(1.0, std::abs(want[i]))) << i;
      }
    }
  }
  EXPECT_GT(holes, 10U);
}

TEST(ShapeSums, AgreeWithGeos) {
  const Polygons polygons(MakeBlobs(60, 50, 2), 60);
  GEOSContextHandle_t geos = GEOS_init_r();
  for (const auto& [label, polygon] : polygons.found) {
    const Polygon2D<double> doubled = Doubled(polygon);
    std::vector<GEOSGeometry*> rings;
    for (const auto& ring : doubled.Rings()) {
      GEOSCoordSequence* const points =
          GEOSCoordSeq_create_r(geos, static_cast<unsigned>(ring.points.size()), 2);
      for (unsigned i = 0; i < ring.points.size(); ++i) {
        GEOSCoordSeq_setXY_r(geos, points, i, ring.points[i].x * 3, ring.points[i].y * 2);
      }
      rings.push_back(GEOSGeom_createLinearRing_r(geos, points));
    }
    GEOSGeometry* const shape = GEOSGeom_createPolygon_r(geos, rings[0], rings.data() + 1,
                                                         static_cast<unsigned>(rings.size() - 1));
    GEOSGeometry* const hull = GEOSConvexHull_r(geos, shape);
    double area = 0, length = 0, hullArea = 0, hullLength = 0;
    GEOSArea_r(geos, shape, &area);
    GEOSLength_r(geos, shape, &length);
    GEOSArea_r(geos, hull, &hullArea);
    GEOSLength_r(geos, hull, &hullLength);
    const Values got = ValuesOf(polygon, {3, 2});
    EXPECT_DOUBLE_EQ(got[Spatial::kArea], area);
    EXPECT_DOUBLE_EQ(got[Spatial::kPerimeter], length);
    EXPECT_NEAR(got[Spatial::kSolidity], area / hullArea, 1e-12);
    EXPECT_NEAR(got[Spatial::kConvexity], length / hullLength, 1e-12);
    GEOSGeom_destroy_r(geos, hull);
    GEOSGeom_destroy_r(geos, shape);
  }
  GEOS_finish_r(geos);
}

TEST(ShapeSums, StayWhenARegionMovesByWholePixels) {
  const Polygons polygons(MakeBlobs(40, 40, 3), 40);
  const PixelSize size{28.5, 30};
  for (const auto& [label, polygon] : polygons.found) {
    TracedPolygon moved = polygon;
    for (std::size_t i = 0; i < moved.coordinates.size(); i += 2) {
      moved.coordinates[i] += 123'456'789;
      moved.coordinates[i + 1] += 987'654'321;
    }
    EXPECT_EQ(ValuesOf(moved, size), ValuesOf(polygon, size));
  }
}

TEST(ShapeSums, OfLevelRectanglesAreExact) {
  const struct {
    std::uint32_t width, height;
    PixelSize size;
    double degrees, elongation;
  } cases[] = {{5, 3, {1, 1}, 0, 5 / 3.0},
               {3, 5, {1, 1}, 90, 5 / 3.0},
               {4, 4, {1, 1}, 0, 1},
               {4, 4, {1e-5, 1e-5}, 0, 1},
               {7, 6, {1e-7, 1e-7}, 0, 7 / 6.0},
               {6, 7, {1e-7, 1e-7}, 90, 7 / 6.0},
               {6, 4, {0.1, 0.15}, 0, 1},
               {1, 1, {28.5, 28.5}, 0, 1},
               {1, 1'000'000, {30, 30}, 90, 1e6},
               {1'000'000, 999'999, {30, 30}, 0, 1e6 / 999'999},
               {2'000'000'000, 2'000'000'000, {1, 1}, 0, 1},
               {3, 3, {1, 2}, 90, 2}};
  for (const auto& c : cases) {
    const std::uint32_t x = 1000, y = 77, right = x + c.width, bottom = y + c.height;
    const TracedPolygon rectangle{
        {0}, {0}, {right, bottom, x, bottom, x, y, right, y, right, bottom}};
    const Values got = ValuesOf(rectangle, c.size);
    SCOPED_TRACE(std::to_string(c.width) + " x " + std::to_string(c.height));
    EXPECT_EQ(got[Spatial::kMainDirection], c.degrees);
    EXPECT_NEAR(got[Spatial::kElongation], c.elongation, 1e-15 * c.elongation * 4);
    EXPECT_EQ(static_cast<float>(got[Spatial::kElongation]), static_cast<float>(c.elongation));
    EXPECT_EQ(got[Spatial::kConvexity], 1);
    // Ratios of areas below 1e-10 are 0.
    EXPECT_EQ(got[Spatial::kSolidity], c.size.x > 1e-6 ? 1 : 0);
    EXPECT_EQ(got[Spatial::kHoleToSolidRatio], c.size.x > 1e-6 ? 1 : 0);
  }
}

TEST(ShapeSums, JoinPolygonsOfOneLabel) {
  // A square, and another one at its corner with a hole.
  const std::vector<std::int32_t> labels{1, 1, 0, 0, 0, 0,  //
                                         1, 1, 0, 0, 0, 0,  //
                                         0, 0, 1, 1, 1, 0,  //
                                         0, 0, 1, 0, 1, 0,  //
                                         0, 0, 1, 1, 1, 0};
  const Polygons polygons(labels, 6);
  ShapeSums together, other, all;
  for (const auto& [label, polygon] : polygons.found) {
    if (label != 1) continue;
    ShapeSums one;
    one.Add(polygon, {1, 1});
    together.Merge(one);
    one.Merge(other);
    other = one;
    all.Add(polygon, {1, 1});
  }
  const Values values = together.GetValues({1, 1}, true);
  EXPECT_EQ(values[Spatial::kArea], 12);
  EXPECT_EQ(values[Spatial::kPerimeter], 8 + 12 + 4);
  EXPECT_EQ(values[Spatial::kHoleCount], 1);
  EXPECT_EQ(values[Spatial::kSolidity], 12 / 19.0);  // the hull: 5 by 5 without two triangles of 3
  EXPECT_NEAR(values[Spatial::kMainDirection], 45, 1e-9);
  for (const Values& same : {other.GetValues({1, 1}, true), all.GetValues({1, 1}, true)}) {
    for (unsigned i = 0; i < same.size(); ++i) EXPECT_NEAR(same[i], values[i], 1e-12) << i;
  }
}

/// Labels in memory.
class LabelRaster final : public TestRaster<std::int32_t> {
 public:
  LabelRaster(unsigned width, std::vector<std::int32_t> labels)
      : TestRaster(width, static_cast<unsigned>(labels.size() / width), 1),
        labels_(std::move(labels)) {}

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<std::int32_t>& block, Array<unsigned char>& state) override {
    const ArrayDims dims = BlockDims(interleave, static_cast<unsigned>(rect.Width()),
                                     static_cast<unsigned>(rect.Height()), bands.GetCount());
    if (!block.Resize(dims) || !state.Resize(dims)) return false;
    std::fill(state.begin(), state.end(), 0);
    std::int32_t* to = block.begin();
    for (unsigned y = rect.top; y <= rect.bottom; ++y) {
      for (unsigned x = rect.left; x <= rect.right; ++x) {
        *to++ = labels_[std::size_t{y} * Samples() + x];
      }
    }
    return true;
  }

 private:
  std::vector<std::int32_t> labels_;
};

class VectorAttributes : public testing::Test {
 protected:
  std::string File(const char* name) const { return (directory_.Path() / name).string(); }

  void WriteFxv(const char* name, const Polygons& polygons) const {
    FxvPolygonWriter<std::int32_t, std::uint32_t> writer{URI(File(name))};
    for (const auto& [label, polygon] : polygons.found) {
      writer.WriteFlat(label, polygon.holes.size(), polygon.holes.data(), polygon.starts.data(),
                       polygon.coordinates.size(), polygon.coordinates.data());
    }
    EXPECT_TRUE(writer.Close());
  }

  test::TemporaryDirectory directory_;
};

TEST_F(VectorAttributes, OfAFileAndOfLabelsAreTheSame) {
  const std::vector<std::int32_t> labels = MakeBlobs(80, 60, 4);
  const Polygons polygons(labels, 80);
  WriteFxv("polygons", polygons);
  const Pointer<LabelRaster> raster(new LabelRaster(80, labels));
  catalog::Add(raster);
  for (const char* const parts : {"Told", "Together"}) {
    const std::map<std::string, std::string> inputs{
        {"SpatialFXA", File("a")}, {"PixelXSize", "-2"}, {"PixelYSize", "3"}, {"Parts", parts}};
    auto fromFile = inputs, fromLabels = inputs;
    fromFile["VectorFXV"] = File("polygons");
    fromLabels["LabelURI"] = "[" + raster->GetURI().ToUTF8() + "] ";
    auto outcome = test::RunCommand("FxComputeVectorAttributesCommand", fromFile);
    ASSERT_TRUE(outcome.Succeeded()) << outcome.reason;
    const std::string bytes = test::FileBytes(File("a"));
    const SpatialRegionAttributesFile file(URI(File("a")), false);
    std::map<std::int32_t, ShapeSums> shapes;
    for (const auto& [label, polygon] : polygons.found) {
      ShapeSums& shape = shapes[label];
      if (std::string(parts) == "Told") shape = {};  // the last one stays
      shape.Add(polygon, {2, 3});
    }
    for (const auto& [label, shape] : shapes) {
      const Values want = shape.GetValues({2, 3}, std::string(parts) == "Together");
      for (unsigned i = 0; i < want.size(); ++i) {
        EXPECT_FLOAT_EQ(file.Value(static_cast<unsigned>(label), 0, i),
                        static_cast<float>(want[i]));
      }
    }
    outcome = test::RunCommand("FxComputeVectorAttributesCommand", fromLabels);
    ASSERT_TRUE(outcome.Succeeded()) << outcome.reason;
    EXPECT_EQ(test::FileBytes(File("a")), bytes) << parts;
  }
}

TEST_F(VectorAttributes, EndInOneLineForBadInput) {
  WriteFxv("good", Polygons({1, 1, 2, 2}, 2));
  WriteFxv("negative", Polygons({1, 1, -2, -2}, 2));
  std::ofstream(File("foreign")) << std::string(2000, 'x');
  fs::copy_file(File("good"), File("short"));
  fs::resize_file(File("short"), fs::file_size(File("good")) - 4);
  const struct {
    std::map<std::string, std::string> inputs;
    const char* want;
  } cases[] = {{{{"VectorFXV", File("missing")}}, "missing"},
               {{{"VectorFXV", File("foreign")}}, "foreign"},
               {{{"VectorFXV", File("short")}}, "polygon 2 of 2"},
               {{{"VectorFXV", File("negative")}}, "label -2"},
               {{{"VectorFXV", File("good")}, {"PixelXSize", "0"}}, "PixelXSize"},
               {{{"VectorFXV", File("good")}, {"PixelYSize", "nan"}}, "PixelYSize"},
               {{{"VectorFXV", File("a")}}, "SpatialFXA too"},
               {{}, "VectorFXV"}};
  for (const auto& c : cases) {
    for (const char* const parts : {"Told", "Together"}) {
      auto inputs = c.inputs;
      inputs["SpatialFXA"] = File("a");
      inputs["Parts"] = parts;
      const auto outcome = test::RunCommand("FxComputeVectorAttributesCommand", inputs);
      EXPECT_FALSE(outcome.Succeeded());
      EXPECT_NE(outcome.reason.find(c.want), std::string::npos) << outcome.reason;
      EXPECT_FALSE(fs::exists(File("a"))) << c.want;
    }
  }
}

}  // namespace
}  // namespace lumo
