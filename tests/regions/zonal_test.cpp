#include <cmath>
#include <map>
#include <random>

#include "foundation/fault.h"
#include "regions/coverage_block.h"
#include "regions/region_support.h"
#include "regions/zonal_pass.h"
#include "support/placed_raster.h"

namespace lumo {
namespace {

using test::AddShape;
using test::Ring;

/// A star-shaped ring around a place.
Ring RingAround(std::mt19937& random, double x, double y, double radius) {
  std::uniform_real_distribution<double> part(0.3, 1);
  Ring ring;
  for (int i = 0; i < 9; ++i) {
    const double angle = i * 2 * M_PI / 9, far = radius * part(random);
    ring.push_back({x + far * std::cos(angle), y + far * std::sin(angle)});
  }
  return ring;
}

/// The area of a polygon's part inside a square, by Sutherland and Hodgman.
double AreaInSquare(Ring ring, double left, double top) {
  const auto cut = [&](auto inside, auto meet) {
    Ring kept;
    for (std::size_t i = 0; i < ring.size(); ++i) {
      const Point2D<double> a = ring[i], b = ring[(i + 1) % ring.size()];
      if (inside(a)) kept.push_back(a);
      if (inside(a) != inside(b)) kept.push_back(meet(a, b));
    }
    ring = kept;
  };
  const auto atX = [](double x) {
    return [x](Point2D<double> a, Point2D<double> b) {
      return Point2D<double>{x, a.y + (x - a.x) / (b.x - a.x) * (b.y - a.y)};
    };
  };
  const auto atY = [](double y) {
    return [y](Point2D<double> a, Point2D<double> b) {
      return Point2D<double>{a.x + (y - a.y) / (b.y - a.y) * (b.x - a.x), y};
    };
  };
  cut([&](Point2D<double> p) { return p.x >= left; }, atX(left));
  cut([&](Point2D<double> p) { return p.x <= left + 1; }, atX(left + 1));
  cut([&](Point2D<double> p) { return p.y >= top; }, atY(top));
  cut([&](Point2D<double> p) { return p.y <= top + 1; }, atY(top + 1));
  double area = 0;
  for (std::size_t i = 0; i < ring.size(); ++i) {
    const Point2D<double> a = ring[i], b = ring[(i + 1) % ring.size()];
    area += (a.x * b.y - b.x * a.y) / 2;
  }
  return std::abs(area);
}

TEST(CoverageBlock, GivesTheShareOfEachPixelInsideAPolygon) {
  for (unsigned seed = 0; seed < 200; ++seed) {
    std::mt19937 random(seed);
    Ring ring = RingAround(random, 12 + seed % 9, 11, 14), hole = RingAround(random, 12, 11, 3);
    if (seed % 2 == 0) std::reverse(ring.begin(), ring.end());
    if (seed % 3 == 0) std::reverse(hole.begin(), hole.end());
    if (seed % 5 == 0) {
      for (Point2D<double>& point : ring) point = {std::round(point.x), std::round(point.y)};
    }
    CoverageBlock block({4, 3, 15, 12});
    block.AddRing(ring, false);
    block.AddRing(hole, true);
    std::vector<double> shares;
    for (unsigned y = 0; y < 12; ++y) {
      block.GetLine(y, shares);
      for (unsigned x = 0; x < 15; ++x) {
        const double left = 4.0 + x, top = 3.0 + y;
        const double want = AreaInSquare(ring, left, top) - AreaInSquare(hole, left, top);
        if (AreaInSquare(hole, left, top) > 0 && want < 0) continue;  // the hole reaches out
        ASSERT_NEAR(shares[x], want, 1e-9) << "seed " << seed << " at " << x << ", " << y;
      }
    }
  }
}

/// The figures of weighted values by their definitions, with the weights 1 or others.
double Figure(const std::string& name, std::vector<std::pair<double, double>> values,
              bool isWeighted) {
  std::sort(values.begin(), values.end());
  double weight = 0, sum = 0, squares = 0;
  std::map<double, double> weightOf;
  for (const auto& [value, w] : values) weight += w, sum += w * value, weightOf[value] += w;
  if (name == "count") return weight;
  if (name == "variety") return static_cast<double>(weightOf.size());
  if (values.empty()) return std::nan("");
  for (const auto& [value, w] : values) squares += w * std::pow(value - sum / weight, 2);
  if (name == "min") return values.front().first;
  if (name == "max") return values.back().first;
  if (name == "mean") return sum / weight;
  if (name == "sum") return sum;
  if (name == "std") {
    const double divisor = isWeighted ? weight : weight - 1;
    return divisor > 0 ? std::sqrt(squares / divisor) : std::nan("");
  }
  if (name == "majority" || name == "minority") {
    const double sign = name == "majority" ? 1 : -1;
    auto best = weightOf.begin();
    for (auto at = best; at != weightOf.end(); ++at) {
      if (sign * at->second > sign * best->second + 1e-9) best = at;
    }
    return best->first;
  }
  const double percent = name == "median" ? 50 : std::stod(name.substr(1));
  if (!isWeighted) {
    const double rank = (static_cast<double>(values.size()) - 1) * percent / 100;
    const auto low = static_cast<std::size_t>(rank);
    const double high = values[std::min(low + 1, values.size() - 1)].first;
    return values[low].first + (rank - std::floor(rank)) * (high - values[low].first);
  }
  double below = 0;
  for (const auto& [value, w] : values) {
    below += w;
    if (below >= weight * percent / 100 * (1 - 1e-9)) return value;
  }
  return values.back().first;
}

template <typename T>
class ZonalPassTest : public testing::Test {};
using Types = testing::Types<std::uint8_t, std::int16_t, std::uint32_t, float, double>;
TYPED_TEST_SUITE(ZonalPassTest, Types);

TYPED_TEST(ZonalPassTest, GivesTheFiguresOfTheirDefinitions) {
  using T = TypeParam;
  std::mt19937 random(11);
  // Several blocks, two bands, invalid pixels, and NaN.
  constexpr unsigned kWidth = sizeof(T) == 1 ? 900 : 500, kHeight = sizeof(T) == 1 ? 700 : 400;
  const auto raster = MakePlaced<T>(
      MakeGrid(0, 0, 1, kWidth, kHeight), 2, [&](unsigned x, unsigned y, unsigned band) {
        if constexpr (std::is_floating_point_v<T>) {
          if (random() % 50 == 0) return std::numeric_limits<T>::quiet_NaN();
          return static_cast<T>(std::sin(x * 0.1) * 1e4 + y + band * 0.25);
        } else {
          const auto value = static_cast<std::int64_t>(x * x / 7 + y * 3 + band) % 251;
          return static_cast<T>(value * (sizeof(T) == 4   ? 8'000'000
                                         : sizeof(T) == 2 ? 100
                                                          : 1) -
                                (std::is_signed_v<T> ? 64 : 0));
        }
      });
  for (auto& state : raster->states) state = random() % 20 == 0 ? PixelValueState::NoData : 0;
  const auto shapes = test::MakeShapes({});
  AddShape(*shapes, {RingAround(random, kWidth / 2, kHeight / 2, 480),
                     RingAround(random, kWidth / 2, kHeight / 2, 60)});
  for (int i = 0; i < 30; ++i) {
    AddShape(*shapes,
             {RingAround(random, random() % kWidth, random() % kHeight, 3 + random() % 60)});
  }
  AddShape(*shapes, {RingAround(random, 3000, 30, 20)});            // off the raster
  AddShape(*shapes, {{{10.1, 10.1}, {10.3, 10.1}, {10.3, 10.3}}});  // no centre inside

  ZonalPlan plan;
  plan.geometry = shapes;
  plan.options.pixels = PixelRule::kCenter;
  plan.bands.Resize(ArrayDims(2));
  plan.bands[0] = 1;
  plan.bands[1] = 0;
  for (const char* name : {"count", "min", "max", "mean", "std", "sum", "median", "majority",
                           "minority", "variety", "p10", "p99.5"}) {
    plan.requests.emplace_back();
    ASSERT_TRUE(ParseZonalRequest(name, plan.requests.back()));
  }
  for (const ZonalWeights weights : {ZonalWeights::kNone, ZonalWeights::kCoverage}) {
    plan.weights = weights;
    const bool isWeighted = weights == ZonalWeights::kCoverage;
    ZonalPass<T> pass(raster, plan);
    ASSERT_TRUE(pass.Run(IPC())) << TakeFault().ToUTF8();
    ASSERT_EQ(pass.GetFigures().size(), shapes->RecordCount() * 2 * plan.requests.size());
    const double* figure = pass.GetFigures().data();
    for (unsigned zone = 0; zone < shapes->RecordCount(); ++zone) {
      // The weight of each pixel of the zone, one zone at a time over all of the raster.
      std::vector<SpanRows> rows;
      std::vector<PartRows> parts;
      double left = kWidth, top = kHeight, right = 0, bottom = 0;
      CoverageBlock coverage({0, 0, kWidth, kHeight});
      for (unsigned part = 0; part < shapes->PartCount(zone); ++part) {
        const auto points = shapes->Coordinates(zone, part);
        const ScanVertices vertices(points.begin(), points.end());
        rows.push_back(ScanCenters(vertices, kHeight));
        coverage.AddRing(vertices, part != 0);
        for (const Point2D<double>& vertex : vertices) {
          left = std::clamp(vertex.x - 2, 0.0, left),
          right = std::clamp(vertex.x + 2, right, 1.0 * kWidth);
          top = std::clamp(vertex.y - 2, 0.0, top),
          bottom = std::clamp(vertex.y + 2, bottom, 1.0 * kHeight);
        }
      }
      for (unsigned part = 0; part < rows.size(); ++part) parts.push_back({&rows[part], part != 0});
      const SpanRows all = CombineRows(parts);
      std::vector<double> shares;
      std::vector<std::pair<double, double>> values[2];
      for (auto y = static_cast<unsigned>(top); y < bottom; ++y) {
        coverage.GetLine(y, shares);
        for (auto x = static_cast<unsigned>(left); x < right; ++x) {
          const double weight = isWeighted ? shares[x] : all.Contains(x, y) ? 1 : 0;
          for (unsigned band = 0; band < 2 && weight > 0; ++band) {
            const std::size_t at = raster->At(x, y, band);
            const auto value = static_cast<double>(raster->pixels[at]);
            if (raster->states[at] != 0 || std::isnan(value)) continue;
            values[band].emplace_back(value, weight);
          }
        }
      }
      for (const unsigned band : {1U, 0U}) {
        for (const ZonalRequest& request : plan.requests) {
          const double want = Figure(request.name, values[band], isWeighted);
          const double got = *figure++;
          ASSERT_EQ(std::isnan(want), std::isnan(got)) << request.name << " of zone " << zone;
          if (std::isnan(want)) continue;
          ASSERT_NEAR(got, want, 1e-9 * (1 + std::abs(want)))
              << request.name << " of zone " << zone << ", weighted " << isWeighted;
        }
      }
    }
  }
}

TEST(ZonalPass, FailsWithAShapeThatCannotBeCarried) {
  const auto raster = MakePlaced<float>(MakeGrid(0, 0, 1, 20, 20), 1,
                                        [](unsigned, unsigned, unsigned) { return 1.0F; });
  ZonalPlan plan;
  plan.geometry = test::MakeShapes({{{1, 1}, {5, std::nan("")}, {5, 5}}});
  plan.bands.Resize(ArrayDims(1));
  plan.bands[0] = 0;
  plan.requests.emplace_back();
  EXPECT_FALSE(ZonalPass<float>(raster, plan).Run(IPC()));
  EXPECT_NE(TakeFault().ToUTF8().find("record 0, part 0"), std::string::npos);
  plan.geometry = test::MakeShapes({{{1, 1}, {5, 1}, {5, 5}}});
  raster->fails = true;
  EXPECT_FALSE(ZonalPass<float>(raster, plan).Run(IPC()));
}

TEST(ValueCounter, KeepsManyFloatsWithinItsBound) {
  std::mt19937 random(3);
  std::lognormal_distribution<double> spread(0, 3);
  std::vector<double> values(900'000);
  ValueCounter<double> counter;
  for (double& value : values) {
    value = random() % 2 == 0 ? spread(random) : -spread(random);
    counter.Add(value, 1);
  }
  std::sort(values.begin(), values.end());
  std::size_t at = 0;
  double greatest = 0;
  for (const auto& [value, weight] : counter.GetEntries()) {
    for (double left = weight; left > 0; --left, ++at) {
      greatest = std::max(greatest, std::abs(value - values[at]) / std::abs(values[at]));
    }
  }
  EXPECT_EQ(at, values.size());
  EXPECT_LE(greatest, std::ldexp(1, -14));
  EXPECT_LT(counter.GetEntries().size(), values.size() / 2);
}

}  // namespace
}  // namespace lumo
