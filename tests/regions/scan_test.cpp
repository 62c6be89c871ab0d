#include <cmath>
#include <filesystem>
#include <random>

#include <nlohmann/json.hpp>

#include "regions/region_support.h"
#include "regions/shape_scan.h"
#include "support/sample_data.h"

namespace lumo {
namespace {

using test::Ring;

/// The mask of rows as '#' and '.', on a grid of `width` by `height`.
std::vector<std::string> Picture(const SpanRows& rows, int width, int height) {
  std::vector<std::string> picture;
  for (int y = 0; y < height; ++y) {
    picture.emplace_back();
    for (int x = 0; x < width; ++x) picture.back() += rows.Contains(x, y) ? '#' : '.';
  }
  return picture;
}

std::vector<std::string> Scan(const Ring& ring, ScanRules rules, int width, int height) {
  return Picture(ScanPolygon(ring, rules, height), width, height);
}

TEST(Scan, GivesTheSharedCases) {
  const std::string folder = test::SampleData("cases/scan");
  if (folder.empty()) GTEST_SKIP() << "no sample data";
  unsigned cases = 0;
  for (const auto& entry : std::filesystem::directory_iterator(folder)) {
    SCOPED_TRACE(entry.path().filename());
    const auto shapes = nlohmann::json::parse(std::ifstream(entry.path() / "geometry.json"));
    const auto expected = nlohmann::json::parse(std::ifstream(entry.path() / "case.json"));
    const Pointer<MemoryGeometry> geometry(new MemoryGeometry(CoordSys()));
    for (const auto& record : shapes["records"]) {
      std::uint32_t id = 0, part = 0;
      ASSERT_TRUE(geometry->AddRecord(record["kind"], id));
      for (const auto& ring : record["parts"]) {
        Ring points;
        for (const auto& point : ring["points"]) points.push_back({point[0], point[1]});
        ASSERT_TRUE(geometry->AddPart(id, ring["hole"], part, test::PointsOf(points)));
      }
    }
    const auto& box = expected["rect"];
    const SubRect rect(box[0], box[1], box[2], box[3]);
    const auto want = expected["rows"].get<std::vector<std::string>>();
    for (const ScanRules rules : {ScanRules::kSteady, ScanRules::kTold}) {
      const RasterizedROIPtr region =
          RasterizeOn(ROIDefPtr(new GeometryROIDef(geometry, {rules, ShapeCoordinates::kTold})),
                      rect.right + 1, rect.bottom + 1, {});
      const bool differs =
          rules == ScanRules::kTold && entry.path().filename().string().starts_with("09");
      EXPECT_EQ(test::RowsOf(*region, rect) == want, !differs)
          << testing::PrintToString(test::RowsOf(*region, rect));
    }
    ++cases;
  }
  EXPECT_GE(cases, 10U);
}

TEST(Scan, KeepsTheLowerSideOfFlatPieces) {
  const std::vector<std::string> square{"###.", "###.", "###.", "...."};
  const Ring ring{{0.5, 0.5}, {2.5, 0.5}, {2.5, 2.5}, {0.5, 2.5}};
  for (const ScanRules rules : {ScanRules::kTold, ScanRules::kSteady}) {
    EXPECT_EQ(Scan(ring, rules, 4, 4), square);
    EXPECT_EQ(Scan(Ring(ring.rbegin(), ring.rend()), rules, 4, 4), square);
  }
}

/// A random ring around (20, 20) that does not cross itself, its vertices on, near or off the grid.
Ring RandomRing(std::mt19937& random) {
  std::uniform_real_distribution<double> part(0, 1);
  const auto count = static_cast<unsigned>(3 + random() % 12);
  std::vector<double> angles(count);
  for (double& angle : angles) angle = part(random) * 2 * M_PI;
  std::sort(angles.begin(), angles.end());
  const unsigned form = random() % 4;
  Ring ring;
  for (const double angle : angles) {
    const double radius = 2 + 17 * part(random);
    Point2D<double> at{20 + radius * std::cos(angle), 20 + radius * std::sin(angle)};
    if (form == 1) at = {std::floor(at.x), std::floor(at.y)};
    if (form == 2) at = {std::floor(at.x) + 0.5, std::floor(at.y) + 0.5};
    if (form == 3) at = {std::floor(at.x) + 0.00005, std::floor(at.y) - 0.00005};
    ring.push_back(at);
  }
  if (random() % 2 == 0) std::reverse(ring.begin(), ring.end());
  if (random() % 4 == 0) ring.push_back(ring.front());
  return ring;
}

double DistanceToSegment(Point2D<double> p, Point2D<double> a, Point2D<double> b) {
  const double dx = b.x - a.x, dy = b.y - a.y;
  const double length = dx * dx + dy * dy;
  const double t =
      length == 0 ? 0 : std::clamp(((p.x - a.x) * dx + (p.y - a.y) * dy) / length, 0.0, 1.0);
  return std::hypot(p.x - a.x - t * dx, p.y - a.y - t * dy);
}

/// Even-odd rule.
bool IsInside(Point2D<double> p, const Ring& ring) {
  bool inside = false;
  for (std::size_t i = 0; i < ring.size(); ++i) {
    const Point2D<double> a = ring[i], b = ring[(i + 1) % ring.size()];
    if ((a.y > p.y) != (b.y > p.y) && p.x < a.x + (p.y - a.y) / (b.y - a.y) * (b.x - a.x)) {
      inside = !inside;
    }
  }
  return inside;
}

TEST(Scan, FillsWhatLiesAwayFromTheEdges) {
  for (unsigned seed = 0; seed < 3000; ++seed) {
    std::mt19937 random(seed);
    const Ring ring = RandomRing(random);
    const auto picture = Scan(ring, ScanRules::kSteady, 40, 40);
    for (int y = 0; y < 40; ++y) {
      for (int x = 0; x < 40; ++x) {
        const Point2D<double> centre{x + 0.5, y + 0.5};
        double distance = 1e9;
        for (std::size_t i = 0; i < ring.size(); ++i) {
          distance =
              std::min(distance, DistanceToSegment(centre, ring[i], ring[(i + 1) % ring.size()]));
        }
        if (distance < 1.5) continue;
        const auto row = static_cast<std::size_t>(y), column = static_cast<std::size_t>(x);
        ASSERT_EQ(picture[row][column] == '#', IsInside(centre, ring))
            << "seed " << seed << " at " << x << ", " << y << "\n"
            << testing::PrintToString(picture) << testing::PrintToString(ring.size());
      }
    }
  }
}

TEST(Scan, KeepsTheMaskOfAPolygonMovedByWholePixels) {
  for (unsigned seed = 0; seed < 20000; ++seed) {
    std::mt19937 random(seed);
    const Ring ring = RandomRing(random);
    const auto still = Scan(ring, ScanRules::kSteady, 42, 42);
    const int dx = static_cast<int>(random() % 3000), dy = static_cast<int>(random() % 3000);
    Ring moved = ring;
    for (Point2D<double>& point : moved) point = {point.x + dx, point.y + dy};
    const SpanRows rows = ScanPolygon(moved, ScanRules::kSteady, 4000);
    for (int y = 0; y < 42; ++y) {
      for (int x = 0; x < 42; ++x) {
        const auto row = static_cast<std::size_t>(y), column = static_cast<std::size_t>(x);
        ASSERT_EQ(rows.Contains(x + dx, y + dy), still[row][column] == '#')
            << "seed " << seed << " moved by " << dx << ", " << dy << " at " << x << ", " << y;
      }
    }
  }
}

TEST(Scan, TakesRingsThatAreNone) {
  EXPECT_TRUE(ScanPolygon({}, ScanRules::kTold, 9).IsEmpty());
  for (const ScanRules rules : {ScanRules::kTold, ScanRules::kSteady}) {
    EXPECT_EQ(Scan({{1.5, 1.5}}, rules, 4, 3), std::vector<std::string>({"....", "....", "...."}));
    EXPECT_EQ(Scan({{1.5, 1.5}, {1.5, 1.5}, {1.5, 1.5}}, rules, 4, 3),
              std::vector<std::string>({"....", "....", "...."}));
    // There and back again: the pixels of the line, down to before its end.
    EXPECT_EQ(Scan({{1.5, 0.5}, {1.5, 2.5}}, rules, 4, 3)[1], ".#..");
  }
  EXPECT_FALSE(AreScannable({{0, 0}, {std::nan(""), 1}, {2, 2}}));
  EXPECT_FALSE(AreScannable({{0, 0}, {HUGE_VAL, 1}, {2, 2}}));
  EXPECT_FALSE(AreScannable({{0, 0}, {1, -1e300}, {2, 2}}));
}

TEST(Scan, TakesPolygonsThatReachFarOutside) {
  // A wedge of a million millions of rows, whose left side passes x = 0 at y = 0 with slope 1e-3.
  const SpanRows rows =
      ScanPolygon({{-1e9, -1e12}, {1e9, 1e12}, {3e9, 1e12}}, ScanRules::kSteady, 1000);
  ASSERT_EQ(rows.FirstRow(), 0);
  ASSERT_EQ(rows.LastRow(), 999);
  for (const std::int64_t row : {0, 499, 999}) {
    ASSERT_EQ(rows.End(row) - rows.Begin(row), 1);
    EXPECT_NEAR(rows.Begin(row)->first, static_cast<double>(row) / 1000, 1.5);
    EXPECT_NEAR(rows.Begin(row)->last, 1e9 + static_cast<double>(row) / 500, 2e5);
  }
}

TEST(Scan, TakesAnyNumbersThatAreScannable) {
  const double values[] = {0,    -0.0, 1e-300, 0.5,  -0.5,   1,       49.99995,     3e4,
                           -3e4, 1e9,  -1e9,   1e12, 4.4e15, -4.4e15, 2147483648.5, -0.00005};
  for (unsigned seed = 0; seed < 4000; ++seed) {
    std::mt19937 random(seed);
    Ring ring(1 + random() % 8);
    for (Point2D<double>& point : ring) {
      point = {values[random() % std::size(values)], values[random() % std::size(values)]};
      if (random() % 2 == 0) point.x += static_cast<double>(random() % 100) / 7;
    }
    ASSERT_TRUE(AreScannable(ring));
    for (const SpanRows& rows :
         {ScanPolygon(ring, ScanRules::kTold, 50), ScanPolygon(ring, ScanRules::kSteady, 50),
          ScanCenters(ring, 50), ScanTouched(ring, false, 50), ScanTouched(ring, true, 50),
          ScanTouchedLine(ring, 50), ScanLine(ring, 50), ScanPoints(ring, 50)}) {
      if (rows.IsEmpty()) continue;
      ASSERT_LT(rows.LastRow(), 50) << "seed " << seed;
      ASSERT_GE(rows.FirstRow(), 0) << "seed " << seed;
      for (std::int64_t row = 0; row < 50; ++row) {
        for (auto span = rows.Begin(row); span != rows.End(row); ++span) {
          ASSERT_LE(span->first, span->last) << "seed " << seed;
        }
      }
    }
  }
}

/// The pixels of a line, step by step.
std::vector<std::string> Drawn(const Ring& line, int width, int height) {
  std::vector<std::string> picture(static_cast<std::size_t>(height),
                                   std::string(static_cast<std::size_t>(width), '.'));
  const auto put = [&](long x, long y) {
    if (x >= 0 && x < width && y >= 0 && y < height) {
      picture[static_cast<std::size_t>(y)][static_cast<std::size_t>(x)] = '#';
    }
  };
  for (std::size_t i = 0; i < line.size(); ++i) {
    long x0 = std::lround(std::floor(line[i].x + 0.01)),
         y0 = std::lround(std::floor(line[i].y + 0.01));
    put(x0, y0);
    if (i + 1 == line.size()) break;
    long x1 = std::lround(std::floor(line[i + 1].x + 0.01)),
         y1 = std::lround(std::floor(line[i + 1].y + 0.01));
    if (y1 < y0) std::swap(x0, x1), std::swap(y0, y1);
    const long dx = std::labs(x1 - x0), dy = y1 - y0, step = x1 < x0 ? -1 : 1;
    long err = dx - dy;
    while (true) {
      put(x0, y0);
      if (x0 == x1 && y0 == y1) break;
      const long twice = 2 * err;
      if (twice > -dy) err -= dy, x0 += step;
      if (twice < dx) err += dx, ++y0;
    }
  }
  return picture;
}

TEST(Scan, DrawsLinesAsBresenham) {
  for (unsigned seed = 0; seed < 3000; ++seed) {
    std::mt19937 random(seed);
    std::uniform_real_distribution<double> place(-15, 45);
    Ring line(1 + random() % 5);
    for (Point2D<double>& point : line) point = {place(random), place(random)};
    if (seed % 5 == 0) {
      for (Point2D<double>& point : line) point = {std::round(point.x), std::round(point.y)};
    }
    ASSERT_EQ(Picture(ScanLine(line, 30), 30, 30), Drawn(line, 30, 30)) << "seed " << seed;
  }
  // From far above to far below, through (0, 0) to (10, 1000).
  const SpanRows rows = ScanLine({{-1e10, -1e12}, {1e10, 1e12}}, 1000);
  EXPECT_EQ(rows.LastRow(), 999);
  EXPECT_TRUE(rows.Contains(0, 0));
  EXPECT_TRUE(rows.Contains(10, 999));
}

TEST(Scan, PutsPointsNearALineOfTheGridBeyondIt) {
  const SpanRows rows = ScanPoints({{1.2, 1.2}, {3.995, 2.5}, {-0.3, 2}, {11.9, 11.9}}, 12);
  EXPECT_TRUE(rows.Contains(1, 1));
  EXPECT_TRUE(rows.Contains(4, 2));
  EXPECT_TRUE(rows.Contains(-1, 2));
  EXPECT_TRUE(rows.Contains(11, 11));
  EXPECT_FALSE(rows.Contains(0, 2));
}

/// Whether a segment passes through the inside of the square of a pixel: Liang and Barsky's
/// clipping.
bool Enters(Point2D<double> a, Point2D<double> b, double left, double top) {
  double from = 0, to = 1;
  const auto clip = [&](double start, double delta, double low) {
    if (delta == 0) return start > low && start < low + 1;
    double t0 = (low - start) / delta, t1 = (low + 1 - start) / delta;
    if (t0 > t1) std::swap(t0, t1);
    from = std::max(from, t0);
    to = std::min(to, t1);
    return from < to;
  };
  return clip(a.x, b.x - a.x, left) && clip(a.y, b.y - a.y, top);
}

TEST(Scan, KeepsTheCommonRulesOfCentresAndTouchedAreas) {
  for (unsigned seed = 0; seed < 1500; ++seed) {
    std::mt19937 random(seed);
    Ring ring = RandomRing(random);
    if (seed % 3 == 0) {  // crossing itself
      std::shuffle(ring.begin(), ring.end(), random);
    }
    // Away from the centres, so that nothing hangs on the borders between pixels.
    for (Point2D<double>& point : ring) point = {point.x + 0.00123, point.y + 0.00217};
    const auto centers = Picture(ScanCenters(ring, 40), 40, 40);
    const auto touched = Picture(ScanTouched(ring, false, 40), 40, 40);
    const auto hole = Picture(ScanTouched(ring, true, 40), 40, 40);
    const auto line = Picture(ScanTouchedLine(ring, 40), 40, 40);
    for (std::size_t y = 0; y < 40; ++y) {
      for (std::size_t x = 0; x < 40; ++x) {
        const double left = static_cast<double>(x), top = static_cast<double>(y);
        bool isOnLine = false;
        for (std::size_t i = 0; i + 1 < ring.size(); ++i) {
          isOnLine = isOnLine || Enters(ring[i], ring[i + 1], left, top);
        }
        const bool isOnBorder = isOnLine || Enters(ring.back(), ring.front(), left, top);
        const bool isIn = IsInside({left + 0.5, top + 0.5}, ring);
        ASSERT_EQ(centers[y][x] == '#', isIn) << "seed " << seed << " at " << x << ", " << y;
        ASSERT_EQ(touched[y][x] == '#', isIn || isOnBorder) << "seed " << seed;
        ASSERT_EQ(hole[y][x] == '#', isIn && !isOnBorder) << "seed " << seed;
        ASSERT_EQ(line[y][x] == '#', isOnLine) << "seed " << seed << " at " << x << ", " << y;
      }
    }
  }
  // A polygon along the grid touches no pixel beyond it, and no centre belongs to two neighbours.
  const Ring left{{1, 1}, {2.5, 1}, {2.5, 3.5}, {1, 3.5}},
      right{{2.5, 1}, {4, 1}, {4, 3.5}, {2.5, 3.5}};
  EXPECT_EQ(Picture(ScanTouched(left, false, 5), 5, 5),
            std::vector<std::string>({".....", ".##..", ".##..", ".##..", "....."}));
  EXPECT_EQ(Picture(ScanCenters(left, 5), 5, 5),
            std::vector<std::string>({".....", ".##..", ".##..", ".....", "....."}));
  EXPECT_EQ(Picture(ScanCenters(right, 5), 5, 5),
            std::vector<std::string>({".....", "...#.", "...#.", ".....", "....."}));
}

TEST(SpanRows, PutPartsTogetherInTheirOrder) {
  for (unsigned seed = 0; seed < 500; ++seed) {
    std::mt19937 random(seed);
    std::vector<SpanRows> rows(1 + random() % 5);
    std::vector<PartRows> parts;
    std::vector<std::string> want(20, std::string(30, '.'));
    for (SpanRows& one : rows) {
      const int first = static_cast<int>(random() % 15);
      parts.push_back({&one, parts.empty() ? false : random() % 3 == 0});
      one.Start(first);
      for (int y = first; y < 15 + static_cast<int>(random() % 5); ++y) {
        for (unsigned i = random() % 4; i != 0; --i) {
          const std::size_t from = random() % 30,
                            to = std::min<std::size_t>(29, from + random() % 9);
          one.Add(static_cast<std::int64_t>(from), static_cast<std::int64_t>(to));
          for (std::size_t x = from; x <= to; ++x) {
            want[static_cast<std::size_t>(y)][x] = parts.back().isHole ? '.' : '#';
          }
        }
        one.EndRow();
      }
    }
    ASSERT_EQ(Picture(CombineRows(parts), 30, 20), want) << "seed " << seed;
  }
}

}  // namespace
}  // namespace lumo
