#include <filesystem>
#include <fstream>
#include <limits>

#include "gdal_peer.h"
#include "support/file_bytes.h"
#include "support/file_size_limit.h"
#include "support/sample_data.h"
#include "support/temporary_directory.h"
#include "views/sources/catalog_raster_ref.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::Block;
using test::OpenSource;
using test::Peer;
using test::ReaderOf;
using test::Release;

/// A raster that the test may change: a copy of a sample, or one made by GDAL.
class Copy {
 public:
  explicit Copy(const char* sample) : path_((directory_.Path() / sample).string()) {
    fs::copy_file(test::SampleData(sample), path_);
  }
  Copy(const char* name, const char* driver, GDALDataType type, const char* option = nullptr)
      : path_((directory_.Path() / name).string()) {
    GDALAllRegister();
    GDALDatasetH const made = GDALCreate(GDALGetDriverByName("MEM"), "", 50, 40, 1, type, nullptr);
    for (int y = 0; y < 40; ++y) {
      std::vector<double> line(50);
      for (int x = 0; x < 50; ++x) line[static_cast<std::size_t>(x)] = x % 10 + y;
      EXPECT_EQ(GDALRasterIO(GDALGetRasterBand(made, 1), GF_Write, 0, y, 50, 1, line.data(), 50, 1,
                             GDT_Float64, 0, 0),
                CE_None);
    }
    const char* const options[] = {option, nullptr};
    GDALClose(GDALCreateCopy(GDALGetDriverByName(driver), path_.c_str(), made, FALSE,
                             const_cast<char**>(options), nullptr, nullptr));
    GDALClose(made);
  }
  const std::string& Path() const { return path_; }
  std::string Bytes() const {
    std::ifstream in(path_, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
  }

 private:
  test::TemporaryDirectory directory_;
  std::string path_;
};

template <typename T>
RasterBandStats<T> StatsAtTheLimits(unsigned band) {
  RasterBandStats<T> stats;
  stats.band = band;
  stats.mask = StatsMask::Basic;
  stats.min = std::numeric_limits<T>::lowest();
  stats.max = std::numeric_limits<T>::max();
  stats.mean = 1.0 / 3.0 + band;
  stats.std = 2.0 / 7.0;
  stats.sum = 1e20 / 3.0;
  stats.sum2 = 2e20 / 3.0;
  stats.rms = 5.0 / 3.0;
  stats.pixelCount = 1000;
  return stats;
}

TEST(GdalValues, StatisticsComeBackToTheBit) {
  const struct {
    const char* name;
    const char* driver;
    GDALDataType type;
    const char* option;
  } cases[] = {{"a.tif", "GTiff", GDT_Byte, nullptr},
               {"b.tif", "GTiff", GDT_Byte, "PIXELTYPE=SIGNEDBYTE"},
               {"c.tif", "GTiff", GDT_Int64, nullptr},
               {"d.tif", "GTiff", GDT_UInt64, nullptr},
               {"e.tif", "GTiff", GDT_Float32, nullptr},
               {"f.tif", "GTiff", GDT_Float64, nullptr},
               {"g.img", "HFA", GDT_UInt32, nullptr},
               {"h.png", "PNG", GDT_UInt16, nullptr},
               {"i.ntf", "NITF", GDT_Int16, nullptr}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    const Copy copy(c.name, c.driver, c.type, c.option);
    const std::string before = copy.Bytes();
    auto source = OpenSource({copy.Path()});
    const auto write = [&]<typename T>(RasterReader<T>& reader) {
      if constexpr (std::is_arithmetic_v<T>) {
        EXPECT_FALSE(reader.StatsExist(0));
        ASSERT_TRUE(reader.CanWriteStats());
        Array<RasterBandStats<T>> all{ArrayDims(1)};
        all[0] = StatsAtTheLimits<T>(0);
        ASSERT_TRUE(reader.WriteStats(all)) << TakeFault().ToUTF8();
        EXPECT_TRUE(reader.StatsExist(0));
      }
    };
    ASSERT_TRUE(test::WithType(source, write));
    Release(source);
    EXPECT_EQ(copy.Bytes(), before);  // they lie beside the file
    source = OpenSource({copy.Path()});
    const auto read = [&]<typename T>(RasterReader<T>& reader) {
      if constexpr (std::is_arithmetic_v<T>) {
        const auto want = StatsAtTheLimits<T>(0);
        ASSERT_TRUE(reader.StatsExist(0));
        const auto stats = reader.ReadStats(0);
        EXPECT_EQ(stats.mask, static_cast<unsigned>(StatsMask::Basic));
        EXPECT_EQ(stats.pixelCount, want.pixelCount);
        EXPECT_EQ(stats.min, want.min);
        EXPECT_EQ(stats.max, want.max);
        EXPECT_EQ(stats.mean, want.mean);
        EXPECT_EQ(stats.std, want.std);
        EXPECT_EQ(stats.sum, want.sum);
        EXPECT_EQ(stats.sum2, want.sum2);
        EXPECT_EQ(stats.rms, want.rms);
      }
    };
    ASSERT_TRUE(test::WithType(source, read));
  }
}

TEST(GdalValues, StoredStatisticsStandUntilAnotherProgramReplacesThem) {
  const Copy copy("a.tif", "GTiff", GDT_Byte, nullptr);
  auto source = OpenSource({copy.Path()});
  Array<RasterBandStats<std::uint8_t>> all{ArrayDims(1)};
  all[0] = StatsAtTheLimits<std::uint8_t>(0);
  ASSERT_TRUE(ReaderOf<std::uint8_t>(source)->WriteStats(all));
  Release(source);
  {
    const Peer peer(copy.Path());
    const char* const std = GDALGetMetadataItem(peer.Band(0), "STATISTICS_STDDEV", nullptr);
    ASSERT_NE(std, nullptr);
    EXPECT_NEAR(CPLAtof(std), 2.0 / 7.0 * std::sqrt(0.999), 1e-15);  // divided by n there
    GDALSetMetadataItem(peer.Band(0), "STATISTICS_MEAN", "17", nullptr);
  }
  source = OpenSource({copy.Path()});
  const auto stats = ReaderOf<std::uint8_t>(source)->ReadStats(0);
  EXPECT_EQ(stats.mean, 17.0);
  EXPECT_EQ(stats.mask & StatsMask::Sum, 0U);
}

TEST(GdalValues, ReadsTheStatisticsThatGdalStored) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  for (const bool approximate : {false, true}) {
    const Copy copy("landsat7_u16_tiled.tif");
    double min = 0, max = 0, mean = 0, std = 0;
    {
      const Peer peer(copy.Path());
      ASSERT_EQ(GDALComputeRasterStatistics(peer.Band(2), approximate, &min, &max, &mean, &std,
                                            nullptr, nullptr),
                CE_None);
    }
    const auto reader = ReaderOf<std::uint16_t>(OpenSource({copy.Path()}));
    const auto source = OpenSource({copy.Path()});
    EXPECT_FALSE(ReaderOf<std::uint16_t>(source)->StatsExist(1));
    EXPECT_EQ(ReaderOf<std::uint16_t>(source)->StatsExist(2), !approximate);
    if (approximate) continue;
    const auto stats = ReaderOf<std::uint16_t>(source)->ReadStats(2);
    EXPECT_EQ(stats.min, 824);
    EXPECT_EQ(stats.max, 10000);
    EXPECT_NEAR(stats.mean, mean, 1e-9);
    EXPECT_NEAR(stats.std, std * std::sqrt(122848.0 / 122847.0), 1e-9);
    EXPECT_EQ(stats.pixelCount, 122848U);
  }
}

template <typename T>
RasterBandHistogram<T> SomeHistogram(T min, double binSize, unsigned binCount) {
  RasterBandHistogram<T> histogram;
  histogram.source = StatsSource::kDynamic;
  histogram.min = min;
  histogram.binSize = binSize;
  histogram.binCount = binCount;
  histogram.counts = Array<unsigned long long>{ArrayDims(binCount)};
  for (unsigned i = 0; i < binCount; ++i) histogram.counts[i] = i * i + (1ULL << 33);
  return histogram;
}

/// Writes a histogram, and compares with what comes back and with what GDAL makes of it.
template <typename T>
void ExpectHistogramKept(const Copy& copy, RasterBandHistogram<T> histogram, T max,
                         double lowEdge) {
  auto source = OpenSource({copy.Path()});
  ASSERT_TRUE(source);
  histogram.max = max;
  Array<RasterBandHistogram<T>> all{ArrayDims(1)};
  all[0] = histogram;
  EXPECT_EQ(ReaderOf<T>(source)->Histogram(0).GetCount(), 0U);
  ASSERT_TRUE(ReaderOf<T>(source)->WriteHistogram(all)) << TakeFault().ToUTF8();
  Release(source);

  source = OpenSource({copy.Path()});
  const auto read = ReaderOf<T>(source)->Histogram(0);
  ASSERT_EQ(read.GetCount(), 1U);
  histogram.source = StatsSource::kNative;
  EXPECT_EQ(read[0], histogram);
  EXPECT_EQ(read[0].binSize, histogram.binSize);

  const Peer peer(copy.Path());
  double low = 0, high = 0;
  int bins = 0;
  GUIntBig* counts = nullptr;
  ASSERT_EQ(
      GDALGetDefaultHistogramEx(peer.Band(0), &low, &high, &bins, &counts, FALSE, nullptr, nullptr),
      CE_None);
  EXPECT_EQ(low, lowEdge);
  EXPECT_EQ(high, lowEdge + histogram.binSize * histogram.binCount);
  ASSERT_EQ(bins, static_cast<int>(histogram.binCount));
  EXPECT_TRUE(std::equal(counts, counts + bins, histogram.counts.begin()));
  VSIFree(counts);
}

TEST(GdalValues, HistogramsComeBack) {
  ExpectHistogramKept<std::uint8_t>(Copy("a.tif", "GTiff", GDT_Byte),
                                    SomeHistogram<std::uint8_t>(0, 1, 256), 255, -0.5);
  ExpectHistogramKept<std::int16_t>(Copy("b.tif", "GTiff", GDT_Int16),
                                    SomeHistogram<std::int16_t>(-100, 25, 9), 124, -100.5);
  ExpectHistogramKept<float>(Copy("c.png.tif", "GTiff", GDT_Float32),
                             SomeHistogram<float>(-1.5F, 0.25, 10), 1.0F, -1.5);
  ExpectHistogramKept<std::uint8_t>(Copy("d.png", "PNG", GDT_Byte),
                                    SomeHistogram<std::uint8_t>(10, 2, 5), 19, 9.5);
  ExpectHistogramKept<std::uint8_t>(Copy("e.img", "HFA", GDT_Byte),
                                    SomeHistogram<std::uint8_t>(0, 1, 256), 255, -0.5);
}

/// Several that have a raster open store different things: all of them stay, and so does what was
/// in the side file before.
TEST(GdalValues, ConnectionsDoNotUndoOneAnother) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const Copy copy("landsat7_olinda.tif");
  {
    const Peer peer(copy.Path());
    GDALSetMetadataItem(peer.Band(0), "NOTE", "kept", nullptr);
  }
  std::vector<RasterDataConnectionPtr> sources;
  std::vector<RasterReaderPtr<std::uint8_t>> readers;
  for (int i = 0; i < 4; ++i) {
    sources.push_back(OpenSource({copy.Path()}));
    readers.push_back(ReaderOf<std::uint8_t>(sources.back()));
    ASSERT_TRUE(readers.back());
  }
  for (const unsigned band : {0U, 1U}) {
    Array<RasterBandStats<std::uint8_t>> stats{ArrayDims(1)};
    stats[0] = StatsAtTheLimits<std::uint8_t>(band);
    ASSERT_TRUE(readers[band]->WriteStats(stats)) << TakeFault().ToUTF8();
    Array<RasterBandHistogram<std::uint8_t>> histograms{ArrayDims(1)};
    histograms[0] = SomeHistogram<std::uint8_t>(0, 1, 256);
    histograms[0].band = band;
    ASSERT_TRUE(readers[2 + band]->WriteHistogram(histograms)) << TakeFault().ToUTF8();
  }
  for (auto& source : sources) Release(source);  // which stores nothing of what it knew
  const auto source = OpenSource({copy.Path()});
  const auto reader = ReaderOf<std::uint8_t>(source);
  for (const unsigned band : {0U, 1U}) {
    EXPECT_EQ(reader->ReadStats(band).mean, 1.0 / 3.0 + band);
    EXPECT_EQ(reader->Histogram(band).GetCount(), 1U);
  }
  EXPECT_STREQ(GDALGetMetadataItem(Peer(copy.Path()).Band(0), "NOTE", nullptr), "kept");
}

/// A save that fails leaves the side file, and is not made up for later, when the raster is closed.
TEST(GdalValues, AFailedSaveStaysOne) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const Copy copy("landsat7_olinda.tif");
  auto source = OpenSource({copy.Path()});
  const auto reader = ReaderOf<std::uint8_t>(source);
  Array<RasterBandStats<std::uint8_t>> stats{ArrayDims(1)};
  stats[0] = StatsAtTheLimits<std::uint8_t>(0);
  ASSERT_TRUE(reader->WriteStats(stats));
  const std::string before = test::FileBytes(copy.Path() + ".aux.xml");
  stats[0].mean = 7;
  {
    const test::FileSizeLimit limit(100);
    EXPECT_FALSE(reader->WriteStats(stats));
    EXPECT_EQ(TakeFault().ToUTF8(), copy.Path() + ".aux.xml: File too large");
  }
  EXPECT_EQ(reader->ReadStats(0).mean, 1.0 / 3.0);
  Release(source);
  EXPECT_EQ(test::FileBytes(copy.Path() + ".aux.xml"), before);
}

TEST(GdalValues, OnlyHistogramsOfBothSignsAreStored) {
  const Copy copy("a.tif", "GTiff", GDT_Int16);
  const auto source = OpenSource({copy.Path()});
  Array<RasterBandHistogram<std::int16_t>> all{ArrayDims(1)};
  all[0] = SomeHistogram<std::int16_t>(0, 1, 10);
  all[0].sign = HistogramSign::kPositive;
  EXPECT_FALSE(ReaderOf<std::int16_t>(source)->WriteHistogram(all));
  EXPECT_NE(TakeFault().GetLength(), 0U);
}

TEST(GdalValues, PalettesAreWrittenReadAndTakenAway) {
  const struct {
    const char* name;
    const char* driver;
  } cases[] = {{"a.tif", "GTiff"}, {"b.img", "HFA"}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    const Copy copy(c.name, c.driver, GDT_Byte);
    auto source = OpenSource({copy.Path()});
    ASSERT_FALSE(ReaderOf<std::uint8_t>(source)->HasPalette(0));
    Palette palette;
    for (unsigned i = 0; i < 256; ++i) {
      const auto part = static_cast<std::uint8_t>(i);
      palette.Append(Color("any", part, 255 - part, part / 2));
    }
    ASSERT_TRUE(ReaderOf<std::uint8_t>(source)->WritePalette(0, palette)) << TakeFault().ToUTF8();
    ASSERT_EQ(Release(source), "");
    source = OpenSource({copy.Path()});
    Palette read = ReaderOf<std::uint8_t>(source)->Palette(0);
    ASSERT_EQ(read.GetCount(), 256U);
    for (unsigned i = 0; i < 256; ++i) {
      EXPECT_EQ(+read.At(i)->r, +palette.At(i)->r) << i;
      EXPECT_EQ(+read.At(i)->g, +palette.At(i)->g) << i;
      EXPECT_EQ(+read.At(i)->b, +palette.At(i)->b) << i;
      EXPECT_EQ(+read.At(i)->a, 255) << i;
    }
    EXPECT_EQ(read.At(3)->name.ToUTF8(), "#03fc01");
    // The pixels are still there.
    Block<std::uint8_t> block{{0, 0, 49, 39}, {0}, {}, {}};
    ASSERT_TRUE(block.Read(*ReaderOf<std::uint8_t>(source)));
    EXPECT_EQ(block.pixels[1999], 48);
    const bool isGone = ReaderOf<std::uint8_t>(source)->DeletePalette(0);
    const std::string fault = TakeFault().ToUTF8();
    Release(source);
    source = OpenSource({copy.Path()});
    EXPECT_EQ(ReaderOf<std::uint8_t>(source)->HasPalette(0), !isGone) << fault;
    EXPECT_EQ(fault.empty(), isGone);
  }
}

TEST(GdalValues, APaletteThatTheFormatDropsIsNoSuccess) {
  for (const auto& [name, driver] : {std::pair{"a.png", "PNG"}, std::pair{"b.ntf", "NITF"}}) {
    SCOPED_TRACE(name);
    const Copy copy(name, driver, GDT_Byte);
    const auto source = OpenSource({copy.Path()});
    Palette palette;
    palette.Append(Color("red", 255, 0, 0));
    EXPECT_FALSE(ReaderOf<std::uint8_t>(source)->WritePalette(0, palette));
    EXPECT_TRUE(TakeFault().ToUTF8().starts_with(copy.Path() + ": "));
    EXPECT_FALSE(ReaderOf<std::uint8_t>(source)->HasPalette(0));
  }
}

TEST(GdalValues, NamesColoursByTheTable) {
  const Copy copy("a.tif", "GTiff", GDT_Byte);
  {
    const Peer peer(copy.Path(), GDAL_OF_RASTER | GDAL_OF_UPDATE);
    GDALColorTableH const table = GDALCreateColorTable(GPI_RGB);
    const GDALColorEntry red{255, 0, 0, 255}, other{255, 0, 1, 255};
    GDALSetColorEntry(table, 0, &red);
    GDALSetColorEntry(table, 1, &other);
    GDALSetRasterColorTable(peer.Band(0), table);
    GDALDestroyColorTable(table);
  }
  const auto source = OpenSource({copy.Path()});
  Palette palette = ReaderOf<std::uint8_t>(source)->Palette(0);
  ASSERT_GE(palette.GetCount(), 2U);
  EXPECT_EQ(palette.At(0)->name.ToUTF8(), "red");
  EXPECT_EQ(palette.At(1)->name.ToUTF8(), "#ff0001");
}

TEST(GdalValues, PixelsOfAnOpenFileAreChangedInPlace) {
  const struct {
    const char* name;
    const char* driver;
    bool writes;
  } cases[] = {{"a.tif", "GTiff", true},
               {"b.img", "HFA", true},
               {"d.ntf", "NITF", true},
               {"e.png", "PNG", false}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    const Copy copy(c.name, c.driver, GDT_Byte);
    auto source = OpenSource({copy.Path()});
    ASSERT_EQ(source->CanWrite(), c.writes);
    Block<std::uint8_t> patch{{20, 10, 29, 14}, {0}, std::vector<std::uint8_t>(50, 77), {}};
    patch.state.resize(50);
    EXPECT_EQ(patch.Write(*ReaderOf<std::uint8_t>(source)), c.writes);
    EXPECT_EQ(TakeFault().GetLength() == 0, c.writes);
    ASSERT_EQ(Release(source), "");
    const auto pixels = Peer::Pixels(Peer(copy.Path()).Band(0));
    for (unsigned y = 0; y < 40; ++y) {
      for (unsigned x = 0; x < 50; ++x) {
        const bool isPatched = c.writes && x >= 20 && x < 30 && y >= 10 && y < 15;
        ASSERT_EQ(pixels[y * 50 + x].real(), isPatched ? 77 : x % 10 + y) << x << ' ' << y;
      }
    }
  }
}

TEST(GdalValues, ChangedPixelsEndTheStoredStatistics) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const Copy copy("landsat7_u16_tiled.tif");
  {
    const Peer peer(copy.Path());
    for (unsigned band = 0; band < 2; ++band) {
      GDALComputeRasterStatistics(peer.Band(band), FALSE, nullptr, nullptr, nullptr, nullptr,
                                  nullptr, nullptr);
    }
  }
  auto source = OpenSource({copy.Path()});
  ASSERT_TRUE(ReaderOf<std::uint16_t>(source)->StatsExist(1));
  Block<std::uint16_t> patch{{0, 0, 0, 0}, {1}, {65535}, {0}};
  ASSERT_TRUE(patch.Write(*ReaderOf<std::uint16_t>(source))) << TakeFault().ToUTF8();
  EXPECT_FALSE(ReaderOf<std::uint16_t>(source)->StatsExist(1));
  Release(source);
  source = OpenSource({copy.Path()});
  EXPECT_TRUE(ReaderOf<std::uint16_t>(source)->StatsExist(0));
  EXPECT_FALSE(ReaderOf<std::uint16_t>(source)->StatsExist(1));
}

TEST(GdalValues, ARasterGivesNoneOfThePixelsBeforeAWrite) {
  const Copy copy("a.tif", "GTiff", GDT_Byte);
  const auto open = [&] {
    return RasterPtr<std::uint8_t>(MakeReaderRaster(DataConnectionPtr(OpenSource({copy.Path()}))));
  };
  const auto store = [&](Raster<std::uint8_t>& raster) {
    raster.SetStatsMode(StatsMode::kExtended);
    raster.Cov(0, 0, IPC());
    raster.HistogramAllBands(0, 255, 256, HistogramSign::kBoth, IPC())->WaitFinished();
    return raster.WriteStats() && raster.WriteHistogram();
  };
  const auto write = [&](Raster<std::uint8_t>& raster, std::uint8_t value) {
    Array<std::uint8_t> pixels{ArrayDims(40, 50, 1)};
    Array<unsigned char> states{ArrayDims(40, 50, 1)};
    std::fill(pixels.begin(), pixels.end(), value);
    std::fill(states.begin(), states.end(), static_cast<unsigned char>(0));
    Array<unsigned> bands{ArrayDims(1)};
    bands[0] = 0;
    return raster.PutSubRect({0, 0, 49, 39}, bands, Interleave::BIP, pixels, states);
  };
  const auto storedMean = [&] {
    const Peer peer(copy.Path());
    const char* const mean = GDALGetMetadataItem(peer.Band(0), "STATISTICS_MEAN", nullptr);
    return std::string(mean != nullptr ? mean : "");
  };
  ASSERT_TRUE(store(*open()));
  ASSERT_NE(storedMean(), "");
  {
    const auto raster = open();
    EXPECT_EQ(raster->Mean(0, IPC()), 24);  // of x % 10 + y
    ASSERT_TRUE(write(*raster, 77)) << TakeFault().ToUTF8();
    EXPECT_FALSE(raster->StatsExist(0, StatsMask::Min));
    EXPECT_EQ(raster->BandStats(0).mask, StatsMask::None);
    EXPECT_EQ(raster->BandHistogram(0).GetCount(), 0U);
    EXPECT_EQ(raster->Mean(0, IPC()), 77);
  }
  EXPECT_EQ(storedMean(), "");
  EXPECT_EQ(open()->BandHistogram(0).GetCount(), 0U);  // nor beside the file
  {
    const auto raster = open();
    ASSERT_TRUE(store(*raster));
    ASSERT_TRUE(write(*raster, 5));
    EXPECT_TRUE(raster->WriteStats());  // of nothing
    EXPECT_EQ(raster->Max(0, IPC()), 5);
    EXPECT_TRUE(raster->WriteStats());
    EXPECT_EQ(raster->BandStats(0).mean, 5);
  }
  EXPECT_EQ(storedMean(), "5");
}

TEST(GdalValues, AFileThatHasBecomeAnotherOneIsNotWritten) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const Copy copy("landsat7_u16_tiled.tif");
  auto source = OpenSource({copy.Path()});
  fs::remove(copy.Path());
  fs::copy_file(test::SampleData("rotated.tif"), copy.Path());
  const std::string before = copy.Bytes();
  Block<std::uint16_t> patch{{0, 0, 0, 0}, {1}, {65535}, {0}};
  EXPECT_FALSE(patch.Write(*ReaderOf<std::uint16_t>(source)));
  EXPECT_TRUE(TakeFault().ToUTF8().starts_with(copy.Path() + ": has become another"));
  EXPECT_FALSE(patch.Read(*ReaderOf<std::uint16_t>(source)));
  EXPECT_EQ(ReaderOf<std::uint16_t>(source)->PyramidLevelMax(), 0);
  EXPECT_FALSE(ReaderOf<std::uint16_t>(source)->StatsExist(0));
  Release(source);
  EXPECT_EQ(copy.Bytes(), before);
}

TEST(GdalValues, LevelsAreBuiltBesideTheFileAndTakenAway) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const Copy copy("landsat7_u16_tiled.tif");
  const std::string before = copy.Bytes();
  auto source = OpenSource({copy.Path()});
  const auto reader = ReaderOf<std::uint16_t>(source);
  ASSERT_FALSE(reader->PyramidExists());
  const TileDimensions tiles{};
  EXPECT_FALSE(reader->PyramidRebuild());
  ASSERT_TRUE(
      reader->PyramidBuild(1, 2, static_cast<int>(PyramidResamplingMethod::kNearest), tiles))
      << TakeFault().ToUTF8();
  EXPECT_EQ(copy.Bytes(), before);
  ASSERT_TRUE(reader->PyramidExists());
  EXPECT_EQ(reader->PyramidLevelMin(), 1);
  EXPECT_EQ(reader->PyramidLevelMax(), 2);
  EXPECT_EQ(reader->PyramidResamplingMethod(), static_cast<int>(PyramidResamplingMethod::kNearest));
  Block<std::uint16_t> whole{{0, 0, 348, 351}, {4}, {}, {}};
  ASSERT_TRUE(whole.Read(*reader));
  std::vector<std::uint16_t> level(88 * 88);
  std::vector<unsigned char> state(88 * 88);
  ASSERT_TRUE(reader->ReadPixels(0, 0, 88, 88, whole.BandArray(), 2, level.data(), state.data()));
  // A pixel of the level is one of those that it covers: 349 by 352 on 88 by 88.
  for (const auto& [x, y] : {std::pair{0U, 0U}, std::pair{40U, 60U}, std::pair{86U, 87U}}) {
    bool isOneOfThem = false;
    for (unsigned i = 0; i < 16; ++i) {
      const unsigned fullX = 349 * x / 88 + i % 4, fullY = 4 * y + i / 4;
      isOneOfThem = isOneOfThem || whole.pixels[fullY * 349 + fullX] == level[y * 88 + x];
    }
    EXPECT_TRUE(isOneOfThem) << x << ' ' << y;
  }
  EXPECT_TRUE(reader->PyramidRebuild()) << TakeFault().ToUTF8();
  EXPECT_TRUE(reader->PyramidDelete()) << TakeFault().ToUTF8();
  EXPECT_FALSE(reader->PyramidExists());
  Release(source);
  EXPECT_FALSE(fs::exists(copy.Path() + ".ovr"));
  EXPECT_EQ(copy.Bytes(), before);
}

/// Wherever a build of levels breaks off, what stood there stays as it was.
TEST(GdalValues, LevelsThatCanNotBeBuiltLeaveTheOlderOnes) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  for (const bool hasOlder : {false, true}) {
    const Copy copy("landsat7_u16_tiled.tif");
    const std::string levels = copy.Path() + ".ovr";
    auto source = OpenSource({copy.Path()});
    const auto reader = ReaderOf<std::uint16_t>(source);
    if (hasOlder) {
      ASSERT_TRUE(reader->PyramidBuild(3, 3, 0, TileDimensions{}));
    }
    const std::string older = hasOlder ? test::FileBytes(levels) : "";
    unsigned failed = 0;
    for (rlim_t bytes = 0; bytes < (1 << 20); bytes += 15000) {
      SCOPED_TRACE(testing::Message() << hasOlder << ' ' << bytes);
      bool isBuilt = false;
      {
        const test::FileSizeLimit limit(bytes);
        isBuilt = reader->PyramidBuild(1, 2, 0, TileDimensions{});
      }
      if (isBuilt) break;
      ++failed;
      EXPECT_EQ(TakeFault().ToUTF8(), levels + ": File too large");
      ASSERT_EQ(fs::exists(levels) ? test::FileBytes(levels) : "", older);
      ASSERT_EQ(std::distance(fs::directory_iterator(fs::path(levels).parent_path()), {}),
                hasOlder ? 2 : 1);
      EXPECT_EQ(reader->PyramidExists(), hasOlder);
    }
    EXPECT_GT(failed, 2U);
    ASSERT_TRUE(reader->PyramidExists());
    EXPECT_EQ(reader->PyramidLevelMax(), hasOlder ? 3 : 2);
  }
}

TEST(GdalValues, LevelsThatTheDriverBuiltShowInWhatIsOpen) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const Copy copy("landsat7_u16_tiled.tif");
  const auto other = OpenSource({copy.Path()});
  const auto reader = ReaderOf<std::uint16_t>(other);
  EXPECT_EQ(reader->PyramidType(), static_cast<int>(PyramidType::kDriver));
  {
    const BasicRasterPtr raster(MakeReaderRaster(DataConnectionPtr(OpenSource({copy.Path()})),
                                                 DataConnectionPtr(OpenSource({copy.Path()}))));
    ASSERT_TRUE(raster && !raster->PyramidExists());
    PyramidDef def;
    def.levelMin = 1;
    def.levelMax = 2;
    def.resamplingMethod = PyramidResamplingMethod::kNearest;
    const AsyncPtr build = raster->PyramidBuild(def, TileDimensions(), AsyncCallbackPtr());
    ASSERT_TRUE(build);
    build->WaitFinished();
    EXPECT_FALSE(build->HasError());
    ASSERT_TRUE(raster->PyramidExists());
    EXPECT_EQ(raster->GetPyramidDef().pyramidType, PyramidType::kDriver);
    EXPECT_EQ(raster->GetPyramidDef().levelMax, 2U);
    const RasterPtr<std::uint16_t> level = RasterPtr<std::uint16_t>(raster)->PyramidLevel(2);
    EXPECT_EQ(level->Samples(), 88U);
  }
  EXPECT_FALSE(reader->PyramidExists());
  EXPECT_TRUE(reader->PyramidRefresh()) << TakeFault().ToUTF8();
  EXPECT_EQ(reader->PyramidLevelMax(), 2);
}

}  // namespace
}  // namespace lumo
