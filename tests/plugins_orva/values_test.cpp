#include <cmath>
#include <limits>

#include "commands/value_text.h"
#include "orva_scene.h"

namespace lumo::test {
namespace {

/// The extremes of T, which text carries badly.
template <typename T>
T Low() {
  return std::numeric_limits<T>::lowest();
}
template <typename T>
T High() {
  return std::numeric_limits<T>::max();
}

template <typename T>
Array<RasterBandStats<T>> SomeStats() {
  RasterBandStats<T> basic, extended;
  basic.band = 2;
  basic.mask = StatsMask::Basic;
  basic.min = Low<T>();
  basic.max = High<T>();
  basic.pixelCount = 18446744073709551615U;
  basic.mean = 0.1;
  basic.std = 1.0 / 3;
  basic.sum = -1e300;
  basic.sum2 = 5e-324;
  basic.rms = std::numeric_limits<double>::infinity();
  extended = basic;
  extended.band = 0;
  extended.mask = StatsMask::Extended;
  extended.min = T(44);  // in a list of characters it would be a comma
  extended.sumXY = MakeArray<double>({1.1, 2.2, 3.3});
  extended.cov = MakeArray<double>({-1.1, 0, std::nan("")});
  return MakeArray<RasterBandStats<T>>({basic, extended});
}

template <typename T>
Array<RasterBandHistogram<T>> SomeHistograms() {
  RasterBandHistogram<T> first, second;
  first.band = 1;
  first.binSize = 0.7;
  first.binCount = 3;
  first.counts = MakeArray<unsigned long long>({0, 18446744073709551615U, 7});
  first.min = T(44);
  first.max = T(125);  // a closing brace among characters
  first.source = StatsSource::kDynamic;
  first.sign = HistogramSign::kPositive;
  second = first;
  second.min = Low<T>();
  second.max = High<T>();
  return MakeArray<RasterBandHistogram<T>>({first, second});
}

Palette SomePalette() {
  Palette palette;
  palette.Append(Color("dark red, {odd} name", 139, 0, 1, 2));
  palette.Append(Color());
  palette.Append(Color("", 0, 255, 0));
  return palette;
}

TEST(OrvaValues, ComeBackExactlyForEveryTypeThatHasStatistics) {
  const TemporaryDirectory directory;
  const auto path = (directory.Path() / "scene").string();
  ForEachType(TenTypes{}, [&]<typename T>() {
    SCOPED_TRACE(DataTypeName(kDataTypeOf<T>).ToUTF8());
    Scene().Write<T>(path);
    const auto stats = SomeStats<T>();
    const auto histograms = SomeHistograms<T>();
    const Palette palette = SomePalette();
    {
      auto source = OpenSource({"ORVA", path});
      const auto reader = ReaderOf<T>(source);
      ASSERT_TRUE(reader) << TakeFault().ToUTF8();
      EXPECT_FALSE(reader->StatsExist(0));
      EXPECT_EQ(reader->StatsMask(), 511);
      EXPECT_TRUE(reader->CanWriteStats() && reader->CanWriteHistogram());
      ASSERT_TRUE(reader->WriteStats(stats)) << TakeFault().ToUTF8();
      ASSERT_TRUE(reader->WriteHistogram(histograms));
      ASSERT_TRUE(reader->WritePalette(3, palette));
      ASSERT_TRUE(reader->WritePalette(1, palette));
      ASSERT_TRUE(reader->DeletePalette(1));
    }
    auto source = OpenSource({"ORVA", path});
    const auto reader = ReaderOf<T>(source);
    ASSERT_TRUE(reader) << TakeFault().ToUTF8();
    EXPECT_FALSE(reader->StatsExist(1));
    EXPECT_EQ(reader->StatsMask(), 127) << "one band has no products";
    for (const RasterBandStats<T>& want : stats) {
      EXPECT_TRUE(reader->StatsExist(want.band));
      const RasterBandStats<T> got = reader->ReadStats(want.band);
      EXPECT_EQ(FormatValue(got), FormatValue(want));
      EXPECT_EQ(got.pixelCount, want.pixelCount);
      EXPECT_EQ(got.min, want.min);
      EXPECT_EQ(got.max, want.max);
      EXPECT_EQ(got.sum2, want.sum2);
    }
    EXPECT_EQ(reader->Histogram(0).GetCount(), 0U);
    const auto got = reader->Histogram(1);
    ASSERT_EQ(got.GetCount(), 2U);
    for (unsigned i = 0; i < 2; ++i) {
      EXPECT_TRUE(got[i] == histograms[i]);
      EXPECT_EQ(got[i].binSize, histograms[i].binSize);
    }
    EXPECT_FALSE(reader->HasPalette(1));
    EXPECT_EQ(FormatValue(reader->Palette(3)), FormatValue(palette));
  });
}

TEST(OrvaValues, WritingPixelsTakesStatisticsAway) {
  const TemporaryDirectory directory;
  const auto path = (directory.Path() / "scene").string();
  Scene().Write<float>(path);
  auto source = OpenSource({"ORVA", path});
  const auto reader = ReaderOf<float>(source);
  ASSERT_TRUE(reader && reader->WriteStats(SomeStats<float>()) &&
              reader->WriteHistogram(SomeHistograms<float>()) &&
              reader->WritePalette(0, SomePalette()));
  ASSERT_TRUE((Block<float>{{0, 0, 0, 0}, {0}, {1.5F}, {0}}.Write(*reader)));
  // Another connection sees it at once, whatever becomes of this one.
  auto other = OpenSource({"ORVA", path});
  const auto reread = ReaderOf<float>(other);
  ASSERT_TRUE(reread);
  EXPECT_FALSE(reread->StatsExist(0));
  EXPECT_EQ(reread->Histogram(1).GetCount(), 0U);
  EXPECT_TRUE(reread->HasPalette(0));
}

TEST(OrvaValues, ConnectionsDoNotUndoOneAnother) {
  const TemporaryDirectory directory;
  const auto path = (directory.Path() / "scene").string();
  Scene().Write<float>(path);
  auto one = OpenSource({"ORVA", path}), two = OpenSource({"ORVA", path});
  const auto first = ReaderOf<float>(one), second = ReaderOf<float>(two);
  ASSERT_TRUE(first && second);
  ASSERT_TRUE(first->WriteStats(SomeStats<float>()));
  ASSERT_TRUE(second->WritePalette(0, SomePalette()));
  // Each knows only of its own: the statistics and histograms of other bands stay.
  Array<RasterBandStats<float>> none{ArrayDims(4)};
  for (unsigned band = 0; band < 4; ++band) none[band].band = band;
  none[1].mask = StatsMask::Basic;
  Array<RasterBandHistogram<float>> ofOne = SomeHistograms<float>(), ofTwo = ofOne;
  for (RasterBandHistogram<float>& histogram : ofTwo) histogram.band = 2;
  ASSERT_TRUE(first->WriteHistogram(ofOne) && second->WriteHistogram(ofTwo));
  auto third = OpenSource({"ORVA", path});
  const auto source = ReaderOf<float>(third);
  EXPECT_TRUE(source->StatsExist(0) && source->StatsExist(2) && source->HasPalette(0));
  EXPECT_EQ(source->Histogram(1).GetCount(), 2U);
  EXPECT_EQ(source->Histogram(2).GetCount(), 2U);
  auto fourth = OpenSource({"ORVA", path});
  ASSERT_TRUE(first->WriteStats(SomeStats<float>()));
  ASSERT_TRUE(ReaderOf<float>(fourth)->WriteStats(none)) << "which knows of bands 0 and 2";
  auto fifth = OpenSource({"ORVA", path});
  EXPECT_TRUE(ReaderOf<float>(fifth)->StatsExist(1));
  EXPECT_FALSE(ReaderOf<float>(fifth)->StatsExist(0));
  // A writer takes away the values that it knows of, and no others.
  Array<RasterBandHistogram<float>> ofThree = ofOne;
  for (RasterBandHistogram<float>& histogram : ofThree) histogram.band = 3;
  ASSERT_TRUE(first->WriteHistogram(ofThree));
  ASSERT_TRUE(ReaderOf<float>(fifth)->WriteHistogram({}));
  auto last = OpenSource({"ORVA", path});
  EXPECT_EQ(ReaderOf<float>(last)->Histogram(1).GetCount(), 0U);
  EXPECT_EQ(ReaderOf<float>(last)->Histogram(3).GetCount(), 2U);
}

TEST(OrvaValues, ComplexPixelsHaveNoStatistics) {
  const TemporaryDirectory directory;
  const auto path = (directory.Path() / "scene").string();
  Scene().Write<Complex<float>>(path);
  auto source = OpenSource({"ORVA", path});
  const auto reader = ReaderOf<Complex<float>>(source);
  ASSERT_TRUE(reader);
  EXPECT_EQ(reader->StatsMask(), 0);
  EXPECT_FALSE(reader->CanWriteStats() || reader->CanWriteHistogram());
  EXPECT_FALSE(reader->WriteStats({}));
  EXPECT_TRUE(reader->WritePalette(0, SomePalette()));
}

TEST(OrvaValues, BandsThatAreNotThereAreRefused) {
  const TemporaryDirectory directory;
  const auto path = (directory.Path() / "scene").string();
  Scene scene;
  scene.bands = 1;
  scene.Write<float>(path);
  auto source = OpenSource({"ORVA", path});
  const auto reader = ReaderOf<float>(source);
  ASSERT_TRUE(reader);
  const std::string before = ReadFile(path + ".hdr");
  EXPECT_FALSE(reader->WriteStats(SomeStats<float>()));
  EXPECT_FALSE(reader->WriteHistogram(SomeHistograms<float>()));
  EXPECT_FALSE(reader->WritePalette(1, SomePalette()));
  EXPECT_EQ(ReadFile(path + ".hdr"), before);
}

}  // namespace
}  // namespace lumo::test
