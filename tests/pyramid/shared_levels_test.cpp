#include <algorithm>
#include <filesystem>

#include "commands/share_scope.h"
#include "pyramid/level_shares.h"
#include "raster/level_reduction.h"
#include "support/file_bytes.h"
#include "support/pyramid_scene.h"
#include "support/test_types.h"

namespace lumo::test {
namespace {

constexpr const char* kKey = "levels";

/// Builds a pyramid, or what `inputs` ask for. @return the reason of a failure.
std::string BuildWith(BasicRaster& raster, const PyramidDef& def, unsigned side,
                      const ShareInputs& inputs) {
  ShareScope shares;
  if (!shares.Begin(inputs, kKey)) return TakeFault().ToUTF8();
  const AsyncPtr build = raster.PyramidBuild(def, TileDimensions{side, side}, {});
  if (!build) return TakeFault().ToUTF8();
  build->WaitFinished();
  if (build->HasError()) {
    raster.PyramidAsync();  // sets the fault
    return TakeFault().ToUTF8();
  }
  return shares.End() ? std::string() : TakeFault().ToUTF8();
}

/// Makes shares of a raster in files beside its pyramid.
class Shares {
 public:
  Shares(const PyramidScene& scene, unsigned count) : files_(ArrayDims(count)) {
    for (unsigned i = 0; i < count; ++i) {
      files_[i] = String((scene.Directory() / (std::to_string(i) + ".share")).string());
    }
  }

  std::string Make(BasicRaster& raster, const PyramidDef& def, unsigned side, unsigned index) {
    Array<unsigned> share(ArrayDims(2));
    share[0] = index;
    share[1] = files_.GetCount();
    return BuildWith(raster, def, side, {true, share, files_[index], {}});
  }
  std::string Join(BasicRaster& raster, const PyramidDef& def, unsigned side) {
    return BuildWith(raster, def, side, {false, {}, {}, files_});
  }
  std::string FileOf(unsigned index) const { return files_[index].ToUTF8(); }

 private:
  Array<String> files_;
};

template <typename T>
class SharedLevelsOfType : public testing::Test {};
TYPED_TEST_SUITE(SharedLevelsOfType, typename test::AsTestTypes<TwelveTypes>::Types);

/// Of strips and squares, of bands together and each alone, with a third of the pixels masked and a
/// no-data value in one band; of more shares than rows of tiles too.
TYPED_TEST(SharedLevelsOfType, ComeToTheFileOfOneRun) {
  using T = TypeParam;
  const struct {
    unsigned samples, lines, bands, tileHeight, levelMin, levelMax, count;
  } cases[] = {{261, 203, 3, 1, 0, 4, 3}, {101, 170, 3, 2, 1, 5, 7}, {130, 150, 9, 2, 0, 3, 2},
               {40, 1, 1, 1, 0, 2, 3},    {70, 90, 2, 1, 3, 4, 2},   {64, 64, 1, 2, 0, 0, 3}};
  for (const auto& c : cases) {
    for (const unsigned reduction : {0, 1, 2}) {
      if (reduction == 0 && c.bands == 9) continue;
      SCOPED_TRACE(testing::Message() << c.samples << " by " << c.lines << " by " << c.bands << ", "
                                      << c.count << " shares, reduction " << reduction);
      PyramidDef def;
      def.levelMin = c.levelMin;
      def.levelMax = c.levelMax;
      def.bins = Form::kExact;
      def.resamplingMethod = MethodOf(static_cast<LevelReduction>(reduction))
                                 .value_or(PyramidResamplingMethod::kNearest);
      std::string files[2];
      for (const bool isShared : {false, true}) {
        PyramidScene scene;
        scene.Fake().samples = c.samples;
        scene.Fake().lines = c.lines;
        scene.Fake().bands = c.bands;
        scene.Fake().tileHeight = c.tileHeight;
        scene.Fake().hasMask = true;
        constexpr unsigned kSide = 8;
        const RasterPtr<T> raster = scene.Open<T>();
        ASSERT_TRUE(raster);
        Shares shares(scene, c.count);
        for (unsigned i = 0; isShared && i < c.count; ++i) {
          ASSERT_EQ(shares.Make(*raster, def, kSide, i), "");
          ASSERT_FALSE(std::filesystem::exists(scene.Path()));
        }
        ASSERT_EQ(isShared ? shares.Join(*raster, def, kSide) : BuildWith(*raster, def, kSide, {}),
                  "");
        EXPECT_EQ(raster->StatsExist(0, StatsMask::Basic), std::is_arithmetic_v<T>);
        files[isShared] = FileBytes(scene.Path());
      }
      EXPECT_TRUE(files[0] == files[1]);
    }
  }
}

TEST(SharedLevels, RefuseWhatIsNoWholeSetOfShares) {
  PyramidScene scene;
  scene.Fake().samples = 60;
  scene.Fake().lines = 80;
  const RasterPtr<std::uint16_t> raster = scene.Open<std::uint16_t>();
  PyramidDef def;
  def.levelMin = 1;
  def.levelMax = 3;
  def.resamplingMethod = *MethodOf(LevelReduction::kAverage);
  Shares shares(scene, 2);
  ASSERT_EQ(shares.Make(*raster, def, 8, 0), "");
  EXPECT_NE(shares.Join(*raster, def, 8).find("1.share"), std::string::npos);  // it isn't there
  ASSERT_EQ(shares.Make(*raster, def, 16, 1), "");  // the key of the test is that of others
  EXPECT_NE(shares.Join(*raster, def, 8), "");
  EXPECT_FALSE(std::filesystem::exists(scene.Path()));
  ASSERT_EQ(shares.Make(*raster, def, 8, 1), "");
  EXPECT_EQ(shares.Join(*raster, def, 8), "");
  EXPECT_TRUE(std::filesystem::exists(scene.Path()));
}

TEST(LevelShares, AreWholeRowsOfTilesAndNearlyEven) {
  for (const unsigned lines : {1U, 500U, 4000U, 10000U, 100003U}) {
    for (const unsigned count : {1U, 2U, 7U, 40U}) {
      const LevelShares shares(3000, lines, 6, 128, count);
      const std::uint64_t unit = std::uint64_t{128} << shares.Top();
      unsigned end = 0, most = 0;
      for (unsigned i = 0; i < count; ++i) {
        EXPECT_EQ(shares.First(i), end);
        EXPECT_TRUE(shares.First(i) % unit == 0 || shares.First(i) == lines) << shares.First(i);
        end = shares.End(i);
        most = std::max(most, end - shares.First(i));
      }
      EXPECT_EQ(end, lines);
      EXPECT_TRUE(shares.Top() == 1 ||
                  most * std::uint64_t{count} <= lines * 9 / 8 + 9 * count / 8);
    }
  }
  EXPECT_EQ(LevelShares(3000, 100003, 6, 128, 1).Top(), 6U);
  EXPECT_EQ(LevelShares(3, 100, 6, 8, 2).Top(), 1U);  // no level above has a pixel
}

}  // namespace
}  // namespace lumo::test
