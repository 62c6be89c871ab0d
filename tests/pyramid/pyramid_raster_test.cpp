#include "georef/std_georef.h"
#include "support/pyramid_scene.h"
#include "support/run_command.h"
#include "views/pyramid_raster_impl.h"

namespace lumo::test {
namespace {

template <typename T>
Pointer<PyramidRasterImpl<T>> MakeLevel(const RasterDataConnectionPtr& source,
                                        const Raster<T>& raster, unsigned level) {
  return Pointer<PyramidRasterImpl<T>>(
      new PyramidRasterImpl<T>(raster, ReaderOf<T>(source), source, level));
}

TEST(PyramidRaster, HasTheGeoReferenceOfLargerPixels) {
  FakeFormat format("EXTERNAL");
  format.fake.samples = 1001;
  format.fake.lines = 500;
  auto* const grid = new StdGeoRef;
  format.fake.geoRef.Reset(grid);
  grid->SetPixelSize(2, 3);
  grid->SetTieMap(1000, 5000);
  grid->SetTiePixel(8, 16);
  const auto source = OpenSource({"EXTERNAL", "x"});
  const RasterPtr<std::int16_t> raster(MakeReaderRaster(DataConnectionPtr(source)));
  const auto level = MakeLevel<std::int16_t>(source, *raster, 3);
  const RasterDef def = level->GetRasterDef();
  EXPECT_EQ(def.samples, 125u);
  EXPECT_EQ(def.lines, 62u);
  ASSERT_TRUE(def.geoRef);
  EXPECT_EQ(def.geoRef->PixelSizeX(), 2 * 8);
  EXPECT_EQ(def.geoRef->PixelSizeY(), 3 * 8);
  EXPECT_EQ(def.geoRef->TiePixelX(), 8 * (125.0 / 1001));
  EXPECT_EQ(def.geoRef->TiePixelY(), 16 * (62.0 / 500));
  EXPECT_EQ(def.geoRef->TieMapX(), 1000);
  EXPECT_EQ(raster->GetRasterDef().geoRef->PixelSizeX(), 2);

  PyramidDef only;
  only.level = 3;
  EXPECT_EQ(level->GetPyramidDef(), only);
  EXPECT_FALSE(level->PyramidExists() || level->PyramidDelete() || level->PyramidRefresh());
  EXPECT_FALSE(level->PyramidLevel(1) || level->StoredPyramidLevel(1));
  EXPECT_EQ(level->TileDimensions(), (TileDimensions{256, 256}));
}

TEST(PyramidRaster, IsSampledWhereTheReaderHasNoLevels) {
  for (const int type : {5, 8, 17}) {
    FakeFormat format("EXTERNAL");
    format.fake.samples = 300;
    format.fake.lines = 211;
    format.fake.readerType = type;
    format.fake.hasMask = true;
    const auto source = OpenSource({"EXTERNAL", "x"});
    const RasterPtr<std::int16_t> raster(MakeReaderRaster(DataConnectionPtr(source)));
    for (const unsigned number : {1U, 2U, 4U}) {
      const auto level = MakeLevel<std::int16_t>(source, *raster, number);
      const std::vector<unsigned> bands{2, 0};
      for (const Interleave order : {Interleave::BIP, Interleave::BSQ, Interleave::None}) {
        for (const SubRect& rect : {SubRect(0, 0, (300 >> number) - 1, (211 >> number) - 1),
                                    SubRect(3, 1, 5, 1), SubRect(1, 2, 9, 12)}) {
          Array<std::int16_t> pixels;
          Array<unsigned char> state;
          const bool isRead = level->GetSubRect(rect, MakeArray(bands), order, pixels, state);
          ASSERT_EQ(isRead, type != 17);
          if (!isRead) continue;
          const std::vector<unsigned> read = order == Interleave::None ? std::vector{2U} : bands;
          ASSERT_EQ(pixels.GetDims(), BlockDims(order, rect.Width(), rect.Height(), 2));
          std::size_t at = 0;
          VisitBlock(order, rect, read, [&](unsigned x, unsigned y, unsigned band) {
            const unsigned fullX = x << number, fullY = y << number;
            ASSERT_EQ(pixels[at], RampValue<std::int16_t>(fullX, fullY, band));
            ASSERT_EQ(state[at] & 2, (fullY * 300 + fullX) % 3 == 0 ? 2 : 0);
            ++at;
          });
        }
      }
    }
    const auto whole = MakeLevel<std::int16_t>(source, *raster, 0);
    Array<std::int16_t> pixels;
    Array<unsigned char> state;
    format.fake.failAtRead = 1;
    EXPECT_FALSE(
        whole->GetSubRect({0, 0, 0, 0}, MakeArray<unsigned>({0}), Interleave::BIP, pixels, state));
  }
}

TEST(PyramidRaster, OutlivesTheRasterThatGaveIt) {
  PyramidScene scene;
  scene.Fake().samples = 40;
  scene.Fake().lines = 40;
  RasterPtr<std::int16_t> raster = scene.Open<std::int16_t>();
  ASSERT_TRUE(PyramidScene::Build(*raster, 1, 1, 16));
  const RasterPtr<std::int16_t> level = raster->PyramidLevel(1);
  raster = RasterPtr<std::int16_t>();
  Array<std::int16_t> pixels;
  Array<unsigned char> state;
  ASSERT_TRUE(level->GetSubRect({19, 19, 19, 19}, MakeArray<unsigned>({1}), Interleave::BIP, pixels,
                                state));
  EXPECT_EQ(pixels[0], RampValue<std::int16_t>(38, 38, 1));
}

class PyramidCommands : public testing::Test {
 protected:
  std::map<std::string, std::string> BuildInputs(unsigned levelMin, unsigned levelMax) const {
    return {{"URI", uri},
            {"PyramidType", "ORVA"},
            {"PyramidResamplingMethod", "Nearest"},
            {"PyramidLevelMin", std::to_string(levelMin)},
            {"PyramidLevelMax", std::to_string(levelMax)},
            {"PyramidCanBuild", "1"},
            {"TileDimensions", "16 16 0 0 0 0 0 Invariable"}};
  }

  PyramidScene scene;
  const std::string uri = "[fake://source] ";
};

TEST_F(PyramidCommands, BuildShowAndDelete) {
  scene.Fake().samples = 80;
  scene.Fake().lines = 50;
  const std::string pyramid = "Pyramid|" + scene.Path();
  const auto opened =
      RunCommand("OpenRasterCommand", {{"ConnStr", "EXTERNAL|x"}, {"PyramidConnStr", pyramid}});
  ASSERT_TRUE(opened.Succeeded()) << opened.reason;
  EXPECT_FALSE(RunCommand("GetRasterPyramidCommand", {{"URI", uri}, {"Level", "1"}}).Succeeded());
  const auto built = RunCommand("BuildRasterPyramidCommand", BuildInputs(1, 2));
  ASSERT_TRUE(built.Succeeded()) << built.reason;

  const auto level = RunCommand("GetRasterPyramidCommand", {{"URI", uri}, {"Level", "2"}});
  ASSERT_TRUE(level.Succeeded()) << level.reason;
  const std::string levelUri = level.outputs.at("PyramidURI");
  EXPECT_EQ(RunCommand("QueryRasterCommand", {{"URI", levelUri}}).outputs.at("Samples"), "20");
  EXPECT_TRUE(RunCommand("CloseRasterCommand", {{"URI", levelUri}}).Succeeded());
  EXPECT_EQ(RunCommand("GetRasterPyramidCommand", {{"URI", uri}, {"Level", "3"}}).reason,
            "the pyramid has no pixels at level 3");

  const auto refreshed = RunCommand("RefreshRasterPyramidCommand", {{"URI", uri}});
  EXPECT_EQ(refreshed.outputs.at("Return"), "1");
  EXPECT_EQ(RunCommand("DeleteRasterPyramidCommand", {{"URI", uri}}).outputs.at("Return"), "1");
  EXPECT_EQ(RunCommand("QueryRasterCommand", {{"URI", uri}}).outputs.at("PyramidExists"), "0");
  EXPECT_EQ(RunCommand("DeleteRasterPyramidCommand", {{"URI", uri}}).outputs.at("Return"), "0");

  scene.Fake().failAtRead = 3;
  EXPECT_EQ(RunCommand("BuildRasterPyramidCommand", BuildInputs(1, 2)).reason,
            "fake: this block is stuck");
  EXPECT_EQ(RunCommand("BuildRasterPyramidCommand", BuildInputs(3, 2)).reason,
            scene.Path() + ": levels go from 0 to 31");
  RunCommand("CloseRasterCommand", {{"URI", uri}});
  EXPECT_EQ(scene.CountFiles(), 0u);
}

TEST_F(PyramidCommands, APyramidOfAnotherRasterIsRefusedUnlessItIsToBeReplaced) {
  scene.Fake().dataType = kDataTypeOf<std::int16_t>;
  ASSERT_TRUE(PyramidScene::Build(*scene.Open<std::int16_t>(), 0, 1, 16));
  scene.Fake().samples = 8;
  std::map<std::string, std::string> inputs{{"ConnStr", "EXTERNAL|x"},
                                            {"PyramidConnStr", "Pyramid|" + scene.Path()}};
  EXPECT_EQ(RunCommand("OpenRasterCommand", inputs).reason,
            "fake://source: the pyramid is of a raster of another size");
  inputs["PyramidNew"] = "1";
  ASSERT_TRUE(RunCommand("OpenRasterCommand", inputs).Succeeded());
  ASSERT_TRUE(RunCommand("BuildRasterPyramidCommand", BuildInputs(1, 1)).Succeeded());
  RunCommand("CloseRasterCommand", {{"URI", uri}});
  inputs.erase("PyramidNew");
  EXPECT_TRUE(RunCommand("OpenRasterCommand", inputs).Succeeded());
  RunCommand("CloseRasterCommand", {{"URI", uri}});
}

}  // namespace
}  // namespace lumo::test
