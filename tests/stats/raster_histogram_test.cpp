#include <cmath>
#include <random>

#include "stats/exact_stats_accumulator.h"
#include "stats/raster_histogram_process.h"
#include "support/test_rasters.h"
#include "tasks/thread_limit.h"

namespace lumo {
namespace {

template <typename T>
Array<T> Each(unsigned bands, T value) {
  return MakeArray(std::vector<T>(bands, value));
}

/// A scene of values from -50 to 205 or, where T holds more, from -500 to 1500, with some that
/// aren't finite, and holes.
template <typename T>
Pointer<OrderedTestRaster<T>> MakeScene(unsigned bands, Interleave order) {
  const Pointer<OrderedTestRaster<T>> scene(new OrderedTestRaster<T>(97, 61, bands, order));
  std::mt19937 random(7);
  for (std::size_t i = 0; i < scene->pixels.size(); ++i) {
    const double value = sizeof(T) == 1 ? static_cast<double>(random() % 256) - 50
                                        : static_cast<double>(random() % 8000) / 4 - 500;
    scene->pixels[i] = static_cast<T>(static_cast<std::int64_t>(value));
    if constexpr (std::is_floating_point_v<T>) {
      scene->pixels[i] = static_cast<T>(value);
      if (random() % 40 == 0) scene->pixels[i] = std::numeric_limits<T>::quiet_NaN();
      if (random() % 40 == 0) scene->pixels[i] = std::numeric_limits<T>::infinity();
    }
    if (random() % 8 == 0) scene->states[i] = static_cast<unsigned char>(1 << random() % 3);
  }
  return scene;
}

/// The counts of a band, pixel by pixel.
template <typename T>
std::vector<unsigned long long> Want(const OrderedTestRaster<T>& scene, unsigned band,
                                     const RasterHistogram<T>& bins, unsigned row) {
  std::vector<unsigned long long> counts(bins.BinCount(row));
  for (unsigned y = 0; y < scene.Lines(); ++y)
    for (unsigned x = 0; x < scene.Samples(); ++x) {
      const std::size_t at = scene.At(x, y, band);
      const T v = scene.pixels[at];
      if ((scene.states[at] & 7) != 0 || !std::isfinite(static_cast<double>(v))) continue;
      if (bins.Sign() == HistogramSign::kPositive && v < 0) continue;
      if (bins.Sign() == HistogramSign::kNegative && v >= 0) continue;
      if (v < bins.Min(row) || v > bins.Max(row)) continue;
      std::size_t bin;
      if constexpr (std::is_integral_v<T>) {
        bin = static_cast<std::size_t>(
            (static_cast<long long>(v) - static_cast<long long>(bins.Min(row))) /
            static_cast<long long>(bins.BinSize(row)));
      } else {
        bin = static_cast<std::size_t>(
            std::trunc(static_cast<double>(v - bins.Min(row)) / bins.BinSize(row)));
      }
      if (bin < counts.size()) ++counts[bin];
    }
  return counts;
}

template <typename T>
bool Count(const Pointer<OrderedTestRaster<T>>& scene, const Array<unsigned>& bands,
           const RasterHistogramPtr<T>& working, unsigned budget = 9'000) {
  RasterHistogramProcess<T> process(
      RasterIteratorPtr<T>(new RasterIteratorStream<T>(scene, bands, budget)), working);
  return process.RunProcess(process.kHere);
}

template <typename T>
class HistogramOfType : public testing::Test {};
using Types = testing::Types<std::uint8_t, std::int8_t, std::uint16_t, std::int16_t, std::uint32_t,
                             std::int32_t, float, double, std::uint64_t, std::int64_t>;
TYPED_TEST_SUITE(HistogramOfType, Types);

TYPED_TEST(HistogramOfType, CountsTheValidValuesWithinTheBounds) {
  using T = TypeParam;
  const T low = std::is_unsigned_v<T> ? T(3) : T(-45);
  const T high = sizeof(T) == 1 ? T(120) : T(900);
  for (const Interleave order : {Interleave::BIP, Interleave::BIL, Interleave::BSQ})
    for (const auto sign :
         {HistogramSign::kBoth, HistogramSign::kPositive, HistogramSign::kNegative})
      for (const double size : {0.0, 1.0, 7.0}) {
        SCOPED_TRACE(testing::Message()
                     << static_cast<int>(order) << ' ' << static_cast<int>(sign) << ' ' << size);
        const auto scene = MakeScene<T>(3, order);
        const RasterHistogramPtr<T> working(
            size > 0 ? new RasterHistogram<T>(2, Each(2, size), Each(2, low), Each(2, high), sign)
                     : new RasterHistogram<T>(2, Each(2, 40U), Each(2, low), Each(2, high), sign));
        ASSERT_TRUE(Count(scene, MakeArray<unsigned>({2, 0}), working));
        for (const unsigned row : {0U, 1U}) {
          const auto histogram = working->BandHistogram(row, 9);
          EXPECT_EQ(
              std::vector<unsigned long long>(histogram.counts.begin(), histogram.counts.end()),
              Want(*scene, row == 0 ? 2 : 0, *working, row));
          EXPECT_EQ(histogram.band, 9U);
          EXPECT_EQ(histogram.source, StatsSource::kDynamic);
        }
      }
}

TEST(RasterHistogram, CountsAlikeWhereTablesOfAllValuesWouldBeTooLarge) {
  using T = std::int16_t;
  const unsigned bands = 80;  // tables of 20 MiB
  const auto scene = MakeScene<T>(bands, Interleave::BIP);
  const RasterHistogramPtr<T> working(new RasterHistogram<T>(
      bands, Each(bands, 3.0), Each<T>(bands, -100), Each<T>(bands, 700), HistogramSign::kBoth));
  Array<unsigned> all{ArrayDims(bands)};
  for (unsigned i = 0; i < bands; ++i) all[i] = i;
  const ThreadLimit limit(2);
  ASSERT_TRUE(Count(scene, all, working, 1 << 20));
  for (const unsigned band : {0U, 79U}) {
    const auto got = working->BandHistogram(band, band).counts;
    EXPECT_EQ(std::vector<unsigned long long>(got.begin(), got.end()),
              Want(*scene, band, *working, band));
  }
}

template <typename T>
void ExpectBins(T lower, T upper, double size, unsigned count, double wantSize, unsigned wantCount,
                T wantUpper) {
  SCOPED_TRACE(testing::Message() << +lower << ' ' << +upper << ' ' << size << ' ' << count);
  const RasterHistogramPtr<T> bins(
      size > 0 ? new RasterHistogram<T>(1, Each(1, size), Each(1, lower), Each(1, upper),
                                        HistogramSign::kBoth)
               : new RasterHistogram<T>(1, Each(1, count), Each(1, lower), Each(1, upper),
                                        HistogramSign::kBoth));
  EXPECT_TRUE(bins->IsValid());
  EXPECT_EQ(bins->BinSize(0), wantSize);
  EXPECT_EQ(bins->BinCount(0), wantCount);
  EXPECT_EQ(bins->Max(0), wantUpper);
}

/// The bin of the exact form by its definition, with the edges that bounds and size say.
template <typename T>
std::size_t ExactBin(T value, const RasterHistogram<T>& bins) {
  const std::size_t last = bins.BinCount(0) - 1;
  if constexpr (std::is_integral_v<T>) {
    // In whole numbers where the size is one, or a share of all values.
    const auto above = static_cast<Int128>(value) - static_cast<Int128>(bins.Min(0));
    const auto all = static_cast<Int128>(bins.Max(0)) - static_cast<Int128>(bins.Min(0)) + 1;
    if (bins.BinSize(0) == static_cast<double>(all) / bins.BinCount(0)) {
      return static_cast<std::size_t>(above * bins.BinCount(0) / all);
    }
    return std::min(last,
                    static_cast<std::size_t>(static_cast<long double>(above) / bins.BinSize(0)));
  } else {
    std::size_t bin = 0;
    const auto edge = [&](std::size_t i) {
      return static_cast<double>(bins.Min(0)) + static_cast<double>(i) * bins.BinSize(0);
    };
    while (bin < last && static_cast<double>(value) >= edge(bin + 1)) ++bin;
    return bin;
  }
}

TYPED_TEST(HistogramOfType, ExactBinsHoldEveryValueWithinTheBounds) {
  using T = TypeParam;
  const T low = std::is_unsigned_v<T> ? T(3) : T(-45);
  const T high = sizeof(T) == 1 ? T(120) : T(900);
  const auto scene = MakeScene<T>(1, Interleave::BIP);
  for (const auto& [size, count] : {std::pair(0.0, 1U),
                                    {0.0, 7U},
                                    {0.0, 100U},
                                    {0.0, 256U},
                                    {0.0, 3000U},
                                    {1.0, 0U},
                                    {2.5, 0U},
                                    {0.3, 0U},
                                    {1e9, 0U}}) {
    SCOPED_TRACE(testing::Message() << size << ' ' << count);
    const RasterHistogramPtr<T> working(
        size > 0 ? new RasterHistogram<T>(1, Each(1, size), Each(1, low), Each(1, high),
                                          HistogramSign::kBoth, Form::kExact)
                 : new RasterHistogram<T>(1, Each(1, count), Each(1, low), Each(1, high),
                                          HistogramSign::kBoth, Form::kExact));
    ASSERT_TRUE(Count(scene, MakeArray<unsigned>({0}), working));
    EXPECT_EQ(working->Max(0), high);
    const auto edge = [&](unsigned bin) {
      return static_cast<double>(low) + bin * working->BinSize(0);
    };
    const double end = static_cast<double>(high) + (std::is_integral_v<T> ? 1 : 0);
    EXPECT_LT(edge(working->BinCount(0) - 1), end);
    EXPECT_GE(edge(working->BinCount(0)), high - 1e-12 * high);  // which the last bin holds anyway
    std::vector<unsigned long long> want(working->BinCount(0));
    for (std::size_t i = 0; i < scene->pixels.size(); ++i) {
      const T v = scene->pixels[i];
      if (scene->states[i] == 0 && v >= low && v <= high) ++want[ExactBin(v, *working)];
    }
    const auto counts = working->BandHistogram(0, 0).counts;
    EXPECT_EQ(std::vector<unsigned long long>(counts.begin(), counts.end()), want);
  }
}

TEST(RasterHistogram, ExactBinsAtTheEnds) {
  const auto count = []<typename T>(const std::vector<T>& values, std::type_identity_t<T> lower,
                                    std::type_identity_t<T> upper, double size, unsigned bins) {
    const Pointer<OrderedTestRaster<T>> scene(
        new OrderedTestRaster<T>(static_cast<unsigned>(values.size()), 1, 1, Interleave::BIP));
    scene->pixels = values;
    const RasterHistogramPtr<T> working(
        size > 0 ? new RasterHistogram<T>(1, Each(1, size), Each(1, lower), Each(1, upper),
                                          HistogramSign::kBoth, Form::kExact)
                 : new RasterHistogram<T>(1, Each(1, bins), Each(1, lower), Each(1, upper),
                                          HistogramSign::kBoth, Form::kExact));
    EXPECT_TRUE(Count(scene, MakeArray<unsigned>({0}), working));
    const auto counts = working->BandHistogram(0, 0).counts;
    return std::vector<unsigned long long>(counts.begin(), counts.end());
  };
  using Counts = std::vector<unsigned long long>;
  const float above = std::nextafter(1.0F, 2.0F), below = std::nextafter(0.5F, 0.0F);
  EXPECT_EQ(count(std::vector{0.0F, -0.0F, 0.5F, below, 1.0F, above}, 0.0F, 1.0F, 0, 2),
            (Counts{3, 2}));
  EXPECT_EQ(count(std::vector{0.0, 0.25, 1.0}, 0.0, 1.0, 0.25, 0), (Counts{1, 1, 0, 1}));
  EXPECT_EQ(count(std::vector{3.0, 3.0, 4.0}, 3.0, 3.0, 0, 4), (Counts{2, 0, 0, 0}));
  // 0.3 is three tenths: below the edge 3 * 0.1, which is rounded up.
  EXPECT_EQ(count(std::vector{0.3, 0.6, 0.7}, 0.0, 1.0, 0.1, 0),
            (Counts{0, 0, 1, 0, 0, 1, 1, 0, 0, 0}));
  EXPECT_EQ(
      count(std::vector<std::int64_t>{INT64_MIN, -1, 0, INT64_MAX}, INT64_MIN, INT64_MAX, 0, 2),
      (Counts{2, 2}));
  EXPECT_EQ(count(std::vector<std::uint64_t>{0, UINT64_MAX / 3, UINT64_MAX}, 0, UINT64_MAX, 0, 3),
            (Counts{2, 0, 1}));  // the second bin begins at 6148914691236517205.33
  EXPECT_EQ(count(std::vector<std::uint8_t>{7, 8}, 7, 8, 0, 4), (Counts{1, 0, 1, 0}));
}

TEST(RasterHistogram, FindsItsBins) {
  using Byte = std::uint8_t;
  ExpectBins<Byte>(0, 255, 0, 256, 1, 256, 255);
  ExpectBins<Byte>(0, 255, 0, 16, 17, 16, 255);  // the bound would be 271
  ExpectBins<Byte>(10, 20, 0, 1, 11, 1, 20);
  ExpectBins<Byte>(0, 100, 0, 300, 1, 300, 255);  // more bins than values
  ExpectBins<std::int8_t>(-128, 127, 0, 2, 255, 2, 127);
  ExpectBins<std::int32_t>(-10, 10, 0, 5, 5, 5, 14);
  ExpectBins<std::int64_t>(INT64_MIN, INT64_MAX, 0, 1, 0x1p64, 1, INT64_MAX);
  ExpectBins<float>(0, 1, 0.25, 0, 0.25, 5, 1);
  ExpectBins<double>(0, 255, 0, 256, 1, 256, 255);
  ExpectBins<std::uint16_t>(0, 65535, 256, 0, 256, 256, 65535);
  ExpectBins<float>(0, 1, 0, 0, 0, 0, 1);  // neither: no bins
}

TEST(RasterHistogram, CountsTheBoundsAndNothingBeyond) {
  const Pointer<OrderedTestRaster<float>> scene(
      new OrderedTestRaster<float>(6, 1, 1, Interleave::BIP));
  scene->pixels = {0.0F, 1.0F, std::nextafter(1.0F, 2.0F), -0.0F, std::nextafter(0.0F, -1.0F),
                   0.25F};
  const RasterHistogramPtr<float> working(new RasterHistogram<float>(
      1, Each(1, 0.25), Each(1, 0.0F), Each(1, 1.0F), HistogramSign::kBoth));
  ASSERT_TRUE(Count(scene, MakeArray<unsigned>({0}), working));
  const auto counts = working->BandHistogram(0, 0).counts;
  EXPECT_EQ(std::vector<unsigned long long>(counts.begin(), counts.end()),
            (std::vector<unsigned long long>{2, 1, 0, 0, 1}));
}

TEST(RasterHistogram, FailsForBoundsInTheWrongOrder) {
  const auto scene = MakeScene<std::int32_t>(1, Interleave::BIP);
  const RasterHistogramPtr<std::int32_t> working(new RasterHistogram<std::int32_t>(
      1, Each(1, 1.0), Each(1, 5), Each(1, 2), HistogramSign::kBoth));
  EXPECT_FALSE(Count(scene, MakeArray<unsigned>({0}), working));
}

TEST(RasterHistogram, RefusesMoreBinsThanThereIsMemoryFor) {
  EXPECT_FALSE(
      RasterHistogram<double>(1, Each(1, 1e-12), Each(1, 0.0), Each(1, 1e9), HistogramSign::kBoth)
          .IsValid());
  EXPECT_FALSE(
      RasterHistogram<double>(1, Each(1, ~0U), Each(1, 0.0), Each(1, 1e9), HistogramSign::kBoth)
          .IsValid());
}

TEST(RasterHistogram, JoinsTheSameBinsOnly) {
  using Bytes = RasterHistogram<std::uint8_t>;
  const auto make = [](unsigned bands, unsigned bins, HistogramSign sign) {
    return Bytes(bands, Each(bands, bins), Each<std::uint8_t>(bands, 0),
                 Each<std::uint8_t>(bands, 9), sign);
  };
  Bytes total = make(2, 10, HistogramSign::kBoth);
  Bytes other = make(2, 10, HistogramSign::kBoth);
  total.Counts(1)[3] = 4;
  other.Counts(1)[3] = 5;
  EXPECT_TRUE(total.Join(other));
  EXPECT_EQ(total.Counts(1)[3], 9U);
  EXPECT_FALSE(total.Join(make(1, 10, HistogramSign::kBoth)));
  EXPECT_FALSE(total.Join(make(2, 5, HistogramSign::kBoth)));
  EXPECT_FALSE(total.Join(make(2, 10, HistogramSign::kNegative)));
  EXPECT_EQ(total.Counts(1)[3], 9U);
}

/// Keeps what it is given.
struct Receiver final : HistogramCallback<std::uint8_t> {
  void TakeResults(const RasterStatsPtr<std::uint8_t>& stats,
                   const RasterHistogramPtr<std::uint8_t>& histogram, HistogramSign sign) override {
    taken = stats && histogram->BinCount(0) == 256 && sign == HistogramSign::kBoth;
  }
  bool taken = false;
};

TEST(RasterHistogramCallbackProcess, HandsItsResultsOverUnlessAborted) {
  for (const bool aborted : {false, true}) {
    const IPC ipc;
    ipc.abort->Set(aborted);
    Receiver receiver;
    const RasterHistogramPtr<std::uint8_t> working(
        new RasterHistogram<std::uint8_t>(1, Each(1, 1.0), Each<std::uint8_t>(1, 0),
                                          Each<std::uint8_t>(1, 255), HistogramSign::kBoth));
    RasterHistogramCallbackProcess<std::uint8_t> process(
        RasterIteratorPtr<std::uint8_t>(
            new RasterIteratorStream<std::uint8_t>(MakeScene<std::uint8_t>(1, Interleave::BIP))),
        working, RasterStatsPtr<std::uint8_t>(new RasterStats<std::uint8_t>(1)), &receiver, ipc);
    EXPECT_TRUE(process.RunProcess(process.kHere));
    EXPECT_EQ(receiver.taken, !aborted);
  }
}

}  // namespace
}  // namespace lumo
