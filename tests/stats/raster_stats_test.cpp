#include <cmath>
#include <random>

#include "stats/raster_stats_process.h"
#include "support/stats_support.h"
#include "support/test_rasters.h"
#include "tasks/thread_limit.h"

namespace lumo {
namespace {

using test::Near;

/// The statistics of a raster's valid pixels, in two passes of long double.
template <typename T>
struct Reference {
  struct Band {
    std::uint64_t count = 0;
    T min{};
    T max{};
    long double sum = 0, sum2 = 0, squares = 0;
    long double Mean() const { return count == 0 ? 0 : sum / count; }
  };

  explicit Reference(const OrderedTestRaster<T>& raster) : bands(raster.Bands()) {
    const unsigned n = raster.Bands();
    products.resize(std::size_t{n} * n);
    covariances.resize(std::size_t{n} * n);
    const auto value = [&](std::size_t pixel, unsigned band, T& v) {
      const std::size_t at = raster.At(pixel % raster.Samples(), pixel / raster.Samples(), band);
      v = raster.pixels[at];
      return (raster.states[at] & 7) == 0 && std::isfinite(static_cast<double>(v));
    };
    const std::size_t pixels = std::size_t{raster.Samples()} * raster.Lines();
    T v, w;
    for (unsigned b = 0; b < n; ++b) {
      Band& band = bands[b];
      for (std::size_t p = 0; p < pixels; ++p) {
        if (!value(p, b, v)) continue;
        const auto x = static_cast<long double>(v);
        band.min = band.count == 0 ? v : std::min(band.min, v);
        band.max = band.count == 0 ? v : std::max(band.max, v);
        ++band.count;
        band.sum += x;
        band.sum2 += x * x;
      }
      for (std::size_t p = 0; p < pixels; ++p) {
        if (value(p, b, v)) band.squares += std::pow(static_cast<long double>(v) - band.Mean(), 2);
      }
      for (unsigned c = 0; c < n; ++c) {
        long double sumX = 0, sumY = 0, count = 0;
        for (std::size_t p = 0; p < pixels; ++p) {
          if (!value(p, b, v) || !value(p, c, w)) continue;
          ++count;
          sumX += v;
          sumY += w;
          products[b * n + c] += static_cast<long double>(v) * w;
        }
        long double covariance = 0;
        for (std::size_t p = 0; p < pixels; ++p) {
          if (!value(p, b, v) || !value(p, c, w)) continue;
          covariance += (v - sumX / count) * (w - sumY / count);
        }
        covariances[b * n + c] = count < 2 ? 0 : covariance / (count - 1);
      }
    }
  }

  std::vector<Band> bands;
  std::vector<long double> products;
  std::vector<long double> covariances;
};

/// How the pixels of a scene are valid.
enum class Validity { kAll, kSameInAllBands, kByBand };

/// Random values far from 0 beside their spread; the last band has no valid pixel. Floating-point
/// scenes have values that aren't finite where not all pixels are valid.
template <typename T>
Pointer<OrderedTestRaster<T>> MakeScene(unsigned samples, unsigned lines, unsigned bands,
                                        Interleave order, Validity validity) {
  const Pointer<OrderedTestRaster<T>> scene(new OrderedTestRaster<T>(samples, lines, bands, order));
  std::mt19937_64 random(20240607);
  for (unsigned y = 0; y < lines; ++y)
    for (unsigned x = 0; x < samples; ++x) {
      const bool hole = random() % 7 == 0;
      for (unsigned b = 0; b < bands; ++b) {
        const std::size_t at = scene->At(x, y, b);
        const auto noise = static_cast<double>(random() % 1000) / (b + 1) + x % 5 * 11.0;
        if constexpr (std::is_floating_point_v<T>) {
          scene->pixels[at] = static_cast<T>(1e5 * (b + 1) + noise / 7);
        } else if constexpr (sizeof(T) == 8) {
          scene->pixels[at] = static_cast<T>(1e9 + noise * 1000);
        } else if constexpr (sizeof(T) == 4) {
          scene->pixels[at] = static_cast<T>(static_cast<T>(~T(0)) / 3 + noise * 1000);
        } else {
          scene->pixels[at] = static_cast<T>(random() >> 20);
        }
        scene->states[at] = 8;  // a bit that says nothing
        if (validity == Validity::kAll) continue;
        if (std::is_floating_point_v<T> && random() % 50 == 0) {
          scene->pixels[at] = random() % 2 == 0 ? std::numeric_limits<T>::quiet_NaN()
                                                : -std::numeric_limits<T>::infinity();
        }
        if (validity == Validity::kSameInAllBands ? hole : random() % 9 == 0) {
          scene->states[at] = static_cast<unsigned char>(1 << random() % 3);
        }
        if (validity == Validity::kByBand && b + 1 == bands) scene->states[at] = 4;
      }
    }
  return scene;
}

template <typename Stats, typename T>
Pointer<Stats> Compute(const Pointer<OrderedTestRaster<T>>& scene, unsigned budget) {
  const Pointer<Stats> stats(new Stats);
  const RasterIteratorPtr<T> iterator(new RasterIteratorStream<T>(scene, budget));
  RasterStatsProcess<T, Stats> process(iterator, stats);
  EXPECT_TRUE(process.RunProcess(process.kHere));
  return stats;
}

template <typename T>
void ExpectReference(const ExtendedRasterStats<T>& stats, const Reference<T>& want) {
  const auto n = static_cast<unsigned>(want.bands.size());
  ASSERT_EQ(stats.PixelCounts().GetCount(), n);
  for (unsigned b = 0; b < n; ++b) {
    SCOPED_TRACE(b);
    const auto& band = want.bands[b];
    EXPECT_EQ(stats.PixelCounts()[b], band.count);
    EXPECT_EQ(stats.Mins()[b], band.min);
    EXPECT_EQ(stats.Maxs()[b], band.max);
    EXPECT_TRUE(Near(stats.Means()[b], band.Mean()));
    EXPECT_TRUE(Near(stats.Sums()[b], band.sum));
    EXPECT_TRUE(Near(stats.Sums2()[b], band.sum2));
    EXPECT_TRUE(
        Near(stats.Stds()[b], band.count < 2 ? 0 : std::sqrt(band.squares / (band.count - 1))));
    EXPECT_TRUE(Near(stats.RMSs()[b], band.count == 0 ? 0 : std::sqrt(band.sum2 / band.count)));
    for (unsigned c = 0; c < n; ++c) {
      const std::size_t at = std::size_t{b} * n + c;
      EXPECT_TRUE(Near(stats.SumXY()[at], want.products[at])) << c;
      // The covariance of two bands is small beside their variances.
      const long double scale =
          std::sqrt(want.covariances[b * n + b] * want.covariances[c * n + c]);
      EXPECT_LE(std::fabs(stats.Cov()[at] - want.covariances[at]), 1e-12L * scale) << c;
      EXPECT_EQ(stats.Cov()[at], stats.Cov()[std::size_t{c} * n + b]);
    }
  }
}

template <typename T>
class StatsOfType : public testing::Test {};
using Types = testing::Types<std::uint8_t, std::int8_t, std::uint16_t, std::int16_t, std::uint32_t,
                             std::int32_t, float, double, std::uint64_t, std::int64_t>;
TYPED_TEST_SUITE(StatsOfType, Types);

TYPED_TEST(StatsOfType, AreThoseOfTheValidPixels) {
  using T = TypeParam;
  const struct {
    const char* name;
    unsigned samples, lines, bands;
    Interleave order;
    Validity validity;
    unsigned budget;
  } cases[] = {
      {"interleaved, all valid", 131, 67, 3, Interleave::BIP, Validity::kAll, 20'000},
      {"interleaved, the same holes in all bands", 131, 67, 3, Interleave::BIP,
       Validity::kSameInAllBands, 20'000},
      {"interleaved, holes of each band", 131, 67, 6, Interleave::BIP, Validity::kByBand, 20'000},
      {"by lines", 131, 67, 3, Interleave::BIL, Validity::kByBand, 20'000},
      {"by bands", 131, 67, 5, Interleave::BSQ, Validity::kByBand, 20'000},
      {"one band", 131, 67, 1, Interleave::BSQ, Validity::kSameInAllBands, 1 << 20},
      {"tiles of part of a line", 131, 3, 2, Interleave::BIP, Validity::kByBand, 300},
      {"one long line", 20'000, 1, 2, Interleave::BIP, Validity::kSameInAllBands, 1 << 20},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    const auto scene = MakeScene<T>(c.samples, c.lines, c.bands, c.order, c.validity);
    const auto stats = Compute<ExtendedRasterStats<T>>(scene, c.budget);
    ExpectReference(*stats, Reference<T>(*scene));
  }
}

/// All results, as bits.
template <typename T>
std::vector<double> BitsOf(const ExtendedRasterStats<T>& stats) {
  std::vector<double> all;
  for (const auto* results : {&stats.Means(), &stats.Stds(), &stats.Sums(), &stats.Sums2(),
                              &stats.RMSs(), &stats.SumXY(), &stats.Cov()}) {
    all.insert(all.end(), results->begin(), results->end());
  }
  return all;
}

TYPED_TEST(StatsOfType, DoNotDependOnThreads) {
  using T = TypeParam;
  const auto scene = MakeScene<T>(301, 203, 3, Interleave::BIP, Validity::kByBand);
  const auto want = BitsOf(*Compute<ExtendedRasterStats<T>>(scene, 300'000));
  for (const unsigned threads : {1U, 2U, 4U}) {
    const ThreadLimit limit(threads);
    EXPECT_EQ(BitsOf(*Compute<ExtendedRasterStats<T>>(scene, 300'000)), want) << threads;
  }
}

TYPED_TEST(StatsOfType, OfExactSumsDoNotDependOnTiles) {
  using T = TypeParam;
  if (!kExactStats<T>) GTEST_SKIP() << "sums of this type round";
  const auto scene = MakeScene<T>(301, 203, 3, Interleave::BIP, Validity::kByBand);
  const auto planes = MakeScene<T>(301, 203, 3, Interleave::BSQ, Validity::kByBand);
  const auto want = Compute<RasterStats<T>>(scene, 1 << 20);
  for (const auto& [raster, budget] : {std::pair(scene, 5'000U), std::pair(planes, 77'777U)}) {
    const auto stats = Compute<RasterStats<T>>(raster, budget);
    for (unsigned b = 0; b < 3; ++b) {
      EXPECT_EQ(stats->Means()[b], want->Means()[b]);
      EXPECT_EQ(stats->Stds()[b], want->Stds()[b]);
      EXPECT_EQ(stats->Sums2()[b], want->Sums2()[b]);
      EXPECT_EQ(stats->RMSs()[b], want->RMSs()[b]);
    }
  }
}

/// A tile with one band and these values.
template <typename T>
Pointer<Tile<T>> TileOf(const std::vector<T>& values) {
  const Pointer<Tile<T>> tile(new Tile<T>);
  tile->Resize(static_cast<unsigned>(values.size()), 1, 1);
  std::copy(values.begin(), values.end(), tile->PixelArray().begin());
  return tile;
}

template <typename T>
void ExpectRunningForm(const std::vector<T>& values) {
  LargeStatsAccumulator<T> running;
  for (const T v : values) {
    if (std::isfinite(static_cast<double>(v))) running.Add(v);
  }
  RasterStats<T> stats(1);
  ASSERT_TRUE(stats.Accumulate(*TileOf(values), 0, 1, 0, static_cast<unsigned>(values.size())));
  ASSERT_TRUE(stats.Finish());
  EXPECT_EQ(stats.PixelCounts()[0], running.count);
  EXPECT_TRUE(Near(stats.Means()[0], running.mean));
  EXPECT_TRUE(Near(stats.Stds()[0], std::sqrt(running.s / static_cast<double>(running.count - 1))));
  EXPECT_TRUE(Near(stats.Sums2()[0], running.sum2));
}

TEST(RasterStats, AreThoseOfTheRunningFormAtTheEndsOfTheTypes) {
  ExpectRunningForm<double>({1e200, -3e200, 2e180, 5});  // squares leave the range of a double
  ExpectRunningForm<double>({1e30, 1, 2, 3, 4, NAN});    // the first value far from the others
  ExpectRunningForm<float>({-std::numeric_limits<float>::max(), std::numeric_limits<float>::max()});
  ExpectRunningForm<std::int32_t>({INT32_MIN, INT32_MIN, INT32_MAX});
  ExpectRunningForm<std::uint32_t>({UINT32_MAX, 0, UINT32_MAX});
  ExpectRunningForm<std::int8_t>({-128, -128, 127});
  ExpectRunningForm<std::int64_t>({INT64_MIN, INT64_MAX, 0});
}

TEST(RasterStats, OfFewValues) {
  const auto of = [](const std::vector<std::int16_t>& values) {
    RasterStats<std::int16_t> stats(1);
    if (!values.empty()) {
      stats.Accumulate(*TileOf(values), 0, 1, 0, static_cast<unsigned>(values.size()));
    }
    EXPECT_TRUE(stats.Finish());
    return stats;
  };
  const auto none = of({});
  EXPECT_EQ(none.PixelCounts()[0], 0U);
  EXPECT_EQ(none.Mins()[0], 0);
  EXPECT_EQ(none.Maxs()[0], 0);
  EXPECT_EQ(none.RMSs()[0], 0);
  const auto one = of({-7});
  EXPECT_EQ(one.Stds()[0], 0);
  EXPECT_EQ(one.RMSs()[0], 7);
  EXPECT_EQ(one.Mins()[0], -7);
  EXPECT_EQ(of(std::vector<std::int16_t>(5000, 12345)).Stds()[0], 0);
}

TEST(RasterStats, TakePartsOfATileWithBorders) {
  Tile<std::uint16_t> tile;
  ASSERT_TRUE(tile.Resize(9, 7, 2, 3));
  std::fill(tile.PixelArray().begin(), tile.PixelArray().end(), std::uint16_t{60'000});
  std::uint64_t want = 0;
  for (int y = 2; y < 6; ++y)
    for (int x = 1; x < 8; ++x)
      want += tile.Pixel(x, y, 1) = static_cast<std::uint16_t>(x * 10 + y);
  RasterStats<std::uint16_t> stats(2);
  ASSERT_TRUE(stats.Accumulate(tile, 2, 6, 1, 8));
  ASSERT_TRUE(stats.Finish());
  EXPECT_EQ(stats.PixelCounts()[1], 28U);
  EXPECT_EQ(stats.Sums()[1], static_cast<double>(want));
}

TEST(RasterStats, RefuseWhatDoesNotFit) {
  RasterStats<float> two(2);
  RasterStats<float> none;
  ExtendedRasterStats<float> extended(2);
  EXPECT_FALSE(two.Accumulate(*TileOf<float>({1}), 0, 1, 0, 1));
  EXPECT_FALSE(two.Merge(none));
  EXPECT_FALSE(none.Merge(none));
  EXPECT_FALSE(none.Finish());
  EXPECT_FALSE(extended.Merge(ExtendedRasterStats<float>(3)));
  EXPECT_TRUE(extended.Finish());
  EXPECT_FALSE(extended.Finish());
}

TEST(LargeStatsAccumulator, MergesWithAndWithoutSamples) {
  using Pair = LargeStatsAccumulator2<double>;
  Pair some;
  for (const double v : {3.0, 8.0, -2.0}) some.Add(v, v * v);
  Pair merged = some;
  merged.Merge(Pair());
  EXPECT_EQ(merged.mean, some.mean);
  EXPECT_EQ(merged.c, some.c);
  Pair from;
  from.Merge(some);
  EXPECT_EQ(from.count, 3U);
  EXPECT_TRUE(Near(from.mean, 3));
  EXPECT_TRUE(Near(from.meanY, 77.0L / 3));
  EXPECT_EQ(from.min, -2);
  EXPECT_EQ(from.max, 8);
  // 3, 8, -2 and 1 with their squares: means 2.5 and 19.5, by hand.
  Pair one;
  one.Add(1, 1);
  from.Merge(one);
  EXPECT_TRUE(Near(from.mean, 2.5));
  EXPECT_TRUE(Near(from.s, 53));
  EXPECT_TRUE(Near(from.c, 337));
  EXPECT_TRUE(Near(from.sumXY, 532));
  EXPECT_TRUE(Near(from.meanSq, 19.5));
}

}  // namespace
}  // namespace lumo
