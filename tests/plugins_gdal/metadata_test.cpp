#include "foundation/fault.h"
#include "gdal_peer.h"
#include "support/metadata_support.h"
#include "support/sample_data.h"

namespace lumo {
namespace {

using test::Peer;

Metadata OpenMetadata(const char* format, const std::string& path) {
  test::UseDefinitionFiles();
  Metadata metadata;
  EXPECT_TRUE(metadata.Open(test::Strings({format, String(path)}))) << TakeFault().ToUTF8();
  return metadata;
}

std::vector<double> Numbers(const std::string& text) {
  std::istringstream in(text);
  std::vector<double> numbers;
  for (double number = 0; in >> number;) numbers.push_back(number);
  return numbers;
}

TEST(GdalMetadata, TellsWhatGdalTellsOfTheSamples) {
  const struct {
    const char *format, *name;
  } cases[] = {{"TIFF", "landsat7_olinda.tif"}, {"TIFF", "RGB.byte.tif"},
               {"TIFF", "rotated.tif"},         {"TIFF", "complex64.tif"},
               {"TIFF", "rpc_scene.tif"},       {"Erdas", "landsat7.img"}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    const std::string path = test::SampleData(c.name);
    if (path.empty()) GTEST_SKIP() << "no sample data";
    const Metadata metadata = OpenMetadata(c.format, path);
    const Peer peer(path);
    EXPECT_EQ(test::ValueAt<unsigned>(metadata, "/Image/Samples"),
              unsigned(GDALGetRasterXSize(peer.Dataset())));
    EXPECT_EQ(test::ValueAt<unsigned>(metadata, "/Image/Bands"), peer.Bands());
    double transform[6];
    if (GDALGetGeoTransform(peer.Dataset(), transform) == CE_None) {
      EXPECT_EQ(test::ListAt<double>(metadata, "/Grid/Transform"),
                std::vector<double>(transform, transform + 6));
    }
    const std::string system = GDALGetProjectionRef(peer.Dataset());
    if (!system.empty()) {
      EXPECT_EQ(test::ValueAt<String>(metadata, "/CoordSys/Text").ToUTF8(), system);
    }
    for (const auto& [ours, theirs] : {std::pair{"/RPC/LineNumerator", "LINE_NUM_COEFF"},
                                       {"/RPC/LineDenominator", "LINE_DEN_COEFF"},
                                       {"/RPC/SampleNumerator", "SAMP_NUM_COEFF"},
                                       {"/RPC/SampleDenominator", "SAMP_DEN_COEFF"}}) {
      const char* const terms = GDALGetMetadataItem(peer.Dataset(), theirs, "RPC");
      if (terms == nullptr) continue;
      EXPECT_EQ(test::ListAt<double>(metadata, ours), Numbers(terms));
      EXPECT_EQ(Numbers(terms).size(), 20U);
    }
  }
}

TEST(GdalMetadata, KeepsTextsOfBandsApartAndLosesNothing) {
  GDALAllRegister();
  test::TemporaryDirectory directory;
  const std::string path = directory.Path() / "x.tif";
  GDALDatasetH const made =
      GDALCreate(GDALGetDriverByName("GTiff"), path.c_str(), 2, 2, 3, GDT_Byte, nullptr);
  ASSERT_NE(made, nullptr);
  GDALSetDescription(GDALGetRasterBand(made, 2), "red, {visible}");
  GDALSetRasterScale(GDALGetRasterBand(made, 1), 0.5);
  GDALSetMetadataItem(GDALGetRasterBand(made, 3), "A/B", "deep", nullptr);
  GDALSetMetadataItem(made, "TIFFTAG_DATETIME", "2012:01:02 03:04:05", nullptr);
  GDALSetMetadataItem(made, "mine", "a=b", nullptr);
  GDALSetMetadataItem(made, "SATELLITEID", "S, 1", "IMAGERY");
  GDALClose(made);
  const Metadata metadata = OpenMetadata("TIFF", path);
  const auto names = test::ListAt<String>(metadata, "/Bands/Names");
  ASSERT_EQ(names.size(), 3U);
  EXPECT_EQ(names[0].ToUTF8(), "");
  EXPECT_EQ(names[1].ToUTF8(), "red, {visible}");
  EXPECT_EQ(test::ListAt<double>(metadata, "/Bands/Scales"), (std::vector<double>{0.5, 1, 1}));
  EXPECT_EQ(test::ValueAt<String>(metadata, "/GDAL/Bands/3/A_B").ToUTF8(), "deep");
  EXPECT_EQ(test::ValueAt<String>(metadata, "/GDAL/Items/mine").ToUTF8(), "a=b");
  EXPECT_EQ(test::ValueAt<String>(metadata, "/File/Time").ToUTF8(), "2012:01:02 03:04:05");
  EXPECT_EQ(test::ValueAt<String>(metadata, "/Sensor/Satellite").ToUTF8(), "S, 1");
  EXPECT_FALSE(metadata.Exists("/CoordSys/Text"));
}

TEST(GdalMetadata, FailsInTheWordsOfTheStep) {
  test::UseDefinitionFiles();
  const std::string path = test::SampleData("rotated.tif");
  if (path.empty()) GTEST_SKIP() << "no sample data";
  const auto strings = test::Strings({"TIFF", String(path)});
  test::TemporaryDirectory nothing;
  GetGlobalEnvironmentImpl()[Environment::kMdfDirectory].text = String(nothing.Path().string());
  test::gParseLog.Take();
  Metadata metadata;
  EXPECT_FALSE(metadata.Open(strings));
  EXPECT_THAT(test::gParseLog.Take(),
              testing::EndsWith("Metadata::Open failed. Failed to parse gdal input. GetMetadata() "
                                "failed.\n"));
  EXPECT_THAT(TakeFault().ToUTF8(), testing::HasSubstr("mdf_gdal.txt"));
}

}  // namespace
}  // namespace lumo
