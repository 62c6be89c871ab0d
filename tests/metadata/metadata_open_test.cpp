#include "foundation/fault.h"
#include "metadata/metadata_formats.h"
#include "metadata/metadata_text.h"
#include "support/metadata_support.h"
#include "support/sample_data.h"

namespace lumo {
namespace {

/// A file of a scene, in a directory that goes with the test.
class MetadataOpen : public testing::Test {
 protected:
  MetadataOpen() { test::UseDefinitionFiles(); }

  bool Open(const char* format, const std::string& text, std::initializer_list<String> more = {}) {
    const std::string path = directory_.Path() / "file";
    test::WriteFile(path, text);
    std::vector<String> pieces{format, String(path)};
    pieces.insert(pieces.end(), more);
    test::gParseLog.Take();
    return metadata_.Open(Array<String>(pieces.data(), ArrayDims(unsigned(pieces.size()))));
  }

  test::TemporaryDirectory directory_;
  Metadata metadata_;
};

TEST_F(MetadataOpen, SaysWhyNot) {
  const std::string failed = "Metadata::Open failed. ";
  const struct {
    std::vector<String> strings;
    std::string log;
  } cases[] = {
      {{"ORVA", ""}, failed + "Connection string is empty: (1)\n"},
      {{"EMPTY", ""}, failed + "Connection string is empty: (1)\n"},
      {{"ORVA"}, failed + "Invalid number of connection strings. String[0]: (ORVA)\n"},
      {{"orva", "x"}, failed + "Invalid format connection string: (orva)\n"},
      {{"DGIMD", "/no/file"}, failed + "Failed to parse text input.\n"},
      {{"PLEIADESRPC", "/no/file"}, failed + "Failed to parse xml input.\n"},
      {{"ORVA", "/no/file"}, failed + "Failed to parse orva input. \n"},
      {{"GML", "/no/file"}, failed + "Failed to parse gml input.\n"},
      {{"PLEIADESDIM", "/no/file"}, failed + "Failed to parse pleiades dim xml input.\n"},
      {{"TIFF", "/no/file"}, failed + "Failed to parse gdal input. Connect error.\n"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.log);
    std::vector<String> strings = c.strings;
    test::gParseLog.Take();
    EXPECT_FALSE(
        metadata_.Open(Array<String>(strings.data(), ArrayDims(unsigned(strings.size())))));
    EXPECT_THAT(test::gParseLog.Take(), testing::EndsWith(c.log));
    EXPECT_NE(TakeFault().GetLength(), 0U);
  }
  for (const auto& strings : {Array<String>(), test::Strings({"EMPTY"})}) {
    EXPECT_TRUE(metadata_.Open(strings));
  }
  auto& environment = GetGlobalEnvironmentImpl()[Environment::kMdfDirectory].text;
  environment = "";
  EXPECT_FALSE(metadata_.Open(test::Strings({"ORVA", "x"})));
  EXPECT_EQ(test::gParseLog.Take(),
            failed + "Invalid path to mdf files. Lumo mdf env is not valid.\n");
  environment = String(directory_.Path().string());
  EXPECT_FALSE(metadata_.Open(test::Strings({"ORVA", "x"})));
  EXPECT_THAT(test::gParseLog.Take(),
              testing::HasSubstr("MDF Parser: Failed to open: (" + directory_.Path().string() +
                                 "/mdf_orva.txt)\n"));
  EXPECT_EQ(metadata_.Describe().ToUTF8(), "");
}

TEST_F(MetadataOpen, FormatsHaveAFileAReaderAndAWord) {
  String file, extra;
  eMetadataReader reader = kNoMetadataReader;
  EXPECT_TRUE(GMetadataByFrmtName("Erdas", file, reader, extra));
  EXPECT_EQ(file.ToUTF8() + " " + extra.ToUTF8(), "mdf_gdal.txt HFA");
  EXPECT_EQ(reader, kGdalMetadataReader);
  EXPECT_FALSE(GMetadataByFrmtName("ERDAS", file, reader, extra));
  EXPECT_EQ(GetMetadataFormats().size(), 12U);
}

TEST_F(MetadataOpen, OrvaTurnsPointsAndKeepsTheSystemWhole) {
  ASSERT_TRUE(Open("ORVA",
                   "ORVA\nsamples = 349\nbands = 2\nband names = {Red, Near infrared}\n"
                   "coordinate system string = {GEOGCS[\"x\",y]}\n"
                   "map points = {1, 1, 9120760.8, 288776.3, 350, 1,\n 9120760.8, 298722.8}\n"
                   "geo points = {11, 21, -8, -34}\ngains = {0.5, 0.25}\n"
                   "sun elevation = 41.5\nmine = {x, y}\nend = ORVA\n"))
      << TakeFault().ToUTF8();
  EXPECT_EQ(test::ValueAt<String>(metadata_, "/CoordSys/Text").ToUTF8(), "GEOGCS[\"x\",y]");
  EXPECT_EQ(test::ListAt<double>(metadata_, "/CoordSys/MapPoints"),
            (std::vector<double>{0, 0, 288776.3, 9120760.8, 349, 0, 298722.8, 9120760.8}));
  MetadataProperties properties;
  EXPECT_TRUE(metadata_.GetProperties("/CoordSys/MapPoints", properties));
  EXPECT_EQ(properties.rows, 2U);
  EXPECT_EQ(test::ListAt<double>(metadata_, "/CoordSys/GeoPoints"),
            (std::vector<double>{10, 20, -34, -8}));
  EXPECT_EQ(test::ListAt<double>(metadata_, "/Radiometry/Gains"), (std::vector<double>{0.5, 0.25}));
  EXPECT_EQ(test::ListAt<String>(metadata_, "/Bands/Names")[1].ToUTF8(), "Near infrared");
  EXPECT_EQ(test::ValueAt<String>(metadata_, "/mine").ToUTF8(), "{x, y}");
  EXPECT_EQ(test::ValueAt<unsigned>(metadata_, "/Image/Samples"), 349U);
  EXPECT_FALSE(Open("ORVA", "map points = {1, 2, 3}\n"));
}

/// A document as GDAL 3.6 writes it into a JPEG 2000 file, cut to what matters.
std::string Gml(const std::string& system) {
  return "<gml:FeatureCollection xmlns:gml=\"http://www.opengis.net/gml\"><gml:featureMember>"
         "<gml:FeatureCollection><gml:featureMember><gml:RectifiedGridCoverage dimension=\"2\">"
         "<gml:rectifiedGridDomain><gml:RectifiedGrid dimension=\"2\"><gml:limits>"
         "<gml:GridEnvelope><gml:low>0 0</gml:low><gml:high>348 351</gml:high>"
         "</gml:GridEnvelope></gml:limits><gml:axisName>x</gml:axisName>"
         "<gml:axisName>y</gml:axisName><gml:origin><gml:Point gml:id=\"P0001\" srsName=\"" +
         system +
         "\"><gml:pos>288790.5 9120746.5</gml:pos></gml:Point></gml:origin>"
         "<gml:offsetVector gml:id=\"offset1\" srsName=\"" +
         system + "\">28.5 0</gml:offsetVector><gml:offsetVector gml:id=\"offset2\" srsName=\"" +
         system +
         "\">0 -28.5</gml:offsetVector></gml:RectifiedGrid></gml:rectifiedGridDomain>"
         "</gml:RectifiedGridCoverage></gml:featureMember></gml:FeatureCollection>"
         "</gml:featureMember></gml:FeatureCollection>";
}

TEST_F(MetadataOpen, GmlGivesGridAndCode) {
  ASSERT_TRUE(Open("GML", Gml("urn:ogc:def:crs:EPSG::31985"))) << TakeFault().ToUTF8();
  EXPECT_EQ(test::ValueAt<int>(metadata_, "/CoordSys/Code"), 31985);
  EXPECT_EQ(test::ValueAt<int>(metadata_, "/Grid/AxesCode"), 31985);
  EXPECT_EQ(test::ListAt<double>(metadata_, "/Grid/Center"),
            (std::vector<double>{288790.5, 9120746.5}));
  EXPECT_EQ(test::ListAt<double>(metadata_, "/Grid/LineStep"), (std::vector<double>{0, -28.5}));
  EXPECT_EQ(test::ListAt<int>(metadata_, "/Grid/High"), (std::vector<int>{348, 351}));
  EXPECT_EQ(test::ListAt<String>(metadata_, "/Grid/AxisNames").size(), 2U);
  EXPECT_FALSE(Open("GML", Gml("EPSG 31985")));
  EXPECT_TRUE(Metadata().Open(
      test::Strings({"GML", String(Gml("urn:ogc:def:crs:EPSG::31985")), "XmlString"})));
}

TEST_F(MetadataOpen, PleiadesGivesRadiometryAnglesAndCode) {
  const auto place = [](const char* name, const char* hour, double sun) {
    return std::string("<Located_Geometric_Values><LOCATION_TYPE>") + name +
           "</LOCATION_TYPE><TIME>2012-02-02T" + hour +
           "</TIME><Solar_Incidences><SUN_ELEVATION unit=\"deg\">" + std::to_string(sun) +
           "</SUN_ELEVATION></Solar_Incidences></Located_Geometric_Values>";
  };
  const auto radiance = [](const char* band, const char* gain) {
    return std::string("<Band_Radiance><BAND_ID>") + band + "</BAND_ID><GAIN>" + gain +
           "</GAIN><BIAS>0.5</BIAS></Band_Radiance>";
  };
  const auto document = [&](const std::string& lists, const std::string& code) {
    return "<?xml version=\"1.0\"?><Dimap_Document><Coordinate_Reference_System><Projected_CRS>"
           "<PROJECTED_CRS_CODE>" +
           code +
           "</PROJECTED_CRS_CODE></Projected_CRS>"
           "</Coordinate_Reference_System><Geometric_Data><Use_Area>" +
           place("Top Center", "07:25:47Z", 40.5) + place("Center", "07:25:48Z", 41.5) +
           place("Bottom Center", "07:25:49Z", 42.5) +
           "</Use_Area></Geometric_Data><Radiometric_Data><Radiometric_Calibration>"
           "<Instrument_Calibration><Band_Measurement_List>" +
           lists +
           "</Band_Measurement_List></Instrument_Calibration></Radiometric_Calibration>"
           "</Radiometric_Data></Dimap_Document>";
  };
  const std::string code = "urn:ogc:def:crs:EPSG::32631";
  ASSERT_TRUE(Open("PLEIADESDIM", document(radiance("B0", "9.5") + radiance("B1", "10"), code)))
      << TakeFault().ToUTF8();
  EXPECT_EQ(test::ValueAt<int>(metadata_, "/CoordSys/Code"), 32631);
  EXPECT_EQ(test::ValueAt<double>(metadata_, "/Acquisition/SunElevation"), 41.5);
  EXPECT_EQ(test::ValueAt<String>(metadata_, "/Acquisition/Time").ToUTF8(), "2012-02-02T07:25:48Z");
  EXPECT_EQ(test::ListAt<double>(metadata_, "/Radiometry/CountsPerRadiance"),
            (std::vector<double>{9.5, 10}));
  EXPECT_EQ(test::ListAt<String>(metadata_, "/Radiometry/BandNames")[1].ToUTF8(), "B1");
  metadata_ = Metadata();
  ASSERT_TRUE(Open("PLEIADESDIM", document(radiance("P", "11.5"), code)));  // one band
  EXPECT_EQ(test::ListAt<double>(metadata_, "/Radiometry/CountsPerRadiance"),
            (std::vector<double>{11.5}));
  EXPECT_FALSE(Open("PLEIADESDIM", document("", "32631")));
  EXPECT_THAT(test::gParseLog.Take(),
              testing::HasSubstr("Mdf Translate - Error: (Failed to translate.) Line: "
                                 "(/Dimap_Document/Coordinate_Reference_System/Projected_CRS/"
                                 "PROJECTED_CRS_CODE/__text__/) \n"));
}

TEST_F(MetadataOpen, PleiadesCamerasHaveTwentyTermsEach) {
  std::string model;
  for (const char* const name :
       {"SAMP_NUM_COEFF_", "SAMP_DEN_COEFF_", "LINE_NUM_COEFF_", "LINE_DEN_COEFF_"}) {
    for (int term = 1; term <= 20; ++term) {
      const std::string tag = name + std::to_string(term);
      model += "<" + tag + ">" + std::to_string(term * 0.5) + "</" + tag + ">";
    }
  }
  ASSERT_TRUE(Open("PLEIADESRPC",
                   "<Dimap_Document><Rational_Function_Model><Global_RFM><Inverse_Model>" + model +
                       "</Inverse_Model><RFM_Validity><LINE_OFF>100.5</LINE_OFF></RFM_Validity>"
                       "</Global_RFM></Rational_Function_Model></Dimap_Document>"))
      << TakeFault().ToUTF8();
  for (const char* const path : {"/RPC/LineNumerator", "/RPC/LineDenominator",
                                 "/RPC/SampleNumerator", "/RPC/SampleDenominator"}) {
    const auto terms = test::ListAt<double>(metadata_, path);
    ASSERT_EQ(terms.size(), 20U);
    EXPECT_EQ(terms[19], 10.0);
  }
  EXPECT_EQ(test::ValueAt<double>(metadata_, "/RPC/LineOffsetFrom1"), 100.5);
}

TEST_F(MetadataOpen, TileMapsGiveAListForEachProperty) {
  std::string text = "bandId = \"Multi\";\nnumTiles = 2;\ntileUnits = \"Pixels\";\n";
  for (const char* const tile : {"1", "2"}) {
    text += std::string("BEGIN_GROUP = TILE_") + tile + "\n\tfilename = \"a, " + tile +
            ".TIF\";\n\tULColOffset = 10" + tile + ";\n\tULLat = 41.5;\nEND_GROUP = TILE_" + tile +
            "\n";
  }
  ASSERT_TRUE(Open("DGTIL", text + "END;\n")) << TakeFault().ToUTF8();
  EXPECT_EQ(test::ListAt<String>(metadata_, "/Tiles/Files")[1].ToUTF8(), "a, 2.TIF");
  EXPECT_EQ(test::ListAt<unsigned>(metadata_, "/Tiles/UpperLeftSamples"),
            (std::vector<unsigned>{101, 102}));
  EXPECT_EQ(test::ListAt<double>(metadata_, "/Tiles/UpperLeftLatitudes"),
            (std::vector<double>{41.5, 41.5}));
}

TEST_F(MetadataOpen, ReadsTheSampleHeaders) {
  const std::string imd = test::SampleData("sidecars/wv03.IMD");
  if (imd.empty()) GTEST_SKIP() << "no sample data";
  ASSERT_TRUE(metadata_.Open(test::Strings({"DGIMD", String(imd)}))) << TakeFault().ToUTF8();
  // The values as they stand in the file.
  EXPECT_EQ(test::ValueAt<String>(metadata_, "/Sensor/Satellite").ToUTF8(), "WV03");
  EXPECT_EQ(test::ValueAt<String>(metadata_, "/Acquisition/Time").ToUTF8(),
            "2010-04-01T12:00:00.000000Z");
  EXPECT_EQ(test::ValueAt<double>(metadata_, "/Acquisition/CloudCover"), 0.027);
  EXPECT_EQ(test::ValueAt<unsigned>(metadata_, "/Image/Samples"), 50U);
  EXPECT_EQ(test::ValueAt<String>(metadata_, "/CoordSys/Datum").ToUTF8(), "WE");
  EXPECT_EQ(test::ValueAt<String>(metadata_, "/IMAGE_1/revNumber").ToUTF8(), "337");
  List<String> hidden;
  metadata_.GetNamesPrivate("/", hidden);
  EXPECT_EQ(hidden.GetCount(), 2U);

  // A second source adds to the first.
  ASSERT_TRUE(
      metadata_.Open(test::Strings({"DGRPB", String(test::SampleData("sidecars/wv03.RPB"))})));
  EXPECT_EQ(test::ValueAt<double>(metadata_, "/RPC/ErrorBias"), 1.49);
  EXPECT_EQ(test::ValueAt<double>(metadata_, "/RPC/LongitudeScale"), 0.0225);
  const auto terms = test::ListAt<double>(metadata_, "/RPC/LineNumerator");
  ASSERT_EQ(terms.size(), 20U);
  EXPECT_EQ(terms.front(), -6.181087E-03);
  EXPECT_EQ(terms.back(), -9.876127E-08);
  EXPECT_TRUE(metadata_.Exists("/Acquisition/Time"));
}

TEST_F(MetadataOpen, AFailureChangesNothing) {
  ASSERT_TRUE(Open("DGRPB", "satId = \"A\";\n"));
  const Metadata before(metadata_);
  EXPECT_FALSE(Open("ORVA", "samples = 5\nmap points = {1, 2}\n"));
  EXPECT_FALSE(metadata_.Exists("/Image/Samples"));
  EXPECT_TRUE(metadata_.Set("/Image", 1));
  EXPECT_FALSE(Open("ORVA", "samples = 5\n"));  // "/Image/" is a value here
  EXPECT_EQ(metadata_.Describe("/").ToUTF8().find("/private/CoordSys"), std::string::npos);
  EXPECT_TRUE(before.Exists("/Sensor/Satellite"));
}

}  // namespace
}  // namespace lumo
