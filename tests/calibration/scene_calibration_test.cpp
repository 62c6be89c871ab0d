#include "calibration/scene_calibration.h"

#include "calibration/scene_bands.h"
#include "commands/catalog.h"
#include "support/metadata_support.h"
#include "support/run_command.h"

namespace lumo {
namespace {

std::vector<std::string> Words(const std::vector<String>& texts) {
  std::vector<std::string> words;
  for (const String& text : texts) words.push_back(text.ToUTF8());
  return words;
}

Metadata OpenText(const char* format, const std::string& text) {
  test::UseDefinitionFiles();
  test::TemporaryDirectory directory;
  const std::string path = directory.Path() / "file";
  test::WriteFile(path, text);
  Metadata metadata;
  EXPECT_TRUE(metadata.Open(test::Strings({format, String(path)})));
  return metadata;
}

// Distances at the perihelia and aphelia of the Astronomical Almanac, and at an equinox.
TEST(SceneCalibration, KnowsTheDistanceOfTheSun) {
  const struct {
    const char* time;
    double distance;
  } cases[] = {{"2010-01-03T00:10:00Z", 0.983290}, {"2010-07-06T11:30:00.000000Z", 1.016702},
               {"2020-01-05T07:48:00Z", 0.983244}, {"2020-07-04T11:35:00Z", 1.016694},
               {"2020-01-05", 0.983244},           {"2020-07-04 11:35:00", 1.016694}};
  for (const auto& c : cases) {
    const auto distance = EarthSunDistance(c.time);
    ASSERT_TRUE(distance) << c.time;
    EXPECT_NEAR(*distance, c.distance, 1e-4) << c.time;
  }
  for (const char* const text : {"", "2010", "2010-13-01", "2010-02-30", "01/02/2010 12:00",
                                 "2010-01-01T1", "2010-01-01Tx0:00:00Z", "2010-01-01T00:00:00 CET",
                                 "2010:01:01 00:00:00", "2010-01-01T25:00:00"}) {
    EXPECT_FALSE(EarthSunDistance(text)) << text;
  }
}

std::string Band(const char* name, const char* factor, const char* width) {
  return std::string("BEGIN_GROUP = BAND_") + name + "\n\tabsCalFactor = " + factor +
         ";\n\teffectiveBandwidth = " + width + ";\nEND_GROUP = BAND_" + name + "\n";
}

TEST(SceneCalibration, DividesTheFactorsOfBandsByTheirWidths) {
  const std::string bands = Band("R", "1.2e-02", "6.0e-02") + Band("G", "1.0e-02", "5.0e-02") +
                            Band("N", "9.0e-03", "1.0e-01") + Band("B", "8.0e-03", "4.0e-02");
  const std::string image =
      "BEGIN_GROUP = IMAGE_1\nmeanSunEl = 55.5;\nfirstLineTime = "
      "2020-01-05T07:48:00Z;\nEND_GROUP = IMAGE_1\n";
  const struct {
    const char* selection;
    std::vector<std::string> names;
    std::vector<double> gains;
  } cases[] = {{"Multi", {"B", "G", "R", "N"}, {0.2, 0.2, 0.2, 0.09}},
               {"RGB", {"R", "G", "B"}, {0.2, 0.2, 0.2}},
               {"NRG", {"N", "R", "G"}, {0.09, 0.2, 0.2}}};
  for (const auto& c : cases) {
    const SceneCalibration scene = ReadSceneCalibration(
        OpenText("DGIMD", "bandId = \"" + std::string(c.selection) + "\";\n" + bands + image));
    EXPECT_EQ(Words(scene.bandNames), c.names);
    ASSERT_EQ(scene.gains.size(), c.gains.size());
    for (std::size_t i = 0; i < c.gains.size(); ++i) EXPECT_DOUBLE_EQ(scene.gains[i], c.gains[i]);
    EXPECT_EQ(scene.offsets, std::vector<double>(c.gains.size(), 0.0));
    EXPECT_EQ(scene.sunElevation, 55.5);
    EXPECT_NEAR(scene.earthSunDistance.value_or(0), 0.983244, 1e-4);
    EXPECT_TRUE(scene.irradiances.empty());
  }
  // A band that the metadata don't describe leaves all of them unknown.
  const SceneCalibration lacking =
      ReadSceneCalibration(OpenText("DGIMD", "bandId = \"RGB\";\n" + Band("R", "1", "1")));
  EXPECT_TRUE(lacking.gains.empty() && lacking.offsets.empty() && lacking.bandNames.empty());
  EXPECT_FALSE(lacking.sunElevation || lacking.earthSunDistance);
}

TEST(SceneCalibration, TurnsCountsPerRadianceAndOrdersIrradiancesByBand) {
  Metadata metadata;
  const auto set = [&](const char* path, auto... values) {
    using T = std::common_type_t<decltype(values)...>;
    T list[] = {values...};
    EXPECT_TRUE(metadata.SetArray(path, Array<T>(list, ArrayDims(sizeof...(values)))));
  };
  set("/Radiometry/CountsPerRadiance", 10.0, 4.0);
  set("/Radiometry/Offsets", 0.5, 1.0);
  set("/Radiometry/BandNames", String("B0"), String("B1"));
  set("/Radiometry/SolarIrradiances", 1500.0, 1800.0);
  set("/Radiometry/SolarIrradianceBandNames", String("B1"), String("B0"));
  metadata.Set("/Acquisition/Date", "2020-01-05");
  SceneCalibration scene = ReadSceneCalibration(metadata);
  EXPECT_EQ(scene.gains, (std::vector<double>{0.1, 0.25}));
  EXPECT_EQ(scene.offsets, (std::vector<double>{0.5, 1.0}));
  EXPECT_EQ(scene.irradiances, (std::vector<double>{1800.0, 1500.0}));

  const MetadataPtr shared(new Metadata(metadata));
  catalog::Add(shared);
  const auto outcome = test::RunCommand("GetMetadataCalibrationCommand",
                                        {{"URI", FormatValue(shared->GetURI()).ToUTF8()}});
  catalog::Remove(shared);
  EXPECT_EQ(outcome.outputs.at("Gain"), "1:2 [0.1 0.25] ");
  EXPECT_EQ(outcome.outputs.at("BandNames"), "B0|B1");
  EXPECT_EQ(outcome.outputs.count("SunElevation"), 0U);

  set("/Radiometry/SolarIrradianceBandNames", String("B1"), String("B2"));
  EXPECT_TRUE(ReadSceneCalibration(metadata).irradiances.empty());
  set("/Radiometry/CountsPerRadiance", 10.0, 0.0);
  EXPECT_TRUE(ReadSceneCalibration(metadata).gains.empty());
}

TEST(SceneBands, AreToldByWhatIsPlainAlone) {
  SceneCalibration scene;
  scene.instrument = "ETM";
  for (const char* const band : {"B1", "B2", "B3", "B4", "B5", "B6_VCID_1", "B6_VCID_2", "B7"}) {
    scene.bandNames.emplace_back(band);
    scene.bandFiles.emplace_back("LE07_L1TP_012031_20020714_20200916_02_T1_" + String(band) +
                                 ".TIF");
    scene.k1.push_back(std::string(band).size() > 2 ? 666.09 : NAN);
  }
  using Names = std::vector<std::string>;
  const struct {
    const char* file;
    Names names;
    Names chosen;
    bool isThermal;
    std::vector<std::size_t> want;  // none: in doubt
  } cases[] = {
      {"LE07_L1TP_012031_20020714_20200916_02_T1_B6_VCID_2.TIF", {""}, {}, false, {6}},
      {"le07_b07.jp2", {""}, {}, false, {7}},
      {"B7", {""}, {}, false, {7}},
      {"band 3.tif", {""}, {}, false, {2}},
      {"my.b4.copy.tif", {""}, {}, false, {3}},
      {"B3_and_B03.tif", {""}, {}, false, {2}},
      {"B3_B4.tif", {""}, {}, false, {}},
      {"ab4.tif", {""}, {}, false, {}},
      {"B6.tif", {""}, {}, false, {}},    // of two gains
      {"B432.tif", {""}, {}, false, {}},  // bands 4, 3, 2, perhaps
      {"x_ST_B6_VCID_1.TIF", {""}, {}, true, {}},
      {"x_B3.tif", {"B4"}, {}, false, {2}},
      {"x.tif", {"B4"}, {}, false, {3}},
      {"x_B3.tif", {"", ""}, {"5", "B02"}, false, {4, 1}},
      {"x.tif", {"", ""}, {"6_vcid_1", "band_6_VCID_2"}, false, {5, 6}},
      {"x.tif", {"", ""}, {"6", "1"}, false, {}},
      {"x.tif", {"", ""}, {"1"}, false, {}},
      {"x.tif", {"B5", "Band 3 (red)"}, {}, false, {4, 2}},
      {"x.tif", {"B5", ""}, {}, false, {}},
      {"x.tif", {"B5", "band 5"}, {}, false, {}},
      {"x.tif", {"Band 1", "Band 2"}, {}, false, {}},
      {"x.tif", {"Band 1", "Band 2"}, {}, true, {5, 6}},
      {"x.tif", {"Band 2", "Band 1"}, {}, false, {1, 0}},
      {"x.tif", {"", "", "", "", "", ""}, {}, false, {0, 1, 2, 3, 4, 7}},
      {"x.tif", {"", "", "", "", "", "", ""}, {}, false, {}},
      {"x.tif", {"", "", "", "", "", "", "", ""}, {}, false, {0, 1, 2, 3, 4, 5, 6, 7}},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(std::string(c.file) + ", " + c.names[0]);
    BandsOfRaster raster;
    raster.file = c.file;
    raster.names = c.names;
    const SceneBands found = FindSceneBands(scene, raster, c.chosen, c.isThermal);
    EXPECT_EQ(found.bands, c.want) << found.doubt;
    EXPECT_EQ(found.doubt.empty(), !c.want.empty());
    EXPECT_EQ(found.how.empty() && found.doubt.empty(), false);
  }
}

}  // namespace
}  // namespace lumo
