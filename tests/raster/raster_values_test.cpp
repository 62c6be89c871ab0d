#include <cmath>
#include <limits>

#include "raster/raster_def.h"
#include "raster/raster_view.h"
#include "support/test_rasters.h"

namespace lumo {
namespace {

template <typename T>
class EveryType : public testing::Test {};

template <typename List>
struct TypesOf;
template <typename... Ts>
struct TypesOf<TypeList<Ts...>> {
  using Type = testing::Types<Ts...>;
};
TYPED_TEST_SUITE(EveryType, TypesOf<TenTypes>::Type);

TEST(PixelTypes, HaveCodesAndNames) {
  const struct {
    unsigned code;
    const char* name;
    unsigned bytes;
  } cases[] = {
      {0, "Unknown", 0}, {1, "Byte", 1},         {2, "Int16", 2},         {3, "Int32", 4},
      {4, "Single", 4},  {5, "Double", 8},       {6, "ComplexSingle", 8}, {9, "ComplexDouble", 16},
      {12, "UInt16", 2}, {13, "UInt32", 4},      {14, "Int64", 8},        {15, "UInt64", 8},
      {95, "Quad", 0},   {96, "ComplexQuad", 0}, {98, "Bool", 0},         {99, "Char", 1}};
  for (const auto& c : cases) {
    EXPECT_EQ(DataTypeName(c.code).ToUTF8(), c.name);
    EXPECT_EQ(ParseDataType(c.name), c.code);
    EXPECT_EQ(DataTypeBytes(c.code), c.bytes);
  }
  EXPECT_EQ(DataTypeName(7).ToUTF8(), "Unknown");
  EXPECT_EQ(ParseDataType("my USHORT type"), 12U);
  EXPECT_EQ(ParseDataType("byte"), 0U);
}

// The lists of the preprocessor have the types of the sets, in their order.
#define LISTED(T) , T
#define LISTED_WITHIN(T, unused) , T
template <typename First, typename... Ts>
using Behind = TypeList<Ts...>;
static_assert(std::is_same_v<Behind<void VEXG_EIGHT(LISTED)>, EightTypes>);
static_assert(std::is_same_v<Behind<void VEXG_EIGHT_WITHIN(LISTED_WITHIN, 0)>, EightTypes>);
static_assert(std::is_same_v<Behind<void VEXG_TEN(LISTED)>, TenTypes>);
static_assert(std::is_same_v<Behind<void VEXG_TWELVE(LISTED)>, TwelveTypes>);

TEST(PixelTypes, DispatchReachesItsSetOnly) {
  const auto reaches = [](auto set, unsigned code) {
    unsigned reached = 1000;
    const bool done = DispatchType(set, code, [&]<typename T>() {
      reached = kDataTypeOf<T>;
      return true;
    });
    EXPECT_EQ(done, reached == code);
    return done;
  };
  std::vector<unsigned> eight, ten, twelve;
  for (unsigned code = 0; code < 300; ++code) {
    if (reaches(EightTypes{}, code)) eight.push_back(code);
    if (reaches(TenTypes{}, code)) ten.push_back(code);
    if (reaches(TwelveTypes{}, code)) twelve.push_back(code);
  }
  EXPECT_EQ(eight, (std::vector<unsigned>{1, 2, 3, 4, 5, 12, 13, 99}));
  EXPECT_EQ(ten, (std::vector<unsigned>{1, 2, 3, 4, 5, 12, 13, 14, 15, 99}));
  EXPECT_EQ(twelve, (std::vector<unsigned>{1, 2, 3, 4, 5, 6, 9, 12, 13, 14, 15, 99}));
}

TEST(RasterEnumerations, HaveWords) {
  EXPECT_EQ(FormatValue(Interleave::None).ToUTF8(), "None");
  EXPECT_EQ(FormatValue(Interleave::BIL).ToUTF8(), "BIL");
  EXPECT_EQ(FormatValue(static_cast<Interleave>(8)).ToUTF8(), "Unknown");
  EXPECT_EQ(ParseValue<Interleave>("BSQ"), Interleave::BSQ);
  EXPECT_EQ(ParseValue<Interleave>("bsq"), Interleave::None);
  EXPECT_EQ(FormatValue(PyramidType::kOrva).ToUTF8(), "ORVA");
  EXPECT_EQ(FormatValue(static_cast<PyramidType>(9)).ToUTF8(), "None");
  EXPECT_EQ(ParseValue<PyramidType>("MANUAL"), PyramidType::kManual);
  EXPECT_EQ(ParseValue<PyramidType>("orva"), PyramidType::kNone);
  EXPECT_EQ(ParseValue<PyramidResamplingMethod>("Majority"), PyramidResamplingMethod::kMajority);
  EXPECT_EQ(ParseValue<StatsMode>("DoExtended"), StatsMode::kExtended);
  EXPECT_EQ(ParseValue<StatsMode>("all"), StatsMode::kBasic);
  EXPECT_EQ(FormatValue(static_cast<StatsSource>(7)).ToUTF8(), "Unknown");
  EXPECT_EQ(ParseValue<HistogramSign>("Negative"), HistogramSign::kNegative);
}

TEST(TileDimensions, TravelAsText) {
  const TileDimensions dimensions{512, 256, 3, 1, 2, 3, 4, 1};
  EXPECT_EQ(FormatValue(dimensions).ToUTF8(), "512 256 3 1 2 3 4 Variable");
  EXPECT_EQ(ParseValue<TileDimensions>("512 256 3 1 2 3 4 Variable"), dimensions);
  EXPECT_EQ(ParseValue<TileDimensions>(" 1  2 0 0 0 0 0 Invariable "), (TileDimensions{1, 2}));
  for (const char* const text : {"", "512 256", "1 2 3 4 5 6 7", "1 2 3 4 5 6 7 Fixed", "a b"})
    EXPECT_EQ(ParseValue<TileDimensions>(text), TileDimensions()) << text;
}

TEST(RasterDef, CopiesAsAValue) {
  RasterDef def;
  EXPECT_EQ(def.format.ToUTF8(), "Unknown");
  EXPECT_EQ(def.interleave, Interleave::None);
  def.SetNoData(2, true);
  def.noData[2] = 5.0;
  def.SetNoData(2, true);
  EXPECT_EQ(def.noData.at(2), 5.0) << "a value that is there stays";
  def.sourceFields[5] = 9;
  def.samples = 100;
  RasterDef copy;
  copy = def;
  copy.SetNoData(2, false);
  EXPECT_EQ(copy.sourceFields[5], 9U);
  EXPECT_EQ(def.noData.size(), 1U);
  EXPECT_TRUE(copy.noData.empty());
  copy.Clear();
  EXPECT_EQ(copy.samples, 0U);
}

template <typename T>
std::vector<T> Extremes() {
  using Limits = std::numeric_limits<T>;
  return {Limits::lowest(), Limits::max(), T(0), T(1), T(9), T(32), T(53), T(65), T(60)};
}

TYPED_TEST(EveryType, StatisticsReadBackExactly) {
  using T = TypeParam;
  for (const T min : Extremes<T>()) {
    RasterBandStats<T> stats;
    stats.band = 3;
    stats.min = min;
    stats.max = std::numeric_limits<T>::max();
    stats.mask = StatsMask::Basic;
    stats.mean = 0.1;
    stats.std = 1.0 / 3;
    stats.sum = 1e300;
    stats.sum2 = -5e-324;
    stats.rms = 12345678.912345678;
    stats.SetSumXY(2, 0.7);
    stats.SetCov(0, -0.3);
    const auto read = ParseValue<RasterBandStats<T>>(FormatValue(stats));
    EXPECT_EQ(read.band, 3U);
    EXPECT_EQ(read.mask, static_cast<unsigned>(StatsMask::Extended));
    EXPECT_EQ(read.min, stats.min);
    EXPECT_EQ(read.max, stats.max);
    EXPECT_EQ(std::vector({read.mean, read.std, read.sum, read.sum2, read.rms}),
              std::vector({stats.mean, stats.std, stats.sum, stats.sum2, stats.rms}));
    EXPECT_EQ(std::vector(read.sumXY.begin(), read.sumXY.end()), (std::vector<double>{0, 0, 0.7}));
    EXPECT_EQ(std::vector(read.cov.begin(), read.cov.end()), (std::vector<double>{-0.3}));
  }
  EXPECT_EQ(ParseValue<RasterBandStats<T>>("4 127 1 2 3").band, 0U) << "a text that breaks off";
}

TYPED_TEST(EveryType, HistogramsReadBackExactly) {
  using T = TypeParam;
  for (const T min : Extremes<T>()) {
    RasterBandHistogram<T> histogram;
    histogram.band = 1;
    histogram.binSize = 1.0 / 3;
    histogram.binCount = 2;
    histogram.counts = MakeArray<unsigned long long>({5, 1ULL << 60});
    histogram.min = min;
    histogram.max = std::numeric_limits<T>::max();
    histogram.source = StatsSource::kDynamic;
    histogram.sign = HistogramSign::kNegative;
    const auto read = ParseValue<RasterBandHistogram<T>>(FormatValue(histogram));
    EXPECT_TRUE(read == histogram) << FormatValue(histogram).ToUTF8();
    EXPECT_EQ(read.binSize, histogram.binSize);
    auto other = read;
    other.counts[1] = 0;
    EXPECT_FALSE(other == histogram);
  }
  EXPECT_EQ(ParseValue<RasterBandHistogram<T>>("1 0 0.5 7 ").binCount, 0U);
}

TEST(RasterBandHistogram, HasTheTextThatWasAgreed) {
  RasterBandHistogram<std::uint8_t> bytes;
  bytes.binSize = 1;
  bytes.binCount = 1;
  bytes.counts = MakeArray<unsigned long long>({4});
  bytes.min = 'A';
  bytes.max = 255;
  bytes.source = StatsSource::kNative;
  EXPECT_EQ(FormatValue(bytes).ToUTF8(), "0 0 1.0000000000000000e+00 1 A \xC3\xBF Native 1:1 [4] ");
  bytes.min = 0;
  EXPECT_EQ(FormatValue(bytes).ToUTF8(),
            "0 0 1.0000000000000000e+00 1 00 \xC3\xBF Native 1:1 [4] ");
  RasterBandHistogram<float> floats;
  floats.min = 0.5F;
  EXPECT_EQ(
      FormatValue(floats).ToUTF8(),
      "0 0 0.0000000000000000e+00 0 5.0000000000000000e-01 0.0000000000000000e+00 Unknown 0:[] ");
}

TEST(RasterBandHistogram, ReadsEveryByte) {
  for (int value = 0; value < 256; ++value) {
    RasterBandHistogram<std::uint8_t> bytes;
    RasterBandHistogram<std::int8_t> chars;
    bytes.min = static_cast<std::uint8_t>(value);
    chars.min = static_cast<std::int8_t>(value);
    ASSERT_EQ(ParseValue<RasterBandHistogram<std::uint8_t>>(FormatValue(bytes)).min, bytes.min);
    ASSERT_EQ(ParseValue<RasterBandHistogram<std::int8_t>>(FormatValue(chars)).min, chars.min);
  }
}

TEST(Raster, IsCastByItsPixelType) {
  const BasicRasterPtr raster(MakeRamp<float>(4, 3, 2));
  EXPECT_EQ(raster->DataType(), 4U);
  EXPECT_FALSE(RasterPtr<float>(raster).IsNull());
  EXPECT_TRUE(RasterPtr<double>(raster).IsNull());
  EXPECT_TRUE(RasterPtr<Complex<float>>(raster).IsNull());
  EXPECT_TRUE(raster->IsA(BasicRaster::TypeCode));
}

TEST(RasterView, LeavesEveryOperationToItsParent) {
  const auto ramp = MakeRamp<std::int16_t>(10, 8, 3);
  const RasterPtr<std::int16_t> view(new RasterView<std::int16_t>(ramp));
  EXPECT_TRUE(view->IsValid());
  EXPECT_EQ(view->Samples(), 10U);
  EXPECT_EQ(view->Lines(), 8U);
  EXPECT_EQ(view->Bands(), 3U);
  EXPECT_EQ(view->GetRasterDef().samples, 10U);
  EXPECT_EQ(view->NoDataValue(0), 77);
  EXPECT_EQ(view->PixelCount(0, IPC()), 0U);
  Array<std::int16_t> pixels;
  Array<unsigned char> state;
  ASSERT_TRUE(view->GetSubRect({2, 1, 3, 2}, MakeArray<unsigned>({1, 0, 1}), Interleave::BSQ,
                               pixels, state));
  EXPECT_EQ(pixels.GetDims(), ArrayDims(3, 2, 2));
  const std::int16_t* pixel = pixels.begin();
  for (const unsigned band : {1U, 0U, 1U})
    for (const unsigned line : {1U, 2U})
      for (const unsigned sample : {2U, 3U})
        EXPECT_EQ(*pixel++, RampValue<std::int16_t>(sample, line, band));
}

/// Answers every statistic with its bit and its bands, and has none at hand but those.
class Answering final : public TestRaster<float> {
 public:
  Answering() : TestRaster(2, 2, 3) {}
  bool StatsExist(unsigned band, unsigned) const override { return band < known; }
  StatValue<float> StatOf(StatsMask::Code stat, unsigned band, unsigned otherBand,
                          const IPC& ipc) override {
    ipc.progress->Update(1.0);
    reports.push_back(ipc.progress->GetProgress());
    return {-Value(stat, band, otherBand), Value(stat, band, otherBand)};
  }
  RasterBandStats<float> BandStats(unsigned) const override { return atHand; }

  static float Value(unsigned stat, unsigned band, unsigned otherBand) {
    return static_cast<float>(stat * 100 + band * 10 + otherBand);
  }
  unsigned known = 3;
  RasterBandStats<float> atHand;
  std::vector<double> reports;
};

TEST(Raster, EachNameAsksForItsStatistic) {
  Answering raster;
  BasicRaster& basic = raster;
  const IPC ipc;
  EXPECT_EQ(raster.Min(2, ipc), -120);
  EXPECT_EQ(raster.Max(2, ipc), -220);
  EXPECT_EQ(basic.Mean(2, ipc), 420);
  EXPECT_EQ(basic.Std(2, ipc), 820);
  EXPECT_EQ(basic.Sum(2, ipc), 1620);
  EXPECT_EQ(basic.Sum2(2, ipc), 3220);
  EXPECT_EQ(basic.RMS(2, ipc), 6420);
  EXPECT_EQ(basic.SumXY(2, 1, ipc), 12821);
  EXPECT_EQ(basic.Cov(2, 1, ipc), 25621);
}

TEST(Raster, GivesTheStatisticsOfABandInOneCall) {
  Answering raster;
  const IPC ipc;
  const auto stats = raster.ComputeBandStats(1, StatsMask::Extended, ipc, 2);
  EXPECT_EQ(stats.mask, StatsMask::Extended);
  EXPECT_EQ(stats.min, -110);
  EXPECT_EQ(stats.max, -210);
  EXPECT_EQ(std::vector({stats.mean, stats.std, stats.sum, stats.sum2, stats.rms}),
            (std::vector<double>{410, 810, 1610, 3210, 6410}));
  EXPECT_EQ(std::vector(stats.sumXY.begin(), stats.sumXY.end()),
            (std::vector<double>{12810, 12811, 12812}));
  EXPECT_EQ(std::vector(stats.cov.begin(), stats.cov.end()),
            (std::vector<double>{25610, 25611, 25612}));
  ASSERT_EQ(raster.reports.size(), 13U);
  for (std::size_t i = 0; i < 13; ++i) EXPECT_NEAR(raster.reports[i], (i + 1.0) / 26, 1e-12);

  // The results of one computation go first, and end the questions.
  raster.reports.clear();
  raster.atHand.mask = StatsMask::Basic;
  raster.atHand.mean = 5;
  EXPECT_EQ(raster.ComputeBandStats(1, StatsMask::Basic, ipc, 2).mean, 5);
  EXPECT_EQ(raster.reports.size(), 1U);
  EXPECT_NEAR(ipc.progress->GetProgress(), 1.0, 1e-12);
  // Without the arrays of all bands it isn't whole.
  raster.atHand.mask = StatsMask::Extended;
  EXPECT_EQ(raster.ComputeBandStats(1, StatsMask::Extended, ipc).cov.GetCount(), 3U);

  raster.reports.clear();
  raster.known = 0;
  EXPECT_EQ(raster.ComputeBandStats(1, StatsMask::Basic, ipc).mask, StatsMask::None);
  EXPECT_EQ(raster.reports.size(), 1U);
}

TEST(RasterView, ShowsOtherBandsByTheirOrderAlone) {
  class Source final : public RasterView<float> {
   public:
    using RasterView::RasterView;
    RasterDef GetRasterDef() const override {
      RasterDef def = RasterView::GetRasterDef();
      def.noData = {{1, 5.0}, {2, 7.0}};
      return def;
    }
  };
  class Picked final : public RasterView<float> {
   public:
    using RasterView::RasterView;
    const Array<unsigned>* BandOrder() const override { return &order; }
    Array<unsigned> order = MakeArray<unsigned>({2U, 0U});
  };
  const Pointer<MemoryTestRaster<float>> store(new MemoryTestRaster<float>(2, 1, 3));
  Picked view{RasterPtr<float>(new Source(store))};
  EXPECT_EQ(view.Bands(), 2U);
  EXPECT_EQ(view.GetRasterDef().bands, 2U);
  EXPECT_EQ(view.GetRasterDef().noData, (std::map<unsigned, double>{{0, 7.0}}));
  EXPECT_EQ(view.NoDataValue(0), RampValue<float>(77, 0, 2));
  Array<float> pixels = MakeArray<float>({1, 2, 3, 4});
  Array<unsigned char> states = MakeArray<unsigned char>({0, 0, 0, 0});
  ASSERT_TRUE(view.PutSubRect({0, 0, 1, 0}, MakeArray<unsigned>({0U, 1U}), Interleave::BIP, pixels,
                              states));
  EXPECT_EQ(store->pixels, (std::vector<float>{2, 0, 1, 4, 0, 3}));
}

TEST(RasterView, WithoutAParentGivesEmptyAnswers) {
  RasterView<float> view;
  const IPC ipc;
  Array<float> pixels;
  Array<unsigned char> state;
  const Array<unsigned> bands = MakeArray<unsigned>({0});
  EXPECT_FALSE(view.IsValid());
  EXPECT_EQ(view.Samples() + view.Lines() + view.Bands(), 0U);
  EXPECT_EQ(view.DataType(), 4U);
  EXPECT_FALSE(view.GetSubRect({}, bands, Interleave::BIP, pixels, state));
  EXPECT_FALSE(view.PutSubRect({}, bands, Interleave::BIP, pixels, state));
  EXPECT_FALSE(view.CanWrite() || view.PyramidExists() || view.WriteStats() ||
               view.WriteHistogram() || view.PyramidDelete() || view.PyramidRefresh() ||
               view.StatsExist(0, StatsMask::Min) || view.HasNoDataValue(0) || view.HasPalette(0) ||
               view.DeletePalette(0));
  EXPECT_EQ(view.GetPyramidDef(), PyramidDef());
  EXPECT_EQ(view.TileDimensions(), TileDimensions());
  EXPECT_TRUE(view.StatsBuild(ipc).IsNull());
  EXPECT_TRUE(view.PyramidLevel(1).IsNull());
  EXPECT_TRUE(view.Palette(0).IsNull());
  EXPECT_TRUE(view.HistogramAllBands(0, 1, 2, HistogramSign::kBoth, ipc).IsNull());
  EXPECT_EQ(view.Mean(0, ipc) + view.Cov(0, 1, ipc) + view.Max(0, ipc), 0.0);
  EXPECT_EQ(view.BandHistogram(0).GetCount(), 0U);
  EXPECT_EQ(view.GetRasterDef().samples, 0U);
}

}  // namespace
}  // namespace lumo
