#include "mosaic/mosaic_file.h"

#include <cmath>
#include <filesystem>
#include <fstream>
#include <thread>

#include "georef/std_georef.h"
#include "mosaic/mosaic_grid.h"
#include "platform/owned_name.h"
#include "support/coordsys_support.h"
#include "support/file_bytes.h"
#include "support/placed_raster.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

MosaicScene SceneAt(const std::string& file, double x, double y, unsigned samples, unsigned lines) {
  MosaicScene scene;
  scene.file = file;
  scene.header.samples = samples;
  scene.header.lines = lines;
  scene.header.bands = 2;
  scene.header.dataType = kDataTypeOf<float>;
  scene.header.noData = {std::nan(""), std::nullopt};
  scene.header.geoRef = MakeGrid(x, y, 10, samples, lines, "EPSG:32633");
  scene.header.state = "12 34";
  return scene;
}

class MosaicFile : public testing::Test {
 protected:
  MosaicFile() {
    document_.bands = 2;
    document_.dataType = kDataTypeOf<float>;
    document_.noData = -HUGE_VAL;
    document_.featherWidth = 12.5;
    document_.matchMode = 1;
    document_.workingDirectory = directory_.Path().string() + "/side/";
    document_.tables = directory_.Path().string() + "/side/M_1";
    for (unsigned i = 0; i < 3; ++i) {
      document_.scenes.push_back(SceneAt(
          (directory_.Path() / ("s" + std::to_string(i) + ".tif")).string(), i * 100.0, 0, 30, 20));
    }
    document_.scenes[1].footprint = directory_.Path().string() + "/7_footprint.msf";
    document_.scenes[2].matches = false;
    document_.scenes[2].options = {"TIFF"};
    document_.grid = MakeGrid(0, 0, 10, 50, 20, "EPSG:32633");
  }
  std::string Path() const { return (directory_.Path() / "M.vmosaic").string(); }
  void Write() {
    std::string fault;
    ASSERT_TRUE(WriteMosaicFile(Path(), document_, fault)) << fault;
  }
  /// The fault of reading the file after `from` in its text was replaced.
  std::string FaultOf(const std::string& from, const std::string& to) {
    Write();
    std::string text = test::FileBytes(Path());
    const std::size_t at = text.find(from);
    if (at == std::string::npos) return "no such text: " + from;
    text.replace(at, from.size(), to);
    std::ofstream(Path(), std::ios::binary | std::ios::trunc) << text;
    MosaicDocument read;
    std::string fault;
    return ReadMosaicFile(Path(), read, fault) ? "" : fault;
  }

  test::TemporaryDirectory directory_;
  MosaicDocument document_;
};

TEST_F(MosaicFile, ReadsBackWhatWasWrittenWhereverItsFolderIs) {
  Write();
  const std::string text = test::FileBytes(Path());
  EXPECT_EQ(text.find(directory_.Path().string()), std::string::npos);  // paths are relative
  const fs::path other = directory_.Path() / "moved";
  fs::create_directory(other);
  fs::copy_file(Path(), other / "M.vmosaic");
  MosaicDocument read;
  std::string fault;
  ASSERT_TRUE(ReadMosaicFile((other / "M.vmosaic").string(), read, fault)) << fault;
  EXPECT_EQ(read.scenes[0].file, (other / "s0.tif").string());
  EXPECT_EQ(read.scenes[1].footprint, (other / "7_footprint.msf").string());
  EXPECT_EQ(read.workingDirectory, (other / "side/").string());
  EXPECT_EQ(read.tables, (other / "side/M_1").string());
  EXPECT_EQ(read.noData, -HUGE_VAL);
  EXPECT_EQ(read.featherWidth, 12.5);
  EXPECT_EQ(read.matchMode, 1U);
  EXPECT_FALSE(read.scenes[2].matches);
  EXPECT_EQ(read.scenes[2].options, std::vector<std::string>{"TIFF"});
  EXPECT_TRUE(std::isnan(*read.scenes[0].header.noData[0]));
  EXPECT_FALSE(read.scenes[0].header.noData[1]);
  EXPECT_TRUE(read.scenes[1].header.geoRef->IsEqual(document_.scenes[1].header.geoRef));
  EXPECT_TRUE(read.grid->IsEqual(document_.grid));
  EXPECT_EQ(read.grid->Samples(), 50U);
}

TEST_F(MosaicFile, SaysWhichLineAndFieldIsWrong) {
  const struct {
    const char* from;
    const char* to;
    const char* says;  // behind the path
  } cases[] = {
      {"\"bands\": 2,\n  \"grid\"", "\"bands\": 0,\n  \"grid\"",
       "line 4: bands: has to be above 0"},
      {"\"resampling\": \"nearest\"", "\"resampling\": \"best\"",
       "resampling: \"best\" is none of"},
      {"\"feather_width\"", "\"feather_wide\"",
       "feather_wide: there is no such field; did you mean feather_width?"},
      {"\"s1.tif\"", "\"s0.tif\"", "scenes/1/file: "},
      {"\"reference\": 0", "\"reference\": 3", "reference: there is no such scene"},
      {"\"pixel_size\": [10, 10],", "", "grid: the field pixel_size is missing"},
      {"\"vmosaic\": 1", "\"vmosaic\": 2", "line 2: vmosaic: only version 1 is known"},
      {"EPSG:32633", "EPSG:1", "coordinate_system: no coordinate system: EPSG:1"},
      {"\"match\": false", "\"match\": \"no\"", "scenes/2/match: has to be true or false"},
  };
  for (const auto& [from, to, says] : cases) {
    const std::string fault = FaultOf(from, to);
    EXPECT_TRUE(fault.starts_with(Path() + ": line ")) << fault;
    EXPECT_NE(fault.find(says), std::string::npos) << fault;
    EXPECT_EQ(fault.find('\n'), std::string::npos);
  }
  Write();
  const std::string whole = test::FileBytes(Path());
  for (std::size_t size = 0; size + 2 < whole.size(); size += 97) {
    std::ofstream(Path(), std::ios::binary | std::ios::trunc) << whole.substr(0, size);
    MosaicDocument read;
    std::string fault;
    EXPECT_FALSE(ReadMosaicFile(Path(), read, fault));
    EXPECT_NE(fault.find("the file breaks off"), std::string::npos) << size << ": " << fault;
  }
}

TEST_F(MosaicFile, KeepsWhatSeveralPutIntoItAtOnce) {
  Write();
  std::vector<std::thread> threads;
  for (unsigned i = 0; i < 3; ++i) {
    threads.emplace_back([this, i] {
      for (unsigned round = 0; round < 5; ++round) {
        std::string fault;
        EXPECT_TRUE(UpdateMosaicFile(
            Path(),
            [&](MosaicDocument& document, std::string&) {
              document.scenes[i].seam += "x";
              return true;
            },
            fault))
            << fault;
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  MosaicDocument read;
  std::string fault;
  ASSERT_TRUE(ReadMosaicFile(Path(), read, fault)) << fault;
  for (const MosaicScene& scene : read.scenes) EXPECT_TRUE(scene.seam.ends_with("xxxxx"));
  EXPECT_FALSE(fs::exists(Path() + ".lock"));

  // A lock of a process that is gone, or that was cut off, is taken over.
  std::string gone = platform::OwnedName("vexg");
  const std::size_t process = gone.find('-', gone.find('-') + 1) + 1;
  gone.replace(process, gone.find('-', process) - process, "999999999");
  for (const std::string& owner : {gone, std::string()}) {
    std::ofstream(Path() + ".lock") << owner;
    EXPECT_TRUE(UpdateMosaicFile(
        Path(), [](MosaicDocument&, std::string&) { return true; }, fault))
        << fault;
    EXPECT_FALSE(fs::exists(Path() + ".lock"));
  }
}

TEST_F(MosaicFile, ItsGridHoldsAllScenesAndKeepsTheFirstOnesPixels) {
  document_.scenes[1].header.geoRef = MakeGrid(-95, 33, 10, 30, 20, "EPSG:32633");
  std::string fault;
  const GeoRefPtr grid = ChooseMosaicGrid(document_.scenes, {}, fault);
  ASSERT_TRUE(grid) << fault;
  EXPECT_EQ(grid->TieMapX(), -100);  // whole pixels of the first scene
  EXPECT_EQ(grid->TieMapY(), 40);
  EXPECT_EQ(grid->Samples(), 60U);  // from -100 to 500
  EXPECT_EQ(grid->Lines(), 24U);    // from 40 to -200
}

}  // namespace
}  // namespace lumo
