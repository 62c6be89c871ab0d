#include <array>
#include <cmath>
#include <filesystem>
#include <gdal_alg.h>
#include <random>
#include <set>
#include <thread>

#include "gdal_peer.h"
#include "georef/rpc_georef.h"
#include "support/sample_data.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

using test::Block;
using test::OpenSource;
using test::Peer;
using test::ReaderOf;

/// Every raster of the sample data.
std::vector<std::string> SampleRasters() {
  std::vector<std::string> paths;
  for (const auto& entry : std::filesystem::directory_iterator(test::SampleData("."))) {
    const std::string extension = entry.path().extension().string();
    if (extension == ".tif" || extension == ".img" || extension == ".jpg" || extension == ".png") {
      paths.push_back(entry.path().string());
    }
  }
  std::sort(paths.begin(), paths.end());
  return paths;
}

/// All bands of a level as GDAL gives them.
struct PeerLevel {
  PeerLevel(const Peer& peer, int overview) {
    for (unsigned band = 0; band < peer.Bands(); ++band) {
      pixels.push_back(Peer::Pixels(peer.Band(band, overview)));
      masks.push_back(Peer::Mask(peer.Band(band, overview)));
    }
  }
  std::vector<std::vector<std::complex<double>>> pixels;
  std::vector<std::vector<unsigned char>> masks;
};

template <typename T>
void ExpectPeersBlock(RasterReader<T>& reader, const PeerLevel& want, unsigned level,
                      Block<T> block) {
  const std::size_t count = std::size_t{block.rect.Width()} * block.rect.Height();
  block.pixels.assign(count * block.bands.size(), T{});
  block.state.assign(count * block.bands.size(), 0);
  ASSERT_TRUE(reader.ReadPixels(block.rect.left, block.rect.top, block.rect.Width(),
                                block.rect.Height(), block.BandArray(), level, block.pixels.data(),
                                block.state.data()))
      << TakeFault().ToUTF8();
  const std::size_t samples = reader.Samples(level);
  std::size_t at = 0, wrongPixels = 0, wrongStates = 0;
  test::VisitBlock(reader.RasterDef().interleave, block.rect, block.bands,
                   [&](unsigned sample, unsigned line, unsigned band) {
                     const std::size_t place = line * samples + sample;
                     const auto got = test::AsComplex(block.pixels[at]);
                     if (!test::SameValue(got, want.pixels[band][place])) ++wrongPixels;
                     const bool counts = (block.state[at] & PixelValueState::NotValid) == 0;
                     if (counts != (want.masks[band][place] != 0)) ++wrongStates;
                     ++at;
                   });
  EXPECT_EQ(wrongPixels, 0U);
  EXPECT_EQ(wrongStates, 0U);
}

/// The whole raster, and blocks at its edges with bands out of order and one twice.
template <typename T>
void ExpectPeersLevel(RasterReader<T>& reader, const Peer& peer, unsigned level, int overview) {
  const unsigned right = reader.Samples(level) - 1, bottom = reader.Lines(level) - 1;
  std::vector<unsigned> all;
  for (unsigned band = 0; band < peer.Bands(); ++band) all.push_back(band);
  std::vector<unsigned> mixed(all.rbegin(), all.rend());
  mixed.push_back(0);
  const struct {
    const char* name;
    SubRect rect;
    std::vector<unsigned> bands;
  } blocks[] = {
      {"all", {0, 0, right, bottom}, all},
      {"lower right corner, bands mixed", {right / 2, bottom - bottom / 3, right, bottom}, mixed},
      {"last pixel, one band", {right, bottom, right, bottom}, {all.back()}},
  };
  const PeerLevel want(peer, overview);
  for (const auto& b : blocks) {
    SCOPED_TRACE(b.name);
    ExpectPeersBlock(reader, want, level, Block<T>{b.rect, b.bands, {}, {}});
  }
}

TEST(GdalReading, GivesThePixelsAndMasksThatGdalGives) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const auto paths = SampleRasters();
  ASSERT_GE(paths.size(), 20U);
  for (const std::string& path : paths) {
    SCOPED_TRACE(path);
    const auto source = OpenSource({path});
    ASSERT_TRUE(source) << TakeFault().ToUTF8();
    const Peer peer(path);
    const bool hasType = test::WithType(source, [&]<typename T>(RasterReader<T>& reader) {
      ExpectPeersLevel(reader, peer, 0, -1);
    });
    EXPECT_TRUE(hasType);
  }
}

TEST(GdalReading, TellsWhatTheFileIs) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const struct {
    const char* file;
    const char* format;
    unsigned samples, lines, bands, dataType, tileWidth, tileHeight;
    Interleave interleave;
  } cases[] = {
      {"landsat7_olinda.tif", "TIFF", 349, 352, 6, 1, 349, 1, Interleave::BIP},
      {"landsat7_u16_tiled.tif", "TIFF", 349, 352, 6, 12, 64, 64, Interleave::BSQ},
      {"landsat7_f32_strip.tif", "TIFF", 349, 352, 3, 4, 349, 1, Interleave::BIP},
      {"RGB.byte.tif", "TIFF", 791, 718, 3, 1, 791, 1, Interleave::BIP},
      {"dem_int16.tif", "TIFF", 111, 111, 1, 2, 111, 1, Interleave::BSQ},
      {"complex64.tif", "TIFF", 150, 120, 1, 6, 150, 1, Interleave::BSQ},
      {"complex128.tif", "TIFF", 150, 120, 1, 9, 150, 1, Interleave::BSQ},
      {"landsat7.img", "Erdas", 349, 352, 6, 1, 64, 64, Interleave::BSQ},
      {"landsat7_rgb.png", "PNG", 349, 352, 3, 1, 349, 1, Interleave::BIP},
      {"landsat7_rgb.jpg", "JPEG", 349, 352, 3, 1, 349, 1, Interleave::BIP},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.file);
    const auto source = OpenSource({test::SampleData(c.file)});
    ASSERT_TRUE(source) << TakeFault().ToUTF8();
    const RasterDef def = source->RasterDef();
    EXPECT_EQ(def.format.ToUTF8(), c.format);
    EXPECT_EQ(def.samples, c.samples);
    EXPECT_EQ(def.lines, c.lines);
    EXPECT_EQ(def.bands, c.bands);
    EXPECT_EQ(def.dataType, c.dataType);
    EXPECT_EQ(def.tileWidth, c.tileWidth);
    EXPECT_EQ(def.tileHeight, c.tileHeight);
    EXPECT_EQ(def.interleave, c.interleave);
    EXPECT_EQ(source->DataType(), static_cast<int>(c.dataType));
    EXPECT_EQ(source->URI().ToUTF8(), std::filesystem::canonical(test::SampleData(c.file)));
  }
}

TEST(GdalReading, PutsTheCornersWhereGdalPutsThem) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  for (const std::string& path : SampleRasters()) {
    SCOPED_TRACE(path);
    const Peer peer(path);
    double transform[6];
    const bool hasGrid = GDALGetGeoTransform(peer.Dataset(), transform) == CE_None;
    const GeoRefPtr model = OpenSource({path})->RasterDef().geoRef;
    if (!hasGrid) {
      EXPECT_TRUE(!model || model->GetType() == GeoRef::kRpc);
      continue;
    }
    ASSERT_TRUE(model);
    const double width = GDALGetRasterXSize(peer.Dataset());
    const double height = GDALGetRasterYSize(peer.Dataset());
    const double pixel = std::hypot(transform[1], transform[4]);
    for (const double sample : {0.0, width}) {
      for (const double line : {0.0, height}) {
        double wantX = 0, wantY = 0, x = 0, y = 0;
        GDALApplyGeoTransform(transform, sample, line, &wantX, &wantY);
        ASSERT_TRUE(model->PixelToMap(sample, line, x, y));
        EXPECT_NEAR(x, wantX, pixel * 1e-6);
        EXPECT_NEAR(y, wantY, pixel * 1e-6);
      }
    }
    EXPECT_EQ(model->CoordinateSystem().IsEmpty(), GDALGetSpatialRef(peer.Dataset()) == nullptr);
  }
}

TEST(GdalReading, ReadsCoordinateSystemsInAllDialects) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const struct {
    const char* file;
    int type;
    const char* code;
  } cases[] = {{"RGB.byte.tif", 2, "EPSG:32618"},
               {"landsat7_olinda.tif", 2, "EPSG:31985"},
               {"test_esri_wkt.tif", 2, "ESRI:102039"}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.file);
    const GeoRefPtr model = OpenSource({test::SampleData(c.file)})->RasterDef().geoRef;
    ASSERT_TRUE(model);
    EXPECT_EQ(model->CoordinateSystem().Type(), c.type);
    CoordSys want;
    ASSERT_TRUE(want.SetFromString(c.code));
    EXPECT_TRUE(model->CoordinateSystem().IsEqual(want));
  }
}

TEST(GdalReading, ReadsTheCamera) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const std::string path = test::SampleData("rpc_scene.tif");
  const GeoRefPtr model = OpenSource({path})->RasterDef().geoRef;
  ASSERT_TRUE(model);
  ASSERT_EQ(model->GetType(), static_cast<unsigned>(GeoRef::kRpc));
  const Peer peer(path);
  GDALRPCInfoV2 info;
  ASSERT_TRUE(GDALExtractRPCInfoV2(GDALGetMetadata(peer.Dataset(), "RPC"), &info));
  void* const transformer = GDALCreateRPCTransformerV2(&info, FALSE, 0.1, nullptr);
  for (const auto& ground :
       {std::array{12.5632, 41.8902, 95.0}, std::array{12.5685, 41.8893, 300.0},
        std::array{12.5633, 41.8855, 0.0}}) {
    auto [x, y, z] = ground;
    int success = 0;
    GDALRPCTransform(transformer, TRUE, 1, &x, &y, &z, &success);
    ASSERT_TRUE(success);
    Array<double> point{ArrayDims(1, 3)};
    std::copy(ground.begin(), ground.end(), point.begin());
    ASSERT_TRUE(model->MapToPixel(point));
    EXPECT_NEAR(point[0], x - 0.5, 1e-6);  // GDAL's pixels count from their corner
    EXPECT_NEAR(point[1], y - 0.5, 1e-6);
  }
  GDALDestroyRPCTransformer(transformer);
}

TEST(GdalReading, ReadsTheLevelsThatTheFileHolds) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const std::string path = test::SampleData("landsat7_olinda.tif");
  const auto source = OpenSource({"TIFF", path});
  const auto reader = ReaderOf<std::uint8_t>(source);
  ASSERT_TRUE(reader);
  ASSERT_TRUE(reader->PyramidExists());
  EXPECT_EQ(reader->PyramidType(), static_cast<int>(PyramidType::kDriver));
  EXPECT_EQ(reader->PyramidLevelMin(), 1);
  const Peer peer(path);
  const int overviews = GDALGetOverviewCount(peer.Band(0));
  ASSERT_GE(overviews, 1);
  EXPECT_EQ(reader->PyramidLevelMax(), overviews);
  for (int i = 0; i < overviews; ++i) {
    const auto level = static_cast<unsigned>(i + 1);
    EXPECT_EQ(reader->Samples(level), (349U + (1U << level) - 1) >> level);
    EXPECT_EQ(reader->Lines(level), (352U + (1U << level) - 1) >> level);
    ExpectPeersLevel(*reader, peer, level, i);
  }
  EXPECT_EQ(reader->Samples(static_cast<unsigned>(overviews) + 1), 0U);
}

TEST(GdalReading, OpensOneRasterOfSeveralInAFile) {
  const test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "pages.tif").string();
  GDALAllRegister();
  for (int page = 1; page <= 2; ++page) {
    const char* const options[] = {page > 1 ? "APPEND_SUBDATASET=YES" : nullptr, nullptr};
    GDALDatasetH const empty =
        GDALCreate(GDALGetDriverByName("MEM"), "", 10 * page, 5, 1, GDT_Byte, nullptr);
    GDALClose(GDALCreateCopy(GDALGetDriverByName("GTiff"), path.c_str(), empty, FALSE,
                             const_cast<char**>(options), nullptr, nullptr));
    GDALClose(empty);
  }
  const struct {
    std::vector<std::string> pieces;
    unsigned samples;  // 0: not opened
  } cases[] = {{{path}, 10},
               {{path, "SUBDATASET=2"}, 20},
               {{"TIFF", path, "SUBDATASET=1"}, 10},
               {{path, "SUBDATASET=GTIFF_DIR:2:" + path}, 20},
               {{path, "SUBDATASET=3"}, 0},
               {{path, "second"}, 0}};
  std::set<std::string> identifiers;
  for (const auto& c : cases) {
    SCOPED_TRACE(c.pieces.back());
    TakeFault();
    const auto source = OpenSource(c.pieces);
    ASSERT_EQ(bool(source), c.samples != 0);
    if (source) {
      EXPECT_EQ(source->RasterDef().samples, c.samples);
      identifiers.insert(source->URI().ToUTF8());
    } else {
      EXPECT_NE(TakeFault().GetLength(), 0U);
    }
  }
  EXPECT_EQ(identifiers.size(), 4U);
}

/// Several readers of one connection, and several connections on one file.
TEST(GdalReading, ServesManyThreadsAtOnce) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  const std::string path = test::SampleData("landsat7_u16_tiled.tif");
  const auto shared = OpenSource({path});
  const auto want = [&] {
    Block<std::uint16_t> block{{0, 0, 348, 351}, {5, 0}, {}, {}};
    EXPECT_TRUE(block.Read(*ReaderOf<std::uint16_t>(shared)));
    return block.pixels;
  }();
  std::vector<std::jthread> threads;
  std::atomic<int> wrong{0};
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&, t] {
      const auto source = t % 2 == 0 ? shared : OpenSource({path});
      for (int i = 0; i < 10; ++i) {
        Block<std::uint16_t> block{{0, 0, 348, 351}, {5, 0}, {}, {}};
        if (!block.Read(*ReaderOf<std::uint16_t>(source)) || block.pixels != want) ++wrong;
      }
    });
  }
  threads.clear();
  EXPECT_EQ(wrong, 0);
}

/// Blocks that several handles decode at once: in the order of the file, as statistics ask for
/// them, and anywhere; of sides that are no multiples of the blocks.
TEST(GdalReading, SeveralHandlesGiveTheSamePixels) {
  const test::TemporaryDirectory directory;
  constexpr int kWidth = 700, kHeight = 413, kBands = 3;
  const struct {
    const char* driver;
    GDALDataType type;
    std::vector<std::string> options;
  } files[] = {
      {"JP2OpenJPEG",
       GDT_UInt16,
       {"BLOCKXSIZE=128", "BLOCKYSIZE=128", "QUALITY=100", "REVERSIBLE=YES"}},
      {"GTiff", GDT_Byte, {"COMPRESS=PACKBITS", "TILED=YES", "BLOCKXSIZE=128", "BLOCKYSIZE=128"}},
      {"GTiff", GDT_UInt16, {"COMPRESS=DEFLATE", "INTERLEAVE=BAND", "ENDIANNESS=BIG"}},
      {"GTiff", GDT_Int16, {"COMPRESS=LZW", "INTERLEAVE=PIXEL", "ENDIANNESS=BIG", "BLOCKYSIZE=20"}},
  };
  std::mt19937 random(9);
  for (const auto& file : files) {
    SCOPED_TRACE(file.driver + file.options.front());
    const std::string path = (directory.Path() / (file.driver + file.options.front())).string();
    {
      GDALAllRegister();
      const std::unique_ptr<void, decltype(&GDALClose)> memory(
          GDALCreate(GDALGetDriverByName("MEM"), "", kWidth, kHeight, kBands, file.type, nullptr),
          &GDALClose);
      std::vector<unsigned short> values(std::size_t{kWidth} * kHeight);
      for (int band = 1; band <= kBands; ++band) {
        for (unsigned short& value : values) value = static_cast<unsigned short>(random() % 250);
        ASSERT_EQ(GDALRasterIO(GDALGetRasterBand(memory.get(), band), GF_Write, 0, 0, kWidth,
                               kHeight, values.data(), kWidth, kHeight, GDT_UInt16, 0, 0),
                  CE_None);
      }
      CPLStringList options;
      for (const std::string& option : file.options) options.AddString(option.c_str());
      GDALClose(GDALCreateCopy(GDALGetDriverByName(file.driver), path.c_str(), memory.get(), FALSE,
                               options.List(), nullptr, nullptr));
    }
    const Peer peer(path);
    ASSERT_TRUE(peer);
    const PeerLevel want(peer, -1);
    const auto source = OpenSource({path});
    const bool hasType = test::WithType(source, [&]<typename T>(RasterReader<T>& reader) {
      for (const unsigned side : {128U, 300U}) {
        for (unsigned top = 0; top < kHeight; top += side) {
          for (unsigned left = 0; left < kWidth; left += side) {
            const unsigned right = std::min(left + side, 700U), bottom = std::min(top + side, 413U);
            ExpectPeersBlock(reader, want, 0,
                             Block<T>{{left, top, right - 1, bottom - 1}, {0, 1, 2}, {}, {}});
          }
        }
      }
      for (int i = 0; i < 30; ++i) {
        const unsigned left = random() % 500, top = random() % 250;
        const unsigned right = left + 130 + random() % 70, bottom = top + 126 + random() % 36;
        ExpectPeersBlock(reader, want, 0, Block<T>{{left, top, right, bottom}, {2, 0}, {}, {}});
      }
    });
    EXPECT_TRUE(hasType);
  }
}

}  // namespace
}  // namespace lumo
