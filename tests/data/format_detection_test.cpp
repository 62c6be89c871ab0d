#include "data/format_detection.h"

#include <filesystem>
#include <fstream>
#include <random>

#include <gtest/gtest.h>

#include "data/data_connection.h"
#include "foundation/fault.h"
#include "foundation/own_plugin.h"
#include "support/raster_sources.h"
#include "support/sample_data.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

/// The rows that recognise a source when each of them is asked.
std::vector<std::uint32_t> AskAll(const std::string& path) {
  std::vector<std::uint32_t> willing;
  for (std::uint32_t row = 0; row < FormatCount(); ++row) {
    LoadFormat(row);
    DataConnectionFactory* const factory = GetFactory(GetFormat(row));
    if (factory != nullptr && factory->CanConnect(test::Strings({path}))) willing.push_back(row);
  }
  TakeFault();
  return willing;
}

void ExpectAsAsked(const std::string& path) {
  const std::vector<std::uint32_t> all = AskAll(path);
  EXPECT_EQ(DetectFormats(test::Strings({path})).willing, all) << path;
  const FormatDetection first = DetectFormats(test::Strings({path}), DetectionExtent::kToFirst);
  EXPECT_EQ(first.willing.empty(), all.empty()) << path;
  if (first.willing.empty() || all.empty()) return;
  EXPECT_EQ(first.willing.front(), all.front()) << path;
  EXPECT_TRUE(first.isWhole ? first.willing == all : first.willing.size() <= all.size()) << path;
}

TEST(FormatDetection, FindsTheRowsThatAskingAllFinds) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  unsigned files = 0;
  for (const auto& entry : fs::recursive_directory_iterator(test::SampleData("."))) {
    if (!entry.is_regular_file()) continue;
    ExpectAsAsked(entry.path().string());
    ++files;
  }
  EXPECT_GT(files, 20U);
}

/// Words by which readers recognise their formats, behind the mark of another one.
TEST(FormatDetection, DamagedAndOddFilesAreNoExceptions) {
  const test::TemporaryDirectory directory;
  std::mt19937 random(11);
  const std::vector<std::string> marks = {std::string("II*\0\x08\0\0\0", 8),
                                          std::string("MM\0*\0\0\0\x08", 8),
                                          std::string("II+\0\x08\0\0\0", 8),
                                          "\xFF\xD8\xFF\xE0",
                                          "\x89PNG\r\n\x1A\n",
                                          "GIF89a",
                                          "EHFA_HEADER_TAG",
                                          "BM",
                                          ""};
  const std::vector<std::string> words = {"GRIB",
                                          "TDLP",
                                          "PDS_VERSION_ID",
                                          "ODL_VERSION_ID",
                                          "<Dimap_Document",
                                          "<GDAL_WMS>",
                                          "<WMS_Tile_Service",
                                          "NITF02.10",
                                          "UHL1",
                                          "\x89HDF\r\n\x1A\n",
                                          "PDS3",
                                          "<?xml ?>",
                                          "IIFSET",
                                          "\x3F\xC0\x12\x12",
                                          "<WCS_GDAL>",
                                          "CEOS",
                                          "CDF\x01",
                                          "SIMPLE  =",
                                          std::string(8, '\0')};
  const std::vector<std::string> endings = {".tif", ".jpg", ".png", ".h5",  ".nc", ".grb",
                                            ".adf", ".shp", ".dt0", ".bin", ".img"};
  for (int i = 0; i < 300; ++i) {
    std::string bytes = marks[random() % marks.size()];
    for (unsigned count = random() % 6; count != 0; --count) {
      bytes += words[random() % words.size()];
      bytes.append(random() % 40, random() % 2 == 0 ? '\0' : ' ');
    }
    bytes.resize(bytes.size() + random() % 2000, '\0');
    const std::string path =
        (directory.Path() / ("f" + std::to_string(i) + endings[random() % endings.size()]))
            .string();
    std::ofstream(path, std::ios::binary) << bytes;
    ExpectAsAsked(path);
  }
}

TEST(FormatDetection, SamplesThatAreCutOffAreNoExceptions) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const test::TemporaryDirectory directory;
  for (const auto& entry : fs::directory_iterator(test::SampleData("."))) {
    if (!entry.is_regular_file()) continue;
    const fs::path copy = directory.Path() / entry.path().filename();
    fs::copy_file(entry.path(), copy);
    fs::permissions(copy, fs::perms::owner_all);
    for (const std::uintmax_t size : {600U, 20U, 9U, 3U, 0U}) {
      if (fs::file_size(copy) < size) continue;
      fs::resize_file(copy, size);
      ExpectAsAsked(copy.string());
    }
  }
}

TEST(FormatDetection, KnowsThePluginsThatComeWithTheLibrary) {
  EXPECT_TRUE(IsOwnPlugin(platform::ModuleFileName("vexraster")));
  EXPECT_TRUE(IsOwnPlugin(platform::ModuleFileName("vexgdal")));
  EXPECT_TRUE(IsOwnPlugin(platform::ModuleFileName("vexnitf")));
  EXPECT_TRUE(IsOwnPlugin(platform::ModuleFileName("vexshapefile")));
  EXPECT_FALSE(IsOwnPlugin(platform::ModuleFileName("vexg")));
  EXPECT_FALSE(IsOwnPlugin(platform::ModuleFileName("vexgdb")));
}

}  // namespace
}  // namespace lumo
