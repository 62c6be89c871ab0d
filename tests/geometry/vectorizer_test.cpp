#include <map>
#include <random>
#include <set>
#include <string>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

#include "geometry/label_vectorizer.h"
#include "raster/raster_enums.h"

namespace lumo {
namespace {

struct Labels {
  unsigned width = 0;
  unsigned height = 0;
  std::vector<std::int32_t> pixels;
  std::vector<unsigned char> states;

  Labels(unsigned w, unsigned h, std::int32_t label = 0)
      : width(w), height(h), pixels(std::size_t{w} * h, label), states(pixels.size()) {}
  std::int32_t& At(unsigned x, unsigned y) { return pixels[std::size_t{y} * width + x]; }
  unsigned char& StateAt(unsigned x, unsigned y) { return states[std::size_t{y} * width + x]; }
};

struct TracedShape {
  std::int32_t label;
  TracedPolygon rings;
};

class Collect final : public LabelPolygonSink {
 public:
  bool Take(double label, TracedPolygon& polygon) override {
    shapes.push_back({static_cast<std::int32_t>(label), polygon});
    return shapes.size() < stopAt;
  }
  std::vector<TracedShape> shapes;
  std::size_t stopAt = SIZE_MAX;
};

std::vector<TracedShape> Vectorize(const Labels& labels) {
  Collect sink;
  LabelVectorizer<std::int32_t> vectorizer(labels.width, sink);
  for (unsigned y = 0; y < labels.height; ++y) {
    const std::size_t at = std::size_t{y} * labels.width;
    EXPECT_TRUE(vectorizer.AddLine(labels.pixels.data() + at, labels.states.data() + at));
  }
  EXPECT_TRUE(vectorizer.Finish());
  return sink.shapes;
}

/// Areas of equal labels whose pixels share sides, by flooding: the number of each pixel's area,
/// -1 for an excluded one.
std::vector<int> Flood(const Labels& labels, int& count) {
  std::vector<int> areas(labels.pixels.size(), -1);
  const auto counts = [&](std::size_t at) {
    return labels.states[at] == 0 && labels.pixels[at] != std::numeric_limits<std::int32_t>::max();
  };
  count = 0;
  for (std::size_t seed = 0; seed < areas.size(); ++seed) {
    if (areas[seed] >= 0 || !counts(seed)) continue;
    std::vector<std::size_t> open{seed};
    areas[seed] = count;
    while (!open.empty()) {
      const std::size_t at = open.back();
      open.pop_back();
      const std::size_t x = at % labels.width, y = at / labels.width;
      const auto visit = [&](std::size_t next) {
        if (areas[next] >= 0 || !counts(next) || labels.pixels[next] != labels.pixels[at]) return;
        areas[next] = count;
        open.push_back(next);
      };
      if (x > 0) visit(at - 1);
      if (x + 1 < labels.width) visit(at + 1);
      if (y > 0) visit(at - labels.width);
      if (y + 1 < labels.height) visit(at + labels.width);
    }
    ++count;
  }
  return areas;
}

/// Twice the area of a ring; positive where it runs clockwise on axes that run right and down.
std::int64_t TwiceArea(const TracedPolygon& rings, std::size_t ring) {
  const std::size_t end = ring + 1 < rings.starts.size() ? rings.starts[ring + 1] * std::size_t{2}
                                                         : rings.coordinates.size();
  std::int64_t sum = 0;
  for (std::size_t at = rings.starts[ring] * std::size_t{2}; at + 3 < end; at += 2) {
    const std::int64_t x0 = rings.coordinates[at], y0 = rings.coordinates[at + 1];
    const std::int64_t x1 = rings.coordinates[at + 2], y1 = rings.coordinates[at + 3];
    sum += x0 * y1 - x1 * y0;
  }
  return sum;
}

/// Looks at the rings of a polygon for themselves: closed, with turning points only, the first one
/// around an area and the others around holes.
void CheckRings(const TracedShape& shape) {
  const TracedPolygon& rings = shape.rings;
  ASSERT_EQ(rings.holes.size(), rings.starts.size());
  for (std::size_t ring = 0; ring < rings.starts.size(); ++ring) {
    EXPECT_EQ(rings.holes[ring] != 0, ring != 0);
    EXPECT_EQ(TwiceArea(rings, ring) < 0, ring != 0);
    const std::size_t begin = rings.starts[ring];
    const std::size_t end =
        ring + 1 < rings.starts.size() ? rings.starts[ring + 1] : rings.coordinates.size() / 2;
    ASSERT_GE(end - begin, 5U);
    const auto x = [&](std::size_t i) { return rings.coordinates[2 * i]; };
    const auto y = [&](std::size_t i) { return rings.coordinates[2 * i + 1]; };
    ASSERT_TRUE(x(begin) == x(end - 1) && y(begin) == y(end - 1));
    bool wasLevel = y(end - 2) == y(end - 1);
    for (std::size_t i = begin; i + 1 < end; ++i) {
      const bool isLevel = y(i) == y(i + 1);
      ASSERT_NE(isLevel, x(i) == x(i + 1)) << "an edge of no length, or aslant";
      ASSERT_NE(isLevel, wasLevel) << "a point at which nothing turns";
      wasLevel = isLevel;
    }
  }
}

/// Fills each polygon again, by the parity of its upright edges to the left of a pixel, and
/// compares with the areas that flooding finds.
void CheckAgainstFlood(const Labels& labels) {
  int count = 0;
  const std::vector<int> areas = Flood(labels, count);
  const std::vector<TracedShape> shapes = Vectorize(labels);
  ASSERT_EQ(shapes.size(), static_cast<std::size_t>(count));
  std::vector<int> filled(areas.size(), -1);
  for (std::size_t number = 0; number < shapes.size(); ++number) {
    const TracedShape& shape = shapes[number];
    CheckRings(shape);
    std::map<unsigned, std::vector<unsigned>> crossings;  // of each line, unordered
    for (std::size_t ring = 0; ring < shape.rings.starts.size(); ++ring) {
      const std::size_t end = ring + 1 < shape.rings.starts.size()
                                  ? shape.rings.starts[ring + 1]
                                  : shape.rings.coordinates.size() / 2;
      for (std::size_t i = shape.rings.starts[ring]; i + 1 < end; ++i) {
        const unsigned* const edge = shape.rings.coordinates.data() + 2 * i;
        if (edge[0] != edge[2]) continue;
        for (unsigned y = std::min(edge[1], edge[3]); y < std::max(edge[1], edge[3]); ++y) {
          crossings[y].push_back(edge[0]);
        }
      }
    }
    for (auto& [y, line] : crossings) {
      std::sort(line.begin(), line.end());
      ASSERT_EQ(line.size() % 2, 0U);
      for (std::size_t i = 0; i < line.size(); i += 2) {
        for (unsigned x = line[i]; x < line[i + 1]; ++x) {
          const std::size_t at = std::size_t{y} * labels.width + x;
          ASSERT_EQ(filled[at], -1) << "a pixel in two polygons";
          ASSERT_EQ(labels.pixels[at], shape.label);
          filled[at] = static_cast<int>(number);
        }
      }
    }
  }
  std::map<int, int> polygonOf;
  for (std::size_t at = 0; at < areas.size(); ++at) {
    ASSERT_EQ(areas[at] < 0, filled[at] < 0);
    if (areas[at] < 0) continue;
    ASSERT_EQ(polygonOf.emplace(areas[at], filled[at]).first->second, filled[at]);
  }
}

TEST(Vectorizer, FindsTheAreasOfRandomRasters) {
  std::mt19937 random(7);
  for (int round = 0; round < 300; ++round) {
    const unsigned width = 1 + random() % (round % 10 == 0 ? 200 : 20);
    Labels labels(width, 1 + random() % 20);
    const unsigned kinds = 1 + random() % 4;
    for (auto& pixel : labels.pixels) pixel = static_cast<std::int32_t>(random() % kinds) - 1;
    if (round % 3 == 0) {
      for (auto& state : labels.states) state = random() % 8 == 0 ? PixelValueState::NotValid : 0;
    }
    if (round % 5 == 0) labels.pixels[random() % labels.pixels.size()] = INT32_MAX;
    CheckAgainstFlood(labels);
    if (testing::Test::HasFatalFailure()) FAIL() << "in round " << round;
  }
}

TEST(Vectorizer, NestedAndWindingAreasHoldTogether) {
  Labels nested(41, 41);
  for (unsigned ring = 0; ring < 20; ++ring) {
    for (unsigned y = ring; y < 41 - ring; ++y) {
      for (unsigned x = ring; x < 41 - ring; ++x) nested.At(x, y) = static_cast<int>(ring);
    }
  }
  CheckAgainstFlood(nested);

  Labels spiral(101, 101);
  unsigned left = 1, top = 1, right = 99, bottom = 99;
  while (left + 2 < right && top + 2 < bottom) {
    for (unsigned x = left; x <= right; ++x) spiral.At(x, top) = 1;
    for (unsigned y = top; y <= bottom; ++y) spiral.At(right, y) = 1;
    for (unsigned x = left; x <= right; ++x) spiral.At(x, bottom) = 1;
    for (unsigned y = top + 2; y <= bottom; ++y) spiral.At(left, y) = 1;
    if (left + 2 < right) spiral.At(left + 1, top + 2) = 1;
    left += 2, top += 2, right -= 2, bottom -= 2;
  }
  CheckAgainstFlood(spiral);

  Labels board(64, 63);
  for (unsigned y = 0; y < 63; ++y) {
    for (unsigned x = 0; x < 64; ++x) board.At(x, y) = static_cast<int>((x + y) % 2);
  }
  CheckAgainstFlood(board);
  EXPECT_EQ(Vectorize(board).size(), 64U * 63U);
}

// Each of these takes for ever, or overflows the stack, where a ring is walked to see whether it is
// closed, or holes are emitted by recursion.
TEST(Vectorizer, LongBoundariesAndManyHolesCostWhatTheyAre) {
  constexpr unsigned kSide = 2000;
  Labels stairs(kSide, kSide);
  for (unsigned y = 0; y < kSide; ++y) {
    for (unsigned x = y; x < kSide; ++x) stairs.At(x, y) = 1;
  }
  std::size_t vertices = 0;
  for (const TracedShape& shape : Vectorize(stairs)) vertices += shape.rings.coordinates.size() / 2;
  EXPECT_EQ(vertices, 4 * kSide + 4);

  Labels comb(kSide + 1, kSide);  // one boundary that goes up and down on every second column
  for (unsigned y = 1; y < kSide; ++y) {
    for (unsigned x = 1; x <= kSide; x += 2) comb.At(x, y) = 1;
  }
  for (unsigned x = 0; x <= kSide; ++x) comb.At(x, kSide - 1) = 1;
  EXPECT_EQ(Vectorize(comb).size(), 2U);

  constexpr unsigned kHoles = 5000;
  Labels holes(2 * kHoles + 1, 3);
  for (unsigned hole = 0; hole < kHoles; ++hole) holes.At(2 * hole + 1, 1) = 1;
  const std::vector<TracedShape> shapes = Vectorize(holes);
  ASSERT_EQ(shapes.size(), kHoles + 1);
  EXPECT_EQ(shapes.back().rings.starts.size(), kHoles + 1);
}

TEST(Vectorizer, OddLabelsAreExcludedAndASinkStops) {
  Collect sink;
  LabelVectorizer<float> vectorizer(3, sink);
  const float line[] = {2, NAN, 2};
  EXPECT_TRUE(vectorizer.AddLine(line, nullptr));
  EXPECT_TRUE(vectorizer.Finish());
  EXPECT_EQ(sink.shapes.size(), 2U);

  Collect stops;
  stops.stopAt = 1;
  LabelVectorizer<std::uint8_t> stopped(3, stops);
  const std::uint8_t three[] = {1, 255, 3};
  EXPECT_TRUE(stopped.AddLine(three, nullptr));
  EXPECT_FALSE(stopped.Finish());
  EXPECT_EQ(stops.shapes.size(), 1U);
}

}  // namespace
}  // namespace lumo
