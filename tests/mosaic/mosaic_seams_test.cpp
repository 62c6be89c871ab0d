#include "mosaic/mosaic_seams.h"

#include <cmath>
#include <filesystem>
#include <set>

#include "commands/catalog.h"
#include "foundation/fault.h"
#include "geometry/polygon_clip.h"
#include "mosaic/footprint_file.h"
#include "support/file_bytes.h"
#include "support/file_size_limit.h"
#include "support/mosaic_scenes.h"
#include "support/run_command.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::FileBytes;
using Scene = RasterPtr<std::uint8_t>;
using Mosaic = MosaicRasterPtr<std::uint8_t>;

/// A scene of 200 x 150 pixels of 10 m, with a border of no data 5 pixels wide.
Scene BorderedScene(double x, double y, std::uint8_t value = 100) {
  return test::MakeScene<std::uint8_t>(
      MakeGrid(x, y, 10, 200, 150), 1,
      [value](unsigned column, unsigned line, unsigned) {
        const bool isIn = column >= 5 && column < 195 && line >= 5 && line < 145;
        return isIn ? value : std::uint8_t{0};
      },
      std::uint8_t{0});
}

class MosaicSeams : public testing::Test {
 protected:
  ~MosaicSeams() override {
    for (const ObjectPtr& mosaic : published_) catalog::Remove(mosaic);
  }

  /// A mosaic on a grid of 5 m pixels, whose corner is at (0, 0).
  Mosaic Make(const std::vector<Scene>& scenes, const char* coordSys = nullptr) {
    MosaicSettings settings;
    settings.workingDirectory = String(directory_.Path().string() + "/");
    const Mosaic mosaic =
        test::MakeMosaic(scenes, MakeGrid(0, 0, 5, 1200, 900, coordSys), settings);
    catalog::Add(mosaic);
    published_.push_back(mosaic);
    return mosaic;
  }

  test::CommandOutcome Run(const Mosaic& mosaic) const {
    return test::RunCommand("MosaicAutoSeamGenCommand",
                            {{"MosaicURI", FormatValue(mosaic->GetURI()).ToUTF8()}});
  }

  std::vector<std::string> Files() const {
    std::vector<std::string> names;
    for (const auto& entry : fs::directory_iterator(directory_.Path())) {
      names.push_back(entry.path().filename().string());
    }
    return names;
  }

  Polygon2D<double> PartOf(const Mosaic& mosaic, unsigned scene) const {
    MosaicRasterDef<std::uint8_t>& definition = *mosaic->Definition();
    return Polygon2D<double>(
        ReadFootprint<std::uint8_t>(definition.SeamFiles().Find(definition.SceneKey(scene))));
  }

  test::TemporaryDirectory directory_;
  std::vector<ObjectPtr> published_;
};

TEST_F(MosaicSeams, CutsScenesInPixelsOfTheMosaic) {
  const Mosaic mosaic = Make({BorderedScene(0, 0), BorderedScene(1500, -600)});
  const auto made = Run(mosaic);
  ASSERT_TRUE(made.Succeeded()) << made.reason;
  EXPECT_EQ(made.outputs.at("Success"), "1");
  for (const std::string& name : Files()) {
    const bool isSeam = name.ends_with(".emp");
    const std::string beginning = isSeam ? "200_150_" : "",
                      ending = isSeam ? ".emp" : "_footprint.msf";
    ASSERT_TRUE(name.starts_with(beginning) && name.ends_with(ending)) << name;
    const std::string number =
        name.substr(beginning.size(), name.size() - beginning.size() - ending.size());
    EXPECT_EQ(number.find_first_not_of("0123456789"), number.npos) << name;
  }
  ASSERT_EQ(Files().size(), 4U);
  // In pixels of 5 m: the first scene covers 10 to 390 by 10 to 290, the second 310 to 690 by 130
  // to 410. What they have in common is 80 wide and 160 high.
  const auto first = PartOf(mosaic, 0), second = PartOf(mosaic, 1);
  const double whole = 380 * 280;
  EXPECT_EQ(first.Measure(PolygonMeasure::kMinX), 10);
  EXPECT_EQ(second.Measure(PolygonMeasure::kMaxX), 690);
  EXPECT_NEAR(first.Measure(PolygonMeasure::kArea), whole - 80 * 160 / 2, 2);
  EXPECT_NEAR(second.Measure(PolygonMeasure::kArea), whole - 80 * 160 / 2, 2);
  EXPECT_LT(Clip(ClipOperation::kIntersection, first, second).Measure(PolygonMeasure::kArea), 2);

  // A later run uses the footprints and rewrites the same files.
  const std::string before =
      FileBytes(mosaic->Definition()->SeamFiles().Find(mosaic->Definition()->SceneKey(0)).ToUTF8());
  ASSERT_TRUE(Run(mosaic).Succeeded());
  EXPECT_EQ(Files().size(), 4U);
  EXPECT_EQ(
      FileBytes(mosaic->Definition()->SeamFiles().Find(mosaic->Definition()->SceneKey(0)).ToUTF8()),
      before);
}

TEST_F(MosaicSeams, TakesScenesOfOtherCoordinateSystemsAndBeyondTheGrid) {
  // The second scene is the ground of the first, in degrees; nothing of it is cut then.
  const GeoRefPtr degrees = MakeGrid(14.98, 45.1, 0.0001, 500, 400, "EPSG:4326");
  const Scene geographic =
      test::MakeScene<std::uint8_t>(degrees, 1, [](auto...) { return std::uint8_t{7}; });
  MosaicSettings settings;
  settings.workingDirectory = String(directory_.Path().string() + "/");
  const Mosaic mosaic = test::MakeMosaic<std::uint8_t>(
      {geographic}, MakeGrid(499000, 4995000, 10, 300, 300, "EPSG:32633"), settings);
  catalog::Add(mosaic);
  published_.push_back(mosaic);
  const auto made = Run(mosaic);
  ASSERT_TRUE(made.Succeeded()) << made.reason;
  const auto part = PartOf(mosaic, 0);
  double x = 0, y = 0, column = 0, line = 0;
  const GeoRefPtr grid = mosaic->GetRasterDef().geoRef;
  Array<double> corner{ArrayDims(1, 2)};
  corner[0] = 500;
  corner[1] = 400;
  ASSERT_TRUE(degrees->PixelToPixel(corner, *grid));
  x = corner[0];
  y = corner[1];
  EXPECT_NEAR(part.Measure(PolygonMeasure::kMaxX), x, 2);
  EXPECT_NEAR(part.Measure(PolygonMeasure::kMaxY), y, 2);
  corner[0] = 0;
  corner[1] = 0;
  ASSERT_TRUE(degrees->PixelToPixel(corner, *grid));
  column = std::max(corner[0], 0.0);  // it begins left of the grid, where files hold nothing
  line = std::max(corner[1], 0.0);
  EXPECT_LT(corner[0], 0);
  EXPECT_NEAR(part.Measure(PolygonMeasure::kMinX), column, 2);
  EXPECT_NEAR(part.Measure(PolygonMeasure::kArea), (x - column) * (y - line), 3000);
}

TEST_F(MosaicSeams, AFailureSaysWhyAndLeavesWhatStood) {
  const Mosaic mosaic = Make({BorderedScene(0, 0), BorderedScene(1500, -600)});
  ASSERT_TRUE(Run(mosaic).Succeeded());
  const auto content = [&] {
    std::set<std::string> all;
    for (const std::string& name : Files()) {
      all.insert(name + FileBytes(directory_.Path() / name));
    }
    return all;
  };
  const auto before = content();
  {
    const test::FileSizeLimit limit(1040);
    const auto full = Run(mosaic);
    EXPECT_EQ(full.result, CommandResult::kFailed);
    EXPECT_EQ(full.outputs.at("Success"), "0");
    EXPECT_NE(full.reason.find(".emp:"), std::string::npos) << full.reason;
  }
  EXPECT_EQ(content(), before);
  IPC aborted;
  aborted.abort->Set(true);
  EXPECT_FALSE(MakeSeams(*mosaic, aborted));
  EXPECT_EQ(TakeFault().ToUTF8(), "the work on the mosaic was aborted");
  EXPECT_EQ(content(), before);

  const auto reasonOf = [&](const std::vector<Scene>& scenes, const char* coordSys = nullptr) {
    const Mosaic bad = Make(scenes, coordSys);
    const auto outcome = Run(bad);
    EXPECT_EQ(outcome.result, CommandResult::kFailed);
    EXPECT_EQ(bad->Definition()->SeamFiles().GetCount(), 0U);
    return outcome.reason;
  };
  EXPECT_NE(reasonOf({BorderedScene(0, 0), Scene()}).find("scene 1"), std::string::npos);
  EXPECT_NE(reasonOf({BorderedScene(0, 0)}, "EPSG:32633").find("no coordinate system"),
            std::string::npos);
  const Scene none = test::MakeScene<std::uint8_t>(
      MakeGrid(0, 0, 10, 20, 20), 1, [](auto...) { return std::uint8_t{0}; }, std::uint8_t{0});
  EXPECT_NE(reasonOf({none}).find("has no polygon"), std::string::npos);
  const auto broken = MakePlaced<std::uint8_t>(MakeGrid(0, 0, 10, 20, 20), 1,
                                               [](auto...) { return std::uint8_t{1}; });
  broken->fails = true;
  broken->noData = 0;
  const Mosaic partly = Make({Scene(broken), BorderedScene(0, 0)});
  EXPECT_EQ(Run(partly).result, CommandResult::kFailed);
  EXPECT_EQ(partly->Definition()->Footprints().GetCount(), 1U);  // the other one is made
  broken->fails = false;
  EXPECT_TRUE(Run(partly).Succeeded());  // a second run goes on
}

TEST_F(MosaicSeams, ASceneWithoutPolygonsIsShownWhereNoOtherIs) {
  const Mosaic mosaic = Make({BorderedScene(0, 0, 100), BorderedScene(1500, -600, 50)});
  ASSERT_TRUE(Run(mosaic).Succeeded());
  MosaicRasterDef<std::uint8_t>& definition = *mosaic->Definition();
  const auto shown = [&](unsigned x, unsigned y) {
    Array<std::uint8_t> pixels;
    Array<unsigned char> state;
    EXPECT_TRUE(
        mosaic->GetSubRect({x, y, x, y}, MakeArray<unsigned>({0}), Interleave::BSQ, pixels, state))
        << TakeFault().ToUTF8();
    return pixels.GetCount() == 1 ? pixels[0] : 0;
  };
  EXPECT_EQ(shown(325, 200), 100);  // left of the seam through the overlap
  const auto write = [&](unsigned scene, const Contour2DArray<std::uint32_t>& rings) {
    MosaicFootPrintPolygonWriter<std::uint8_t> writer{
        URI(definition.SeamFiles().Find(definition.SceneKey(scene)))};
    return writer.Write(Polygon2D<std::uint32_t>(rings, 1)) && writer.Close();
  };
  ASSERT_TRUE(write(0, {}));
  ASSERT_TRUE(write(1, {{{{310, 130}, {690, 130}, {690, 410}, {310, 410}, {310, 130}}, false}}));
  std::string reason;
  ASSERT_TRUE(definition.Keep(reason));
  EXPECT_EQ(shown(325, 200), 50);
  EXPECT_EQ(shown(100, 100), 100);
}

TEST_F(MosaicSeams, MakesTheFootprintsThatAreWanted) {
  const Mosaic mosaic = Make({BorderedScene(0, 0), BorderedScene(1500, -600)});
  const auto make = [&](std::map<std::string, std::string> more) {
    more["MosaicURI"] = FormatValue(mosaic->GetURI()).ToUTF8();
    return test::RunCommand("MakeMosaicFootPrintsCommand", more).outputs["Made"];
  };
  MosaicRasterDef<std::uint8_t>& definition = *mosaic->Definition();
  const auto areaOf = [&](unsigned scene) {
    return ReadFootprint<std::uint8_t>(definition.Footprints().Find(definition.SceneKey(scene)))
        .Measure(PolygonMeasure::kArea);
  };
  EXPECT_EQ(make({}), "2");
  EXPECT_EQ(areaOf(0), 190 * 140);
  EXPECT_EQ(make({}), "0");
  EXPECT_EQ(Files().size(), 2U);

  // Anew, with a mask for the second scene alone.
  const auto left = test::MakeScene<std::uint8_t>(
      MakeGrid(0, 0, 10, 200, 150), 1,
      [](unsigned x, unsigned, unsigned) { return std::uint8_t(x < 100); });
  catalog::Add(left);
  published_.push_back(left);
  Array<URI> masks{ArrayDims(2)};
  masks[1] = left->GetURI();
  EXPECT_EQ(make({{"Again", "1"}, {"MaskURIs", FormatValue(masks).ToUTF8()}}), "2");
  EXPECT_EQ(areaOf(0), 190 * 140);
  EXPECT_EQ(areaOf(1), 95 * 140);
  EXPECT_EQ(Files().size(), 2U);
}

/// Keeps what was reported.
struct Reports : AsyncCallback {
  void OnProgress(double progress) override { values.push_back(progress); }
  std::vector<double> values;
};

TEST_F(MosaicSeams, ProgressHasTheSharesOfTheSteps) {
  const Mosaic mosaic = Make({BorderedScene(0, 0), BorderedScene(1500, -600)});
  for (const double rest : {0.1, 1.0}) {  // with footprints to make, and without
    const Pointer<Reports> reports(new Reports);
    const IPC ipc(AbortFlagPtr(new StandardAbortFlag),
                  ProgressReportPtr(new StandardProgressReport(reports)));
    ASSERT_TRUE(MakeSeams(*mosaic, ipc));
    const std::vector<double>& values = reports->values;
    EXPECT_TRUE(std::is_sorted(values.begin(), values.end())) << testing::PrintToString(values);
    for (const double step : {0.05, 0.85, 0.9, 1.0}) {  // ends of the steps
      const double expected = 1 - rest + step * rest;
      EXPECT_TRUE(std::any_of(values.begin(), values.end(), [&](double value) {
        return std::abs(value - expected) < 1e-9;
      })) << expected;
    }
  }
}

}  // namespace
}  // namespace lumo
