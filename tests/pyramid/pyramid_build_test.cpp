#include <cmath>
#include <fstream>
#include <numeric>

#include "pyramid/pyramid_process.h"
#include "support/file_bytes.h"
#include "support/file_size_limit.h"
#include "support/pyramid_scene.h"
#include "support/test_types.h"

namespace lumo::test {
namespace {

constexpr unsigned kScanline = 1, kRow = 2;  // height of the source's tiles

TEST(PyramidPath, FollowsBandsAndTiles) {
  const struct {
    unsigned bands, tileHeight;
    PyramidPath want;
  } cases[] = {{9, 512, PyramidPath::kMorten}, {9, 1, PyramidPath::kMorten},
               {8, 1, PyramidPath::kScanline}, {8, 0, PyramidPath::kScanline},
               {8, 2, PyramidPath::kRow},      {1, 256, PyramidPath::kRow}};
  for (const auto& c : cases) {
    RasterDef def;
    def.bands = c.bands;
    def.tileHeight = c.tileHeight;
    EXPECT_EQ(ChoosePyramidPath(def), c.want) << c.bands << ' ' << c.tileHeight;
  }
}

TEST(PyramidPath, MortenReadsAlongZ) {
  const auto raster = MakeRamp<std::uint16_t>(3 * 256, 2 * 256, 2);
  ArgList setup(3);
  setup.Set(0, raster);
  setup.Set(1, ObjectPtr(new Scalar<unsigned>(256)));
  setup.Set(2, ObjectPtr(new Scalar<unsigned>(256)));
  RasterMortenReadTask<std::uint16_t> task(setup);
  std::vector<TilePosition> walk;
  ArgList args(1);
  while (task.Execute(args)) {
    const TilePtr<std::uint16_t> tile(args.Get(0));
    walk.push_back(tile->Index());
    EXPECT_EQ(tile->Pixel(0, 0, 0),
              RampValue<std::uint16_t>(tile->Origin().first, tile->Origin().second,
                                       walk.size() > 6 ? 1 : 0));
  }
  EXPECT_FALSE(task.HasError());
  const std::vector<TilePosition> band{{0, 0}, {1, 0}, {0, 1}, {1, 1}, {2, 0}, {2, 1}};
  std::vector<TilePosition> both = band;
  both.insert(both.end(), band.begin(), band.end());
  EXPECT_EQ(walk, both);
}

TEST(PyramidPath, ALongRasterIsWalkedWithoutDelay) {
  const auto raster = MakeRamp<std::uint8_t>(40'000'000, 1, 1);
  ArgList setup(3);
  setup.Set(0, raster);
  setup.Set(1, ObjectPtr(new Scalar<unsigned>(1000)));
  setup.Set(2, ObjectPtr(new Scalar<unsigned>(1000)));
  RasterMortenReadTask<std::uint8_t> task(setup);
  ArgList args(1);
  unsigned tiles = 0;
  while (task.Execute(args)) ++tiles;
  EXPECT_EQ(tiles, 40'000u);
}

template <typename T>
class PyramidOfType : public testing::Test {};
TYPED_TEST_SUITE(PyramidOfType, typename test::AsTestTypes<TwelveTypes>::Types);

TYPED_TEST(PyramidOfType, PixelsAreThoseOfTheRasterOnEveryPath) {
  const struct {
    const char* name;
    unsigned tileHeight, bands, side;
    Interleave interleave;
  } cases[] = {{"scanline", kScanline, 3, 16, Interleave::BIP},
               {"scanline by line", kScanline, 3, 16, Interleave::BIL},
               {"row", kRow, 3, 16, Interleave::BSQ},
               {"morten", kRow, 9, 16, Interleave::BSQ}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    PyramidScene scene;
    scene.Fake().samples = 261;
    scene.Fake().lines = 83;
    scene.Fake().bands = c.bands;
    scene.Fake().tileHeight = c.tileHeight;
    scene.Fake().interleave = c.interleave;
    const RasterPtr<TypeParam> raster = scene.Open<TypeParam>();
    ASSERT_TRUE(raster);
    const AsyncPtr build = PyramidScene::Build(*raster, 0, 3, c.side);
    ASSERT_TRUE(build && !build->HasError()) << (raster->PyramidAsync(), TakeFault().ToUTF8());
    for (unsigned level = 0; level <= 3; ++level) ExpectLevelOfRamp(*raster, level);
  }
}

TEST(PyramidBuild, PixelsAreThoseOfTheRasterAtEverySize) {
  const struct {
    unsigned samples, lines, bands, tileHeight, side, levelMin, levelMax;
  } cases[] = {{1, 1, 1, kScanline, 256, 0, 3},   {1000, 1, 1, kScanline, 8, 0, 9},
               {1, 1000, 1, kScanline, 8, 1, 9},  {5, 5, 1, kScanline, 256, 1, 1},
               {37, 211, 8, kScanline, 7, 1, 5},  {640, 480, 1, kScanline, 256, 2, 9},
               {1, 1, 1, kRow, 256, 0, 3},        {1000, 1, 1, kRow, 8, 0, 9},
               {1, 1000, 1, kRow, 8, 0, 9},       {13, 29, 8, kRow, 4, 0, 4},
               {157, 93, 2, kRow, 10, 1, 6},      {97, 200, 1, kRow, 1, 0, 2},
               {1, 1, 9, kRow, 256, 0, 3},        {700, 1, 9, kScanline, 256, 0, 9},
               {1, 700, 9, kScanline, 256, 1, 9}, {513, 600, 9, kRow, 64, 1, 11},
               {70, 41, 200, kScanline, 16, 0, 4}};
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << c.samples << " by " << c.lines << " by " << c.bands
                                    << ", side " << c.side << ", tiles " << c.tileHeight);
    PyramidScene scene;
    scene.Fake().samples = c.samples;
    scene.Fake().lines = c.lines;
    scene.Fake().bands = c.bands;
    scene.Fake().tileHeight = c.tileHeight;
    scene.Fake().hasMask = true;
    const RasterPtr<std::int32_t> raster = scene.Open<std::int32_t>();
    ASSERT_TRUE(raster);
    const AsyncPtr build = PyramidScene::Build(*raster, c.levelMin, c.levelMax, c.side);
    ASSERT_TRUE(build && !build->HasError()) << (raster->PyramidAsync(), TakeFault().ToUTF8());
    EXPECT_EQ(raster->GetPyramidDef(),
              (PyramidDef{PyramidType::kOrva, PyramidResamplingMethod::kNearest, c.levelMin,
                          c.levelMax, true, 0}));
    for (unsigned level = c.levelMin; level <= c.levelMax; ++level) {
      ExpectLevelOfRamp(*raster, level,
                        [&](unsigned x, unsigned y) { return (y * c.samples + x) % 3 == 0; });
    }
  }
}

TEST(PyramidBuild, BlocksOfALevelAreReadInAnyOrder) {
  PyramidScene scene;
  scene.Fake().samples = 100;
  scene.Fake().lines = 60;
  for (const unsigned count : {4U, 10U}) {  // strips, and band by band
    scene.Fake().bands = count;
    std::filesystem::remove(scene.Path());
    const RasterPtr<float> raster = scene.Open<float>();
    ASSERT_TRUE(PyramidScene::Build(*raster, 1, 1, 8));
    const RasterPtr<float> level = raster->PyramidLevel(1);
    for (const Interleave order : {Interleave::BIP, Interleave::BIL, Interleave::BSQ}) {
      for (const std::vector<unsigned>& bands :
           {std::vector<unsigned>{0, 1, 2, 3}, {2, 0}, {1, 1, 3}, {3}}) {
        for (const SubRect& rect : {SubRect(0, 0, 49, 29), SubRect(7, 9, 24, 16),
                                    SubRect(49, 29, 49, 29), SubRect(8, 8, 15, 15)}) {
          Array<float> pixels;
          Array<unsigned char> state;
          ASSERT_TRUE(level->GetSubRect(rect, MakeArray(bands), order, pixels, state));
          std::size_t at = 0;
          VisitBlock(order, rect, bands, [&](unsigned x, unsigned y, unsigned band) {
            ASSERT_EQ(pixels[at++], RampValue<float>(2 * x, 2 * y, band));
          });
        }
      }
    }
    Array<float> pixels;
    Array<unsigned char> state;
    EXPECT_FALSE(level->GetSubRect({49, 0, 50, 0}, MakeArray<unsigned>({0}), Interleave::BIP,
                                   pixels, state));
  }
}

TEST(PyramidBuild, LeavesStatisticsAndAHistogramOfASmallLevel) {
  const struct {
    unsigned samples, lines, bands, tileHeight, levelMin, levelMax;
    unsigned histogramLevel;  // by the rule: the larger side has 256 to 511 pixels
  } cases[] = {{100, 100, 2, kRow, 0, 3, 0},       {100, 100, 2, kScanline, 1, 3, 0},
               {1000, 500, 1, kScanline, 1, 4, 1}, {1000, 500, 1, kRow, 2, 4, 2},
               {1024, 30, 9, kRow, 1, 2, 2},       {1024, 3, 1, kScanline, 1, 2, 1},
               {1024, 1, 1, kScanline, 1, 2, 0}};
  for (const auto& c : cases) {
    SCOPED_TRACE(testing::Message() << c.samples << " by " << c.lines);
    PyramidScene scene;
    scene.Fake().samples = c.samples;
    scene.Fake().lines = c.lines;
    scene.Fake().bands = c.bands;
    scene.Fake().tileHeight = c.tileHeight;
    RasterPtr<std::int32_t> raster = scene.Open<std::int32_t>();
    ASSERT_TRUE(PyramidScene::Build(*raster, c.levelMin, c.levelMax, 16));
    const auto check = [&] {
      for (unsigned band = 0; band < std::min(c.bands, 2U); ++band) {
        ASSERT_TRUE(raster->StatsExist(band, StatsMask::Basic));
        const RasterBandStats<std::int32_t> stats = raster->BandStats(band);
        EXPECT_EQ(stats.pixelCount, std::uint64_t{c.samples} * c.lines);
        EXPECT_EQ(stats.min, RampValue<std::int32_t>(0, 0, band));
        EXPECT_EQ(stats.max, RampValue<std::int32_t>(c.samples - 1, c.lines - 1, band));
        EXPECT_DOUBLE_EQ(stats.mean,
                         (c.samples - 1) / 2.0 + 1000 * ((c.lines - 1) / 2.0) + 1'000'000.0 * band);
        const auto histograms = raster->BandHistogram(band);
        ASSERT_EQ(histograms.GetCount(), 1u);
        const RasterBandHistogram<std::int32_t>& histogram = histograms[0];
        const unsigned width = c.samples >> c.histogramLevel;
        const unsigned height = c.lines >> c.histogramLevel;
        EXPECT_EQ(std::accumulate(histogram.counts.begin(), histogram.counts.end(), 0ULL),
                  std::uint64_t{width} * height);
        EXPECT_EQ(histogram.min, RampValue<std::int32_t>(0, 0, band));
        EXPECT_EQ(histogram.max, RampValue<std::int32_t>((width - 1) << c.histogramLevel,
                                                         (height - 1) << c.histogramLevel, band));
        EXPECT_EQ(histogram.binSize, std::ceil((histogram.max - histogram.min) / 255.0));
        EXPECT_EQ(histogram.source, StatsSource::kDynamic);
      }
    };
    check();
    const unsigned reads = scene.Fake().reads;
    raster = RasterPtr<std::int32_t>();
    raster = scene.Open<std::int32_t>();  // out of the file, without a pixel being read
    check();
    EXPECT_EQ(scene.Fake().reads, reads);
  }
}

TEST(PyramidBuild, CountsExactBinsWhenAskedTo) {
  PyramidScene scene;
  scene.Fake().samples = 300;
  scene.Fake().lines = 100;
  const auto ask = [&]<typename T>(T) {
    const RasterPtr<T> raster = scene.Open<T>();
    PyramidDef def;
    def.levelMax = 1;
    def.resamplingMethod = PyramidResamplingMethod::kNearest;
    def.bins = Form::kExact;
    const AsyncPtr build = raster->PyramidBuild(def, TileDimensions{64, 64}, {});
    build->WaitFinished();
    const auto histograms = raster->BandHistogram(1);
    EXPECT_EQ(histograms.GetCount(), 1U);
    std::vector<unsigned long long> want(256);
    const double span = RampValue<double>(299, 99, 1) - RampValue<double>(0, 0, 1);
    for (unsigned y = 0; y < 100; ++y)
      for (unsigned x = 0; x < 300; ++x) {
        const double above = RampValue<double>(x, y, 1) - RampValue<double>(0, 0, 1);
        const double parts = std::is_integral_v<T> ? span + 1 : span;
        ++want[std::min<std::size_t>(255, static_cast<std::size_t>(above * 256 / parts))];
      }
    EXPECT_EQ(std::vector(histograms[0].counts.begin(), histograms[0].counts.end()), want);
    std::filesystem::remove(scene.Path());
  };
  ask(std::int32_t());
  ask(float());
}

TEST(PyramidBuild, AWriteEndsWhatThePyramidTellsOfThePixels) {
  PyramidScene scene;
  scene.Fake().samples = 300;
  scene.Fake().lines = 100;
  RasterPtr<std::int32_t> raster = scene.Open<std::int32_t>();
  ASSERT_TRUE(PyramidScene::Build(*raster, 1, 2, 64));
  ASSERT_TRUE(raster->StatsExist(0, StatsMask::Basic));
  const auto write = [&] {
    Array<std::int32_t> pixels{ArrayDims(1, 1, 1)};
    Array<unsigned char> state{ArrayDims(1, 1, 1)};
    pixels[0] = RampValue<std::int32_t>(7, 5, 0);  // the fake takes no other value there
    state[0] = 0;
    Array<unsigned> bands{ArrayDims(1)};
    bands[0] = 0;
    return raster->PutSubRect({7, 5, 7, 5}, bands, Interleave::BIP, pixels, state);
  };
  const auto expectNone = [&] {
    EXPECT_FALSE(raster->StatsExist(0, StatsMask::Mean));
    EXPECT_EQ(raster->BandStats(0).mask & StatsMask::Mean, 0U);
    EXPECT_EQ(raster->BandHistogram(0).GetCount(), 0U);
  };
  ASSERT_TRUE(write());
  expectNone();
  raster = RasterPtr<std::int32_t>();
  raster = scene.Open<std::int32_t>();
  expectNone();                                         // out of the file too
  ASSERT_TRUE(PyramidScene::Build(*raster, 1, 2, 64));  // after a write they come anew
  EXPECT_TRUE(raster->StatsExist(0, StatsMask::Basic));
  ASSERT_TRUE(write());
  expectNone();
  EXPECT_NE(raster->Mean(0, IPC()), 0);
  EXPECT_TRUE(raster->WriteStats());
  EXPECT_TRUE(raster->StatsExist(0, StatsMask::Basic));
}

/// Aborts a build when it has come half way.
class AbortHalfWay final : public AsyncCallback {
 public:
  void OnProgress(double progress) override {
    if (progress < 0.5) return;
    const AsyncPtr running = raster->PyramidAsync();
    if (running) running->Abort();
    isReached = isReached || bool(running);
  }
  BasicRaster* raster = nullptr;
  bool isReached = false;
};

TEST(PyramidBuild, OneThatDoesNotComeToItsEndLeavesTheOldLevels) {
  for (const bool hasOld : {false, true}) {
    for (const bool isAbort : {true, false}) {
      SCOPED_TRACE(testing::Message() << "old " << hasOld << ", abort " << isAbort);
      PyramidScene scene;
      scene.Fake().samples = 400;
      scene.Fake().lines = 300;
      scene.Fake().bands = 2;
      RasterPtr<std::int16_t> raster = scene.Open<std::int16_t>();
      if (hasOld) {
        ASSERT_TRUE(PyramidScene::Build(*raster, 1, 2, 16));
      }
      auto* const observer = new AbortHalfWay;
      const AsyncCallbackPtr callback(observer);
      observer->raster = raster.Get();
      if (!isAbort) scene.Fake().failAtRead = 40;
      const AsyncPtr build =
          PyramidScene::Build(*raster, 0, 4, 16, isAbort ? callback : AsyncCallbackPtr());
      ASSERT_TRUE(build);
      EXPECT_EQ(build->IsAborted(), isAbort);
      EXPECT_EQ(observer->isReached, isAbort);
      EXPECT_EQ(build->HasError(), !isAbort);
      EXPECT_FALSE(raster->PyramidAsync());
      EXPECT_EQ(TakeFault().ToUTF8(), isAbort ? "" : "fake: this block is stuck");
      EXPECT_EQ(raster->PyramidExists(), hasOld);
      EXPECT_EQ(scene.CountFiles(), hasOld ? 1u : 0u);
      if (hasOld) {
        EXPECT_EQ(raster->GetPyramidDef().levelMax, 2u);
        ExpectLevelOfRamp(*raster, 2);
      }
      const AsyncPtr again = PyramidScene::Build(*raster, 0, 4, 16);
      ASSERT_TRUE(again && !again->HasError());
      ExpectLevelOfRamp(*raster, 4);
    }
  }
}

/// Wherever the disk is full, in the levels, the index or the statistics, a build either makes a
/// whole file or leaves the older one.
TEST(PyramidBuild, AFullDiskLeavesTheOldLevels) {
  for (const bool hasOld : {false, true}) {
    PyramidScene scene;
    scene.Fake().samples = 300;
    scene.Fake().lines = 100;
    scene.Fake().bands = 2;
    RasterPtr<std::int32_t> raster = scene.Open<std::int32_t>();
    if (hasOld) {
      ASSERT_TRUE(PyramidScene::Build(*raster, 1, 1, 16));
    }
    const std::string older = hasOld ? FileBytes(scene.Path()) : "";
    bool isBuilt = false;
    unsigned failed = 0;
    for (rlim_t bytes = 6000; !isBuilt; bytes += 3000) {
      SCOPED_TRACE(testing::Message() << "old " << hasOld << ", room for " << bytes);
      {
        const FileSizeLimit limit(bytes);
        const AsyncPtr build = PyramidScene::Build(*raster, 1, 3, 16);
        ASSERT_TRUE(build);
        isBuilt = !build->HasError();
      }
      EXPECT_FALSE(raster->PyramidAsync());
      const std::string fault = TakeFault().ToUTF8();
      ASSERT_EQ(scene.CountFiles(), hasOld || isBuilt ? 1U : 0U);
      if (isBuilt) break;
      ++failed;
      EXPECT_EQ(fault, scene.Path() + ": File too large");
      ASSERT_EQ(std::filesystem::exists(scene.Path()) ? FileBytes(scene.Path()) : "", older);
      EXPECT_EQ(raster->PyramidExists(), hasOld);
      ASSERT_LT(bytes, 1U << 20);
    }
    EXPECT_GT(failed, 3U);
    ExpectLevelOfRamp(*raster, 3);
    raster = scene.Open<std::int32_t>();
    EXPECT_TRUE(raster->StatsExist(1, StatsMask::Basic));
    EXPECT_EQ(raster->BandHistogram(1).GetCount(), 1U);
  }
}

/// Another program puts a pyramid to the place while one is built: that one stays.
TEST(PyramidBuild, OfTwoBuildersOneWinsAndTheOtherSaysSo) {
  for (const bool hasOld : {false, true}) {
    PyramidScene scene;
    scene.Fake().samples = 400;
    scene.Fake().lines = 300;
    const RasterPtr<std::int16_t> raster = scene.Open<std::int16_t>();
    if (hasOld) {
      ASSERT_TRUE(PyramidScene::Build(*raster, 1, 1, 16));
    }
    class Intruder final : public AsyncCallback {
     public:
      void OnProgress(double progress) override {
        if (progress < 0.5 || isDone) return;
        std::ofstream(path + ".other") << "another program's";
        std::filesystem::rename(path + ".other", path);
        isDone = true;
      }
      std::string path;
      bool isDone = false;
    };
    auto* const intruder = new Intruder;
    const AsyncCallbackPtr callback(intruder);
    intruder->path = scene.Path();
    const AsyncPtr build = PyramidScene::Build(*raster, 0, 4, 16, callback);
    ASSERT_TRUE(build && intruder->isDone);
    EXPECT_TRUE(build->HasError());
    EXPECT_FALSE(raster->PyramidAsync());
    EXPECT_EQ(TakeFault().ToUTF8(), scene.Path() + ": another program has built it meanwhile");
    EXPECT_EQ(FileBytes(scene.Path()), "another program's");
    EXPECT_EQ(scene.CountFiles(), 1U);
  }
}

TEST(PyramidBuild, AnotherConnectionSeesTheOldLevelsUntilItRefreshes) {
  PyramidScene scene;
  scene.Fake().samples = 64;
  scene.Fake().lines = 64;
  const RasterPtr<std::int16_t> raster = scene.Open<std::int16_t>();
  ASSERT_TRUE(PyramidScene::Build(*raster, 1, 1, 16));
  const RasterPtr<std::int16_t> other = scene.Open<std::int16_t>();
  ASSERT_TRUE(PyramidScene::Build(*raster, 2, 3, 8));
  EXPECT_EQ(raster->GetPyramidDef().levelMin, 2u);
  EXPECT_EQ(other->GetPyramidDef().levelMax, 1u);
  ExpectLevelOfRamp(*other, 1);
  EXPECT_TRUE(other->PyramidRefresh());
  EXPECT_EQ(other->GetPyramidDef().levelMin, 2u);
  ExpectLevelOfRamp(*other, 3);
  EXPECT_TRUE(raster->PyramidDelete());
  EXPECT_FALSE(raster->PyramidExists());
  EXPECT_FALSE(raster->PyramidLevel(2));
  EXPECT_FALSE(raster->PyramidDelete());
  EXPECT_FALSE(other->PyramidRefresh());
  EXPECT_EQ(scene.CountFiles(), 0u);
}

TEST(PyramidBuild, WhatCanNotBeBuiltIsRefused) {
  PyramidScene scene;
  RasterPtr<std::int16_t> raster = scene.Open<std::int16_t>();
  const struct {
    unsigned levelMin, levelMax, side;
    const char* why;
  } cases[] = {{2, 1, 16, "levels go from 0 to 31"},
               {1, 32, 16, "levels go from 0 to 31"},
               {1, 2, 4000, "tiles are 1 to 2048 pixels wide"}};
  for (const auto& c : cases) {
    EXPECT_FALSE(PyramidScene::Build(*raster, c.levelMin, c.levelMax, c.side));
    EXPECT_EQ(TakeFault().ToUTF8(), scene.Path() + ": " + c.why);
  }
  std::ofstream(scene.Path()) << "a letter";
  EXPECT_FALSE(PyramidScene::Build(*raster, 1, 2, 16));
  EXPECT_EQ(TakeFault().ToUTF8(), scene.Path() + ": is there, and no pyramid: it stays");
  EXPECT_EQ(std::filesystem::file_size(scene.Path()), 8u);

  const RasterPtr<std::int16_t> plain(
      MakeReaderRaster(DataConnectionPtr(OpenSource({"EXTERNAL", "x"}))));
  EXPECT_FALSE(PyramidScene::Build(*plain, 1, 2, 16));
  EXPECT_FALSE(plain->StoredPyramidLevel(1));
}

TEST(PyramidBuild, AFileOfItsOwnIsNotBuiltFromItself) {
  PyramidScene scene;
  ASSERT_TRUE(PyramidScene::Build(*scene.Open<std::int16_t>(), 0, 1, 16));
  const RasterPtr<std::int16_t> file(
      MakeReaderRaster(DataConnectionPtr(OpenSource({"Pyramid", scene.Path()}))));
  ASSERT_TRUE(file && file->PyramidExists());
  ExpectLevelOfRamp(*file, 1);
  EXPECT_FALSE(PyramidScene::Build(*file, 0, 1, 16));
  EXPECT_TRUE(file->PyramidRefresh());
  ExpectLevelOfRamp(*file, 0);
  EXPECT_EQ(scene.CountFiles(), 1u);
}

}  // namespace
}  // namespace lumo::test
