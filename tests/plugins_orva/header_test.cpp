#include <cstdlib>

#include "commands/value_text.h"
#include "georef/rpc_georef.h"
#include "georef/std_rpc_georef.h"
#include "orva_scene.h"
#include "support/coordsys_support.h"
#include "support/rpc_file.h"
#include "support/sample_data.h"
#include "support/source_dir.h"

namespace lumo::test {
namespace {

/// A raster of bytes in a directory of its own.
struct HeaderCase {
  HeaderCase() { WriteFile(path, scene.Pixels<std::uint8_t>(RampValue<std::uint8_t>)); }

  void WriteHeader(const std::string& text) const { WriteFile(path.string() + ".hdr", text); }
  RasterDataConnectionPtr Open() const {
    TakeFault();
    return OpenSource({"ORVA", path.string()});
  }

  Scene scene;
  TemporaryDirectory directory;
  std::filesystem::path path = directory.Path() / "scene";
  std::string shownHeader = std::filesystem::weakly_canonical(path).string() + ".hdr";
};

std::string Replaced(std::string text, const std::string& from, const std::string& to) {
  const std::size_t at = text.find(from);
  EXPECT_NE(at, std::string::npos) << from;
  return text.replace(at, from.size(), to);
}

TEST(OrvaHeader, EachFaultIsToldWithItsLine) {
  const HeaderCase files;
  const std::string good = files.scene.Header("Byte");
  files.WriteHeader(good);
  ASSERT_TRUE(files.Open()) << TakeFault().ToUTF8();
  const struct {
    const char *from, *to, *fault;
  } cases[] = {
      {"ORVA\n", "ORVE\n", "line 1: the first line isn't ORVA"},
      {"samples = 7", "samples = 0", "line 2: samples is no count from 1 to 4294967295: 0"},
      {"samples = 7", "samples = -7", "line 2: samples is no count from 1 to 4294967295: -7"},
      {"samples = 7", "samples = 4294967303",
       "line 2: samples is no count from 1 to 4294967295: 4294967303"},
      {"samples = 7", "samples = 7x", "line 2: samples is no count from 1 to 4294967295: 7x"},
      {"samples = 7", "samples 7", "line 2: no \"=\""},
      {"samples = 7", " = 7", "line 2: no name before \"=\""},
      {"samples = 7\n", "", "line 8: the header ends without \"samples\""},
      {"lines = 5", "lines = 6", "line 3: the pixels take 168 bytes, the file has 140"},
      {"lines = 5", "lines = 5\nLines = 5", "line 4: \"lines\" is there twice"},
      {"bands = 4", "bands = 4294967295",
       "line 3: the pixels take 150323855325 bytes, the file has 140"},
      {"header offset = 0", "header offset = -1",
       "line 5: header offset is no number of bytes: -1"},
      {"header offset = 0", "header offset = 9223372036854775807",
       "line 5: the file would be larger than any file"},
      {"header offset = 0", "header offset = 1",
       "line 3: the pixels take 141 bytes, the file has 140"},
      {"data type = Byte", "data type = Bite", "line 6: no such data type: Bite"},
      {"data type = Byte", "data type = Quad", "line 6: no such data type: Quad"},
      {"interleave = BIP", "interleave = None", "line 7: interleave is not BIP, BIL or BSQ: None"},
      {"byte order = little endian", "byte order = middle",
       "line 8: byte order is not little endian or big endian: middle"},
      {"end = ORVA\n", "end = OR", "line 9: the header breaks off"},
      {"end = ORVA\n", "", "line 8: the header breaks off"},
      {"end = ORVA\n", "end = ORVA\nmore = 1\n", "line 10: text after the end"},
      {"end = ORVA\n", "band names = {a, b\nend = ORVA\n",
       "line 10: the list of \"band names\" has no end"},
      {"end = ORVA\n", "band names = {a, b} c\nend = ORVA\n", "line 9: text after \"}\""},
      {"end = ORVA\n", "no data values = {1, 2}\nend = ORVA\n",
       "line 9: not one no data value for each band"},
      {"end = ORVA\n", "no data values = {1, 2, 256, 4}\nend = ORVA\n",
       "line 9: no data value of another type: 256"},
      {"end = ORVA\n", "no data values = {1, 2, nan, 4}\nend = ORVA\n",
       "line 9: no data value of another type: nan"},
      {"end = ORVA\n", "georeference = Std 1 2\nend = ORVA\n",
       "line 9: no georeference in its text form"},
      {"end = ORVA\n", "map points = {1, 1, 5, 6, 7}\nend = ORVA\n",
       "line 9: not four numbers for each point"},
      {"end = ORVA\n", "map points = {1, 1, 5, inf}\nend = ORVA\n",
       "line 9: not four numbers for each point"},
      {"end = ORVA\n", "map points = {1, 1, 5, 6}\nend = ORVA\n",
       "line 9: the points do not lie in a grid of pixels"},
      {"end = ORVA\n", "statistics = {9 0 511 1 2 3}\nend = ORVA\n",
       "line 9: bad item in \"statistics\""},
      {"end = ORVA\n",
       "histograms = {0 0 1 4000000000 01 02 Native 1:4000000000 [1 ]}\nend = ORVA\n",
       "line 9: bad item in \"histograms\""},
      {"end = ORVA\n", "palettes = {4 255 0 0 255 0 red}\nend = ORVA\n",
       "line 9: bad item in \"palettes\""},
      {"end = ORVA\n", "palettes = {0 256 0 0 255 0 red}\nend = ORVA\n",
       "line 9: bad item in \"palettes\""},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.to);
    files.WriteHeader(Replaced(good, c.from, c.to));
    EXPECT_FALSE(files.Open());
    EXPECT_EQ(TakeFault().ToUTF8(), files.shownHeader + ": " + c.fault);
  }
}

TEST(OrvaHeader, SizesBeyondAllFilesAreRefused) {
  const HeaderCase files;
  Scene huge = files.scene;
  huge.samples = huge.lines = huge.bands = 0xFFFFFFFF;
  files.WriteHeader(huge.Header("ComplexDouble"));
  EXPECT_FALSE(files.Open());
  EXPECT_EQ(TakeFault().ToUTF8(),
            files.shownHeader + ": line 5: the file would be larger than any file");
}

TEST(OrvaHeader, CutAtAnyPlaceItIsRefused) {
  const HeaderCase files;
  const std::string whole = files.scene.Header("Byte");
  for (std::size_t size = 0; size < whole.size() - 1; ++size) {  // the last line end may be missing
    files.WriteHeader(whole.substr(0, size));
    EXPECT_FALSE(files.Open()) << size;
    EXPECT_NE(TakeFault().ToUTF8().find(".hdr: line "), std::string::npos) << size;
  }
  files.WriteHeader(whole.substr(0, whole.size() - 1));
  EXPECT_TRUE(files.Open());
}

TEST(OrvaHeader, TakesHandWrittenForms) {
  const HeaderCase files;
  files.WriteHeader(
      "ORVA\r\n; a comment\r\n\r\nSamples=7\r\nLINES =  5 \r\nbands\t= 4\r\nheader offset = 0\r\n"
      "data type = Byte\r\ninterleave = BSQ\r\nbyte order = big endian\r\n"
      "no data values = {\r\n  1, none,\r\n 2.0e1,\r\n  none }\r\nend = ORVA\r\n\r\n");
  const auto source = files.Open();
  ASSERT_TRUE(source) << TakeFault().ToUTF8();
  const RasterDef def = source->RasterDef();
  EXPECT_EQ(def.samples, 7U);
  EXPECT_EQ(def.lines, 5U);
  EXPECT_EQ(def.bands, 4U);
  EXPECT_EQ(def.interleave, Interleave::BSQ);
  EXPECT_EQ(def.format, String("ORVA"));
  EXPECT_EQ(def.noData, (std::map<unsigned, double>{{0, 1}, {2, 20}}));
}

TEST(OrvaHeader, TheExampleOfTheDocumentOpens) {
  const std::string document = ReadFile(SourceDir() + "/docs/file-formats.md");
  const std::size_t begin = document.find("ORVA\nsamples");
  ASSERT_NE(begin, std::string::npos);
  const HeaderCase files;
  files.WriteHeader(document.substr(begin, document.find("```", begin) - begin));
  std::filesystem::resize_file(files.path, 349U * 352 * 3 * 2);
  const auto source = files.Open();
  ASSERT_TRUE(source) << TakeFault().ToUTF8();
  double x = 0, y = 0;
  ASSERT_TRUE(source->RasterDef().geoRef);
  ASSERT_TRUE(source->RasterDef().geoRef->PixelToMap(349, 352, x, y));
  EXPECT_NEAR(x, 298722.8, 1e-6);  // its map points say so
  EXPECT_NEAR(y, 9110728.8, 1e-6);
}

TEST(OrvaHeader, FoundByItsFirstLineUnderBothNames) {
  const HeaderCase files;
  files.WriteHeader(files.scene.Header("Byte"));
  DataConnectionFactory* const factory = FactoryForFormat("ORVA");
  ASSERT_NE(factory, nullptr) << TakeFault().ToUTF8();
  EXPECT_TRUE(factory->CanConnect(Strings({files.path.string()})));
  EXPECT_TRUE(factory->CanConnect(Strings({"ORVA", files.path.string() + ".hdr"})));
  EXPECT_FALSE(factory->CanConnect(Strings({files.path.string(), "x"})));
  EXPECT_FALSE(factory->CanConnect(Strings({})));
  EXPECT_FALSE(factory->CanConnect(Strings({files.directory.Path().string()})));
  files.WriteHeader("ORVAL\n");
  EXPECT_FALSE(factory->CanConnect(Strings({files.path.string()})));
}

TEST(OrvaHeader, OneURIForEveryWayToNameTheFile) {
  const TemporaryDirectory directory;
  const Scene scene;
  const auto path = directory.Path() / "a]b";
  scene.Write<std::uint8_t>(path);
  std::filesystem::create_symlink(path, directory.Path() / "link");
  std::filesystem::create_symlink(path.string() + ".hdr", directory.Path() / "link.hdr");
  const std::string want = (std::filesystem::canonical(directory.Path()) / "a%5Db").string();
  for (const std::string& name :
       {path.string(), path.string() + ".hdr", (directory.Path() / "." / "a]b").string(),
        (directory.Path() / "link").string()}) {
    auto source = OpenSource({"ORVA", name});
    ASSERT_TRUE(source) << name;
    EXPECT_EQ(source->URI().ToUTF8(), want);
    EXPECT_EQ(source->ConnectionStrings()[0], String("ORVA"));
    EXPECT_EQ(source->ConnectionStrings()[1].ToUTF8(), std::filesystem::canonical(path).string());
  }
}

GeoRefPtr Grid(double rotation) {
  auto* const grid = new StdGeoRef;
  GeoRefPtr owner(grid);
  grid->SetPixelSize(28.5, 1.0 / 3);
  grid->SetTieMap(288776.3, 9120760.8);
  grid->SetTiePixel(0.1, -2);
  grid->SetRotation(rotation);
  grid->SetCoordinateSystem(MakeCoordSys("EPSG:31985"));
  return owner;
}

std::vector<GeoRefPtr> Models() {
  std::vector<GeoRefPtr> models = {GeoRefPtr(), Grid(0), Grid(33.3)};
  if (const std::string rpb = SampleData("rpc_scene.RPB"); !rpb.empty()) {
    RpcGeoRef camera;
    camera.SetCoefficients(LoadRpb(rpb));
    models.push_back(CloneOf(GeoRefPtr(&camera, true)));
    auto* const both = new StdRpcGeoRef;
    both->SetRpc(camera);
    both->SetPixelSize(2, 3);
    models.emplace_back(both);
  }
  return models;
}

TEST(OrvaHeader, ModelsComeBackExactly) {
  const TemporaryDirectory directory;
  const auto path = (directory.Path() / "scene").string();
  for (const GeoRefPtr& model : Models()) {
    RasterDef def = Scene().Def(kDataTypeOf<std::uint8_t>);
    def.SetGeoRef(model);
    SCOPED_TRACE(FormatValue(def.geoRef).ToUTF8());
    auto source = CreateSource({path}, def);
    ASSERT_TRUE(source) << TakeFault().ToUTF8();
    EXPECT_EQ(FormatValue(source->RasterDef().geoRef), FormatValue(def.geoRef));
    ASSERT_EQ(Release(source), "");
    source = OpenSource({"ORVA", path});
    ASSERT_TRUE(source) << TakeFault().ToUTF8();
    EXPECT_EQ(FormatValue(source->RasterDef().geoRef), FormatValue(def.geoRef));
  }
}

TEST(OrvaHeader, PointsGiveTheGridWhereTheModelIsMissing) {
  const HeaderCase files;
  const auto pointsOf = [](double (*x)(double, double), double (*y)(double, double)) {
    std::string items;
    for (const auto& [sample, line] : {std::pair{0., 0.}, {7., 0.}, {7., 5.}, {0., 5.}}) {
      std::ostringstream out = MakeTextWriter();
      out << (items.empty() ? "" : ", ") << sample + 1 << ", " << line + 1 << ", "
          << y(sample, line) << ", " << x(sample, line);
      items += out.str();
    }
    return "{" + items + "}";
  };
  const struct {
    const char* name;
    std::string more;
    double sizeX, sizeY, rotation, x, y;  // x, y: of pixel (7, 5)
  } cases[] = {
      {"two points",
       "map points = {1, 1, 200, 100, 8, 6, 150, 170}\ncoordinate system string = {EPSG:31985}\n",
       10, 10, 0, 170, 150},
      {"four corners, turned by 90 degrees",
       "map points = " +
           pointsOf([](double, double l) { return 100 + 2 * l; },
                    [](double s, double) { return 200 + 2 * s; }) +
           "\n",
       2, 2, 90, 110, 214},
      {"pixels that aren't square, turned",
       "map points = " +
           pointsOf([](double, double l) { return 100 + 3 * l; },
                    [](double s, double) { return 200 + 2 * s; }) +
           "\n",
       2, 3, 90, 115, 214},
      {"lines that go north",
       "map points = " +
           pointsOf([](double s, double) { return 100 + 10 * s; },
                    [](double, double l) { return 200 + 10 * l; }) +
           "\n",
       10, -10, 0, 170, 250},
      {"latitude and longitude",
       "geo points = " +
           pointsOf([](double s, double) { return -35 + 0.5 * s; },
                    [](double, double l) { return -8 - 0.5 * l; }) +
           "\n",
       0.5, 0.5, 0, -31.5, -10.5},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    Scene scene = files.scene;
    scene.more = c.more;
    files.WriteHeader(scene.Header("Byte"));
    const auto source = files.Open();
    ASSERT_TRUE(source) << TakeFault().ToUTF8();
    const GeoRefPtr model = source->RasterDef().geoRef;
    ASSERT_TRUE(model);
    EXPECT_NEAR(model->PixelSizeX(), c.sizeX, 1e-9);
    EXPECT_NEAR(model->PixelSizeY(), c.sizeY, 1e-9);
    EXPECT_NEAR(model->Rotation(), c.rotation, 1e-6);
    double x = 0, y = 0;
    ASSERT_TRUE(model->PixelToMap(7, 5, x, y));
    EXPECT_NEAR(x, c.x, 1e-5);
    EXPECT_NEAR(y, c.y, 1e-5);
  }
}

TEST(OrvaHeader, WhatItDoesNotKnowStays) {
  const HeaderCase files;
  Scene scene = files.scene;
  scene.more =
      "; by hand\n\nsensor type = Some, thing = else\nband names = {Red,\n  Gr%2Cn, Blue , "
      "Alpha}\n";
  files.WriteHeader(scene.Header("Byte"));
  auto source = files.Open();
  const auto reader = ReaderOf<std::uint8_t>(source);
  ASSERT_TRUE(reader) << TakeFault().ToUTF8();
  RasterBandStats<std::uint8_t> stats;
  stats.band = 1;
  stats.mask = StatsMask::Min;
  ASSERT_TRUE(reader->WriteStats(MakeArray<RasterBandStats<std::uint8_t>>({stats})))
      << TakeFault().ToUTF8();
  const std::string kept = Replaced(scene.Header("Byte"), "end = ORVA\n", "statistics = {");
  EXPECT_EQ(ReadFile(files.shownHeader).substr(0, kept.size() - 2), Replaced(kept, "  Gr", "Gr"));
}

}  // namespace
}  // namespace lumo::test
