#include <filesystem>
#include <random>

#include "gdal_peer.h"
#include "georef/std_rpc_georef.h"
#include "support/coordsys_support.h"
#include "support/rpc_file.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::Block;
using test::CreateSource;
using test::OpenSource;
using test::Peer;
using test::ReaderOf;
using test::Release;

RasterDef MakeDef(const char* format, unsigned dataType, unsigned bands,
                  Interleave interleave = Interleave::BIP) {
  RasterDef def;
  def.format = format;
  def.samples = 67;
  def.lines = 45;
  def.bands = bands;
  def.dataType = dataType;
  def.interleave = interleave;
  return def;
}

/// Pixels all over the range of a type.
template <typename T>
std::vector<T> RandomPixels(std::size_t count) {
  std::mt19937_64 random(20240611);
  std::vector<T> pixels(count);
  for (T& pixel : pixels) {
    if constexpr (std::is_integral_v<T>) {
      pixel = static_cast<T>(random());
    } else if constexpr (std::is_floating_point_v<T>) {
      pixel = static_cast<T>(std::ldexp(static_cast<double>(random()), -40));
    } else {
      using Part = decltype(T::real);
      pixel = {static_cast<Part>(random()), -static_cast<Part>(random())};
    }
  }
  return pixels;
}

template <typename T>
Block<T> WholeBlock(const RasterDef& def) {
  Block<T> block{{0, 0, def.samples - 1, def.lines - 1}, {}, {}, {}};
  for (unsigned band = 0; band < def.bands; ++band) block.bands.push_back(band);
  block.pixels = RandomPixels<T>(std::size_t{def.samples} * def.lines * def.bands);
  block.state.assign(block.pixels.size(), 0);
  return block;
}

/// Makes a raster, reads it back before and after it is let go, and as GDAL alone reads it.
template <typename T>
void ExpectKept(const std::string& path, const RasterDef& def) {
  Block<T> block = WholeBlock<T>(def);
  auto made = CreateSource({path}, def);
  ASSERT_TRUE(made) << TakeFault().ToUTF8();
  const auto writer = ReaderOf<T>(made);
  ASSERT_TRUE(writer);
  ASSERT_TRUE(writer->CanWritePixels(0));
  ASSERT_TRUE(block.Write(*writer)) << TakeFault().ToUTF8();
  const std::vector<T> written = block.pixels;
  const Interleave writtenAs = writer->RasterDef().interleave;
  EXPECT_TRUE(block.Read(*writer));
  EXPECT_EQ(std::memcmp(block.pixels.data(), written.data(), written.size() * sizeof(T)), 0);
  EXPECT_FALSE(fs::exists(path));
  ASSERT_EQ(Release(made), "");
  ASSERT_TRUE(fs::exists(path));

  const auto again = OpenSource({def.format.ToUTF8(), path});
  ASSERT_TRUE(again) << TakeFault().ToUTF8();
  EXPECT_EQ(again->DataType(), static_cast<int>(def.dataType));
  const Peer peer(path);
  for (unsigned band = 0; band < def.bands; ++band) {
    const auto pixels = Peer::Pixels(peer.Band(band));
    Block<T> one{block.rect, {band}, {}, {}};
    ASSERT_TRUE(one.Read(*ReaderOf<T>(again))) << TakeFault().ToUTF8();
    std::size_t at = 0, wrong = 0, wrongForPeer = 0;
    test::VisitBlock(writtenAs, block.rect, block.bands, [&](unsigned x, unsigned y, unsigned b) {
      const T& want = written[at++];
      if (b != band) return;
      const std::size_t place = std::size_t{y} * def.samples + x;
      if (std::memcmp(&one.pixels[place], &want, sizeof(T)) != 0) ++wrong;
      if constexpr (!std::is_same_v<T, std::int8_t>) {  // a byte to GDAL
        if (!test::SameValue(pixels[place], test::AsComplex(want))) ++wrongForPeer;
      }
    });
    EXPECT_EQ(wrong, 0U) << "band " << band;
    EXPECT_EQ(wrongForPeer, 0U) << "band " << band;
  }
}

std::size_t FilesIn(const fs::path& directory) {
  return static_cast<std::size_t>(
      std::distance(fs::directory_iterator(directory), fs::directory_iterator()));
}

TEST(GdalCreation, KeepsEveryPixelOfEveryType) {
  const unsigned all[] = {1, 99, 12, 2, 13, 3, 4, 5, 15, 14, 6, 9};
  const struct {
    const char* format;
    const char* extension;
    std::vector<unsigned> types, bandCounts;
  } cases[] = {
      {"TIFF", ".tif", {std::begin(all), std::end(all)}, {1, 3}},
      {"Erdas", ".img", {1, 99, 12, 2, 13, 3, 4, 5, 6, 9}, {1, 3}},
      {"NITF", ".ntf", {1, 12, 2, 13, 3, 4, 5, 6}, {1, 3}},
      {"PNG", ".png", {1, 12}, {1, 2, 3, 4}},
      {"JPEG2000", ".jp2", {1, 12, 2}, {1, 3, 5}},
      {"BMP", ".bmp", {1}, {1, 3}},
      {"GIF", ".gif", {1}, {1}},
  };
  test::TemporaryDirectory directory;
  for (const auto& c : cases) {
    for (const unsigned type : c.types) {
      for (const unsigned bands : c.bandCounts) {
        for (const Interleave interleave : {Interleave::BIP, Interleave::BSQ}) {
          SCOPED_TRACE(std::string(c.format) + " " + DataTypeName(type).ToUTF8() + " " +
                       std::to_string(bands) + " " + std::to_string(static_cast<int>(interleave)));
          const std::string path =
              (directory.Path() / ("made" + std::string(c.extension))).string();
          EXPECT_TRUE(DispatchType(TwelveTypes{}, type, [&]<typename T>() {
            ExpectKept<T>(path, MakeDef(c.format, type, bands, interleave));
            return true;
          }));
          fs::remove(path);
          fs::remove(path + ".aux.xml");
        }
      }
    }
  }
  EXPECT_EQ(FilesIn(directory.Path()), 0U);
}

TEST(GdalCreation, RefusesWhatTheFormatCannotHold) {
  const struct {
    const char* format;
    unsigned type, bands;
  } cases[] = {{"PNG", 4, 1},      {"PNG", 1, 5},       {"PNG", 99, 1}, {"JPEG", 12, 3},
               {"JPEG", 1, 5},     {"GIF", 1, 3},       {"GIF", 12, 1}, {"BMP", 2, 1},
               {"BMP", 1, 2},      {"Erdas", 14, 1},    {"NITF", 9, 1}, {"JPEG2000", 4, 1},
               {"JPEG2000", 3, 1}, {"JPEG2000", 13, 3}, {"TIFF", 0, 1}, {"TIFF", 1, 0},
               {"DTED", 2, 1},     {"Esri", 2, 1},      {"GRIB", 5, 1}};
  test::TemporaryDirectory directory;
  for (const auto& c : cases) {
    SCOPED_TRACE(std::string(c.format) + " " + std::to_string(c.type));
    const std::string path = (directory.Path() / "made.out").string();
    EXPECT_FALSE(CreateSource({path}, MakeDef(c.format, c.type, c.bands)));
    const std::string fault = TakeFault().ToUTF8();
    EXPECT_TRUE(fault.starts_with(path + ": ") && fault.size() > path.size() + 8) << fault;
    EXPECT_EQ(FilesIn(directory.Path()), 0U);
  }
}

TEST(GdalCreation, KeepsGridCoordinateSystemAndNoData) {
  const struct {
    const char* format;
    const char* extension;
    double rotation;
    bool byBand;  // a no-data value for each band
    const char* system = "EPSG:31985";
  } cases[] = {{"NITF", ".ntf", 0, true, "EPSG:32725"},
               {"NITF", ".ntf", 0, false, "EPSG:4326"},
               {"TIFF", ".tif", 0, false},
               {"TIFF", ".tif", 30, true},
               {"Erdas", ".img", 0, true},
               {"NITF", ".ntf", 0, false},
               {"PNG", ".png", 0, false},
               {"JPEG2000", ".jp2", 0, false},
               {"Erdas", ".img", 30, false},
               {"PNG", ".png", 30, true}};
  test::TemporaryDirectory directory;
  for (const auto& c : cases) {
    SCOPED_TRACE(std::string(c.format) + (c.rotation != 0 ? " rotated" : ""));
    const std::string path =
        (directory.Path() / ("grid" + std::to_string(&c - cases) + c.extension)).string();
    RasterDef def = MakeDef(c.format, 1, 3);
    StdGeoRef grid;
    grid.SetPixelSize(28.5, 30.25);
    grid.SetTiePixel(10, 4);
    grid.SetTieMap(288776.25, 9120760.75);
    grid.SetRotation(c.rotation);
    grid.SetCoordinateSystem(test::MakeCoordSys(c.system));
    def.SetGeoRef(GeoRefPtr(grid.Clone()));
    for (unsigned band = 0; band < 3; ++band) def.noData[band] = c.byBand ? band + 7 : 7;
    auto made = CreateSource({path}, def);
    ASSERT_TRUE(made) << TakeFault().ToUTF8();
    Block<std::uint8_t> block = WholeBlock<std::uint8_t>(def);
    for (auto& pixel : block.pixels) pixel = static_cast<std::uint8_t>(pixel % 16);
    ASSERT_TRUE(block.Write(*ReaderOf<std::uint8_t>(made)));
    ASSERT_EQ(Release(made), "");

    const auto again = OpenSource({path});
    ASSERT_TRUE(again) << TakeFault().ToUTF8();
    const RasterDef read = again->RasterDef();
    ASSERT_TRUE(read.geoRef);
    for (const double sample : {0.0, 67.0}) {
      for (const double line : {0.0, 45.0}) {
        double wantX = 0, wantY = 0, x = 0, y = 0;
        grid.PixelToMap(sample, line, wantX, wantY);
        read.geoRef->PixelToMap(sample, line, x, y);
        EXPECT_NEAR(x, wantX, 1e-6);
        EXPECT_NEAR(y, wantY, 1e-6);
      }
    }
    EXPECT_TRUE(read.geoRef->CoordinateSystem().IsEqual(grid.CoordinateSystem()));
    EXPECT_EQ(read.noData, def.noData);
    const auto reader = ReaderOf<std::uint8_t>(again);
    ASSERT_TRUE(block.Read(*reader));
    std::size_t at = 0;
    test::VisitBlock(read.interleave, block.rect, block.bands,
                     [&](unsigned, unsigned, unsigned band) {
                       const bool isNoData = block.pixels[at] == (c.byBand ? band + 7 : 7);
                       ASSERT_EQ(block.state[at] != 0, isNoData) << at;
                       ++at;
                     });
  }
}

TEST(GdalCreation, KeepsNoDataOf64BitsAndNaN) {
  test::TemporaryDirectory directory;
  const struct {
    unsigned type, bands;
    double values[2];
  } cases[] = {{14, 1, {-5}},
               {15, 2, {7, 9}},
               {5, 2, {std::nan(""), 1.5}},
               {4, 1, {-3.4028234663852886e38}},
               {14, 1, {1e300}}};
  for (const auto& c : cases) {
    SCOPED_TRACE(DataTypeName(c.type).ToUTF8() + " " + std::to_string(c.values[0]));
    const std::string path = (directory.Path() / (std::to_string(&c - cases) + ".tif")).string();
    RasterDef def = MakeDef("TIFF", c.type, c.bands);
    for (unsigned band = 0; band < c.bands; ++band) def.noData[band] = c.values[band];
    auto made = CreateSource({path}, def);
    ASSERT_TRUE(made) << TakeFault().ToUTF8();
    ASSERT_EQ(Release(made), "");
    const bool isPossible = c.values[0] != 1e300;
    const auto read = OpenSource({path})->RasterDef().noData;
    ASSERT_EQ(read.size(), isPossible ? c.bands : 0);
    for (const auto& [band, value] : read) {
      EXPECT_TRUE(test::SameValue(value, c.values[band])) << value;
    }
  }
}

/// Values that are given before the raster is let go.
TEST(GdalCreation, KeepsStatisticsHistogramsAndPalettes) {
  test::TemporaryDirectory directory;
  for (const char* const name : {"TIFF a.tif", "Erdas a.img", "PNG a.png", "GIF a.gif"}) {
    SCOPED_TRACE(name);
    const std::string format = std::string(name).substr(0, std::string(name).find(' '));
    const std::string path = (directory.Path() / (name + format.size() + 1)).string();
    const RasterDef def = MakeDef(format.c_str(), 1, 1);
    auto made = CreateSource({path}, def);
    ASSERT_TRUE(made) << TakeFault().ToUTF8();
    {
      const auto writer = ReaderOf<std::uint8_t>(made);
      Palette palette;
      for (unsigned i = 0; i < 256; ++i) {
        palette.Append(Color("any", static_cast<std::uint8_t>(i), 7, 9));
      }
      ASSERT_TRUE(writer->WritePalette(0, palette)) << TakeFault().ToUTF8();
      ASSERT_TRUE(WholeBlock<std::uint8_t>(def).Write(*writer)) << TakeFault().ToUTF8();
      Array<RasterBandStats<std::uint8_t>> stats{ArrayDims(1)};
      stats[0].mask = StatsMask::Basic;
      stats[0].max = 255;
      stats[0].mean = 100.0 / 3;
      ASSERT_TRUE(writer->WriteStats(stats)) << TakeFault().ToUTF8();
      Array<RasterBandHistogram<std::uint8_t>> histograms{ArrayDims(1)};
      histograms[0].source = StatsSource::kDynamic;
      histograms[0].binSize = 64;
      histograms[0].binCount = 4;
      histograms[0].max = 255;
      histograms[0].counts = Array<unsigned long long>{ArrayDims(4)};
      for (unsigned i = 0; i < 4; ++i) histograms[0].counts[i] = i + 3;
      ASSERT_TRUE(writer->WriteHistogram(histograms)) << TakeFault().ToUTF8();
    }
    ASSERT_EQ(Release(made), "");
    const auto again = OpenSource({path});
    const auto reader = ReaderOf<std::uint8_t>(again);
    ASSERT_TRUE(reader);
    Palette palette = reader->Palette(0);
    ASSERT_EQ(palette.GetCount(), 256U);
    EXPECT_EQ(+palette.At(200)->r, 200);
    EXPECT_EQ(+palette.At(200)->b, 9);
    ASSERT_TRUE(reader->StatsExist(0));
    EXPECT_EQ(reader->ReadStats(0).mean, 100.0 / 3);
    const auto histograms = reader->Histogram(0);
    ASSERT_EQ(histograms.GetCount(), 1U);
    EXPECT_EQ(histograms[0].max, 255);
    EXPECT_EQ(histograms[0].counts[3], 6U);
    Block<std::uint8_t> block = WholeBlock<std::uint8_t>(def);
    const auto want = block.pixels;
    ASSERT_TRUE(block.Read(*reader));
    EXPECT_EQ(block.pixels, want);
  }
}

TEST(GdalCreation, KeepsTheCamera) {
  RpcCoefficients rpc;
  rpc.lineOffset = 175.5, rpc.sampleOffset = 174.25;
  rpc.latitudeOffset = 41.8902, rpc.longitudeOffset = 12.5632, rpc.heightOffset = 95;
  rpc.lineScale = 176, rpc.sampleScale = 175;
  rpc.latitudeScale = 0.0026, rpc.longitudeScale = 0.0031, rpc.heightScale = 500;
  for (std::size_t i = 0; i < RpcCoefficients::kTerms; ++i) {
    const double tail = 1e-4 / static_cast<double>(i + 3);
    rpc.lineNumerator[i] = i == 2 ? -0.98 : tail;
    rpc.sampleNumerator[i] = i == 1 ? 1.01 : -tail;
    rpc.lineDenominator[i] = rpc.sampleDenominator[i] = i == 0 ? 1 : tail / 10;
  }
  RpcGeoRef camera;
  camera.SetCoefficients(rpc);
  camera.SetSubset(20, 30, 0.5, 0.5);
  StdRpcGeoRef both;
  both.SetPixelSize(0.0001, 0.0001);
  both.SetTieMap(12.56, 41.9);
  both.SetCoordinateSystem(test::MakeCoordSys("EPSG:4326"));
  both.SetRpc(camera);
  test::TemporaryDirectory directory;
  for (const GeoRef* const model :
       {static_cast<const GeoRef*>(&camera), static_cast<const GeoRef*>(&both)}) {
    for (const char* const name : {"TIFF camera.tif", "NITF camera.ntf", "PNG camera.png"}) {
      SCOPED_TRACE(name + std::to_string(model->GetType()));
      const std::string format = std::string(name).substr(0, std::string(name).find(' '));
      const std::string path =
          (directory.Path() / (std::to_string(model->GetType()) + "." + format)).string();
      RasterDef def = MakeDef(format.c_str(), 1, 1);
      def.geoRef = GeoRefPtr(model->Clone());
      auto made = CreateSource({path}, def);
      ASSERT_TRUE(made) << TakeFault().ToUTF8();
      ASSERT_EQ(Release(made), "");
      const GeoRefPtr read = OpenSource({path})->RasterDef().geoRef;
      ASSERT_TRUE(read);
      ASSERT_EQ(read->GetType(), model->GetType());
      const auto* const readBoth = dynamic_cast<const StdRpcGeoRef*>(read.Get());
      const GeoRef& readCamera =
          readBoth != nullptr ? static_cast<const GeoRef&>(readBoth->Rpc()) : *read;
      for (const auto& ground :
           {std::array{12.5632, 41.8902, 95.0}, std::array{12.5645, 41.8913, 300.0}}) {
        Array<double> want{ArrayDims(1, 3)}, got{ArrayDims(1, 3)};
        std::copy(ground.begin(), ground.end(), want.begin());
        std::copy(ground.begin(), ground.end(), got.begin());
        ASSERT_TRUE(camera.MapToPixel(want));
        ASSERT_TRUE(readCamera.MapToPixel(got));
        EXPECT_NEAR(got[0], want[0], 1e-6);
        EXPECT_NEAR(got[1], want[1], 1e-6);
      }
    }
  }
}

}  // namespace
}  // namespace lumo
