#include "mosaic/seam_generator.h"

#include <algorithm>
#include <cmath>
#include <random>

#include <gtest/gtest.h>

#include "geometry/polygon_clip.h"
#include "mosaic/seam_geometry.h"
#include "mosaic/seam_split.h"

namespace lumo {
namespace {

using Outline = Polygon2D<double>;
using Point = Point2D<double>;

constexpr unsigned kSide = 700;  // of the ground that is looked at, in pixels

/// For each pixel, whether its centre lies in a shape: by its crossings with the rings.
std::vector<bool> PixelsOf(const Outline& shape) {
  std::vector<bool> pixels(std::size_t{kSide} * kSide);
  for (unsigned y = 0; y < kSide; ++y) {
    std::vector<double> crossings;
    const double at = y + 0.5;
    for (const auto& ring : shape.Rings()) {
      for (std::size_t i = 0; i + 1 < ring.points.size(); ++i) {
        const Point &p = ring.points[i], &q = ring.points[i + 1];
        if ((p.y <= at) == (q.y <= at)) continue;
        crossings.push_back(p.x + (at - p.y) / (q.y - p.y) * (q.x - p.x));
      }
    }
    std::sort(crossings.begin(), crossings.end());
    for (std::size_t i = 0; i + 1 < crossings.size(); i += 2) {
      const double from = std::max(0.0, std::ceil(crossings[i] - 0.5));
      for (double x = from; x + 0.5 < crossings[i + 1] && x < kSide; ++x) {
        pixels[std::size_t{y} * kSide + static_cast<std::size_t>(x)] = true;
      }
    }
  }
  return pixels;
}

Contour2D<double> Ring(std::vector<Point> points, bool isHole = false) {
  points.push_back(points.front());
  return {std::move(points), isHole};
}

Outline Box(double x0, double y0, double x1, double y1) {
  return Outline({Ring({{x0, y0}, {x1, y0}, {x1, y1}, {x0, y1}})});
}

/// A four-sided scene, turned, with sides that are not quite straight.
Outline RandomScene(std::mt19937& random, double x, double y, double reach) {
  const auto between = [&](double low, double high) {
    return std::uniform_real_distribution<double>(low, high)(random);
  };
  const double width = between(0.7, 1) * reach, height = between(0.7, 1) * reach;
  const double turn = between(-0.4, 0.4);
  std::vector<Point> corners;
  const double unit[4][2] = {{-1, -1}, {1, -1}, {1, 1}, {-1, 1}};
  for (unsigned i = 0; i < 4; ++i) {
    for (const double along : {0.0, 0.3, 0.7}) {
      const double *const p = unit[i], *const q = unit[(i + 1) % 4];
      const double u = (p[0] + along * (q[0] - p[0])) * width / 2 + between(-3, 3);
      const double v = (p[1] + along * (q[1] - p[1])) * height / 2 + between(-3, 3);
      corners.push_back({x + u * std::cos(turn) - v * std::sin(turn),
                         y + u * std::sin(turn) + v * std::cos(turn)});
    }
  }
  Contour2DArray<double> rings{Ring(corners)};
  if (random() % 4 == 0) {  // a hole, within any seam's reach
    const double u = x + between(-0.2, 0.2) * reach, v = y + between(-0.2, 0.2) * reach;
    const double size = between(4, 0.08 * reach);
    rings.push_back(Ring({{u, v}, {u, v + size}, {u + size, v + size}, {u + size, v}}, true));
  }
  return Outline(std::move(rings), 1);
}

std::vector<Outline> RandomLayout(std::mt19937& random, unsigned count) {
  std::uniform_real_distribution<double> place(150, 550);
  std::vector<Outline> scenes;
  for (unsigned i = 0; i < count; ++i) {
    scenes.push_back(
        RandomScene(random, place(random), place(random), random() % 8 == 0 ? 45 : 210));
  }
  return scenes;
}

/// Boxes along the axes, whose edges often lie on each other, as those of scenes cut from one grid.
std::vector<Outline> AlignedLayout(std::mt19937& random, unsigned count) {
  std::vector<Outline> scenes;
  for (unsigned i = 0; i < count; ++i) {
    const double x = 50.0 * double(random() % 10), y = 50.0 * double(random() % 10);
    scenes.push_back(Box(x, y, x + 75 + 50.0 * double(random() % 3), y + 100));
  }
  return scenes;
}

bool Generate(SeamGenerator& seams) {
  return seams.CutPairs(IPC()) && seams.AssignRest(IPC());
}

TEST(SeamGenerator, PartsTileTheUnionOfRandomLayouts) {
  std::mt19937 random(41);
  std::size_t divided = 0, left = 0;
  for (unsigned round = 0; round < 40; ++round) {
    SCOPED_TRACE(round);
    const unsigned count = 2 + round % 29;
    const std::vector<Outline> scenes =
        round % 3 == 2 ? AlignedLayout(random, count) : RandomLayout(random, count);
    SeamGenerator seams(scenes);
    ASSERT_TRUE(Generate(seams));

    std::vector<std::vector<bool>> whole, parts;
    for (unsigned i = 0; i < count; ++i) {
      whole.push_back(PixelsOf(scenes[i]));
      parts.push_back(PixelsOf(seams.Parts()[i]));
    }
    std::vector<bool> mayBeBoth(whole[0].size());
    for (const LonePair& pair : seams.LeftAlone()) {
      for (std::size_t at = 0; at < mayBeBoth.size(); ++at) {
        mayBeBoth[at] = mayBeBoth[at] || (whole[pair.first][at] && whole[pair.second][at]);
      }
    }
    std::size_t ground = 0, nobodys = 0, outside = 0, twice = 0, overlapped = 0;
    for (std::size_t at = 0; at < mayBeBoth.size(); ++at) {
      unsigned covering = 0, showing = 0;
      for (unsigned i = 0; i < count; ++i) {
        covering += whole[i][at] ? 1 : 0;
        showing += parts[i][at] ? 1 : 0;
        outside += parts[i][at] && !whole[i][at] ? 1 : 0;
      }
      ground += covering != 0 ? 1 : 0;
      overlapped += covering > 1 ? 1 : 0;
      left += mayBeBoth[at] ? 1 : 0;
      nobodys += covering != 0 && showing == 0 ? 1 : 0;
      twice += showing > 1 && !mayBeBoth[at] ? 1 : 0;
    }
    EXPECT_LT(double(nobodys), 0.001 * double(ground));
    EXPECT_LT(double(outside), 0.001 * double(ground));
    EXPECT_LT(double(twice), 0.001 * double(ground)) << "of " << overlapped;
    divided += overlapped;
  }
  EXPECT_GT(divided, 500000U);
  EXPECT_LT(left, divided / 2);
}

double AreaOf(const Outline& outline) {
  return outline.Measure(PolygonMeasure::kArea);
}

TEST(SeamGenerator, ASeamFollowsTheMiddleOfTheOverlap) {
  const Outline large = Box(0, 0, 200, 200);
  const struct {
    const char* name;
    Outline a, b;
    std::vector<Point> taken;  // off a, by hand
    double common;
  } cases[] = {
      {"two corners on either side",
       large,
       Box(150, 140, 350, 340),
       {{200, 140}, {175, 165}, {175, 175}, {150, 200}, {200, 200}},
       50 * 60},
      // Bisectors meet in the centre of the circle within: area over half the circumference.
      {"a triangle",
       large,
       Outline({Ring({{120, 100}, {400, -100}, {400, 300}})}),
       {{200, 42.857142857}, {200 - 29.406738, 100}, {200, 157.142857143}},
       4571.428571},
      {"two corners on one side",
       large,
       Box(120, 50, 300, 150),
       {{200, 50}, {160, 90}, {160, 110}, {200, 150}},
       80 * 100},
  };
  for (const auto& c : cases) {
    for (const bool isTurned : {false, true}) {  // which scene comes first makes no difference
      SCOPED_TRACE(c.name);
      SeamGenerator seams(isTurned ? std::vector{c.b, c.a} : std::vector{c.a, c.b});
      ASSERT_TRUE(Generate(seams));
      EXPECT_TRUE(seams.LeftAlone().empty());
      const Outline &ofA = seams.Parts()[isTurned ? 1 : 0], &ofB = seams.Parts()[isTurned ? 0 : 1];
      const Outline taken({Ring(c.taken)});
      const Outline expected = Clip(ClipOperation::kDifference, c.a, taken);
      EXPECT_NEAR(AreaOf(ofA), AreaOf(expected), 0.1);
      EXPECT_NEAR(AreaOf(Clip(ClipOperation::kIntersection, ofA, expected)), AreaOf(expected), 0.1);
      EXPECT_NEAR(AreaOf(ofB), AreaOf(c.b) - c.common + AreaOf(taken), 0.1);
    }
  }
}

TEST(SeamGenerator, ScenesSideBySideKeepTheirOwnSide) {
  SeamGenerator seams({Box(0, 0, 200, 300), Box(140, 0, 340, 300)}, Form::kExact);
  ASSERT_TRUE(Generate(seams));
  const Outline mine = Clip(ClipOperation::kDifference, Box(0, 0, 140, 300), seams.Parts()[0]);
  EXPECT_LT(AreaOf(mine), 1);  // neither loses ground that it alone has, or gets its pieces back
  for (const Outline& part : seams.Parts()) EXPECT_EQ(part.Rings().size(), 1U);
}

TEST(SeamGenerator, LeavesPairsAloneByTheRules) {
  const Outline two({Ring({{0, 0}, {100, 0}, {100, 100}, {0, 100}}),
                     Ring({{0, 300}, {100, 300}, {100, 400}, {0, 400}})});
  const struct {
    const char* name;
    Outline a, b;
    int why;  // below 0: it isn't in the list
  } cases[] = {
      {"apart", Box(0, 0, 100, 100), Box(200, 0, 300, 100), -1},
      {"an edge in common", Box(0, 0, 100, 100), Box(100, 0, 200, 100), -1},
      {"nested", Box(0, 0, 100, 100), Box(20, 20, 80, 80), int(PairLeftAlone::kNested)},
      {"the same", Box(0, 0, 100, 100), Box(0, 0, 100, 100), int(PairLeftAlone::kNested)},
      {"9 pixels", Box(0, 0, 100, 100), Box(91, 91, 200, 200), int(PairLeftAlone::kTooThin)},
      {"several parts", two, Box(50, 50, 150, 350), int(PairLeftAlone::kSeveralParts)},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    SeamGenerator seams({c.a, c.b});
    ASSERT_TRUE(Generate(seams));
    EXPECT_EQ(seams.Parts()[0].Rings()[0].points, c.a.Rings()[0].points);
    EXPECT_NEAR(AreaOf(seams.Parts()[0]), AreaOf(c.a), 1e-6);
    EXPECT_NEAR(AreaOf(seams.Parts()[1]), AreaOf(c.b), 1e-6);
    ASSERT_EQ(seams.LeftAlone().size(), c.why < 0 ? 0U : 1U);
    if (c.why < 0) continue;
    EXPECT_EQ(int(seams.LeftAlone()[0].why), c.why);
  }
  SeamGenerator one({Box(0, 0, 9, 9)});
  ASSERT_TRUE(Generate(one));
  EXPECT_EQ(AreaOf(one.Parts()[0]), 81);
}

TEST(SeamGenerator, CrossingsInFourPointsAreCutAtTheFarthest) {
  // A cross: the arms of both stay, and the square in the middle is divided once.
  SeamGenerator seams({Box(0, 100, 300, 180), Box(120, 0, 200, 300)});
  ASSERT_TRUE(Generate(seams));
  EXPECT_TRUE(seams.LeftAlone().empty());
  const Outline both = Clip(ClipOperation::kIntersection, seams.Parts()[0], seams.Parts()[1]);
  EXPECT_LT(AreaOf(both), 1);
  EXPECT_NEAR(AreaOf(seams.Parts()[0]) + AreaOf(seams.Parts()[1]), 80 * 300 * 2 - 80 * 80, 5);
}

TEST(SeamGenerator, GroundThatIsCutOffGoesToTheFirstThatCoversIt) {
  // Three scenes round a point: what no pair leaves to anybody is given out.
  const std::vector<Outline> scenes{Box(0, 0, 200, 200), Box(100, 50, 320, 260),
                                    Box(40, 120, 260, 330)};
  SeamGenerator seams(scenes);
  ASSERT_TRUE(seams.CutPairs(IPC()));
  const double before = AreaOf(UnionOf(seams.Parts()));
  ASSERT_TRUE(seams.AssignRest(IPC()));
  const double covered = AreaOf(UnionOf(scenes));
  EXPECT_LT(before, covered + 1e-6);
  EXPECT_NEAR(AreaOf(UnionOf(seams.Parts())), covered, 3);
}

TEST(SeamGenerator, EndsOnAnAbort) {
  const IPC ipc;
  ipc.abort->Set(true);
  SeamGenerator seams({Box(0, 0, 100, 100), Box(50, 40, 150, 140)});
  EXPECT_FALSE(seams.CutPairs(ipc));
}

TEST(SeamGenerator, AThousandScenesAreCut) {
  std::mt19937 random(8);
  std::vector<Outline> scenes;
  double covered = 0;
  for (unsigned i = 0; i < 1000; ++i) {
    scenes.push_back(RandomScene(random, 300.0 * (i % 32), 300.0 * (i / 32), 420));
  }
  covered = AreaOf(UnionOf(scenes));
  SeamGenerator seams(scenes);
  ASSERT_TRUE(Generate(seams));
  double shown = 0;
  for (const Outline& part : seams.Parts()) shown += AreaOf(part);
  EXPECT_NEAR(AreaOf(UnionOf(seams.Parts())), covered, 0.001 * covered);
  for (const LonePair& pair : seams.LeftAlone()) {
    shown -= AreaOf(Clip(ClipOperation::kIntersection, scenes[pair.first], scenes[pair.second]));
  }
  EXPECT_NEAR(shown, covered, 0.001 * covered);
}

TEST(SeamGeometry, SpikesAndSmallRingsGo) {
  const auto cleaned = [](std::vector<Point> points) {
    Outline outline({Ring(std::move(points))});
    RemoveSpikes(outline, kSpikeAngle);
    return outline;
  };
  const Outline spiked =
      cleaned({{0, 0}, {50, 0}, {50, -4000}, {50.1, 0}, {100, 0}, {100, 100}, {0, 100}});
  EXPECT_EQ(AreaOf(spiked), 10000);
  EXPECT_EQ(spiked.Rings()[0].points.size(), 7U);  // both feet of the spike stay
  const Outline first =
      cleaned({{50, -4000}, {50.1, 0}, {100, 0}, {100, 100}, {0, 100}, {0, 0}, {50, 0}});
  EXPECT_EQ(AreaOf(first), 10000);
  // Blunt, or wide at its foot.
  EXPECT_EQ(cleaned({{0, 0}, {50, 0}, {50, -400}, {50.1, 0}, {100, 0}, {100, 100}, {0, 100}})
                .Rings()[0]
                .points.size(),
            8U);
  EXPECT_FALSE(cleaned({{0, 0}, {100, 0}, {50, 0}}).IsValid());

  Outline rings({Ring({{0, 0}, {9, 0}, {9, 9}, {0, 9}}),
                 Ring({{2, 2}, {2, 3}, {3, 3}, {3, 2}}, true),
                 Ring({{20, 0}, {22, 0}, {22, 1}, {20, 1}})});
  RemoveSmallRings(rings, 1.5);
  EXPECT_EQ(rings.Rings().size(), 2U);
  RemoveSmallRings(rings, 100);
  EXPECT_FALSE(rings.IsValid());
}

}  // namespace
}  // namespace lumo
