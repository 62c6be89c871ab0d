#include <fstream>
#include <thread>

#include "plugins_gdal/tiff_comparison.h"
#include "support/sample_data.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::ExpectSame;
using test::GdalFactory;
using test::IsOwn;
using test::Layout;
using test::Make;
using test::OpenBy;

TEST(OwnTiff, IsReadAsGdalReadsIt) {
  const test::TemporaryDirectory directory;
  const std::vector<std::vector<std::string>> blocks = {
      {"TILED=YES", "BLOCKXSIZE=64", "BLOCKYSIZE=32"}, {"BLOCKYSIZE=7"}, {"BLOCKYSIZE=149"}};
  const std::vector<std::pair<const char*, std::vector<int>>> codecs = {
      {"NONE", {1}}, {"DEFLATE", {1, 2, 3}}, {"LZW", {1, 2, 3}}, {"ZSTD", {1, 2, 3}}};
  int number = 0;
  for (const GDALDataType type :
       {GDT_Byte, GDT_UInt16, GDT_Int16, GDT_UInt32, GDT_Int32, GDT_Float32, GDT_Float64}) {
    for (const auto& block : blocks) {
      for (const auto& [codec, predictors] : codecs) {
        for (const int predictor : predictors) {
          const bool isFloat = type == GDT_Float32 || type == GDT_Float64;
          if ((predictor == 3) != isFloat && predictor != 1) continue;
          Layout layout{type, block, number % 4 == 3 ? 1U : 3U};
          layout.options.push_back(std::string("COMPRESS=").append(codec));
          if (predictor != 1) layout.options.push_back("PREDICTOR=" + std::to_string(predictor));
          layout.options.emplace_back(number % 2 == 0 ? "INTERLEAVE=PIXEL" : "INTERLEAVE=BAND");
          layout.options.emplace_back(number % 5 == 0 ? "BIGTIFF=YES" : "BIGTIFF=NO");
          layout.options.emplace_back("PHOTOMETRIC=MINISBLACK");
          const char* const noData[] = {nullptr, "7", "-9999", "1e300", "nan"};
          // Left to GDAL: no-data values of doubles, and those beyond what a float can hold.
          const bool isBeyond = type == GDT_Float32 && number % 5 == 3;
          if (type != GDT_Float64 && !isBeyond) layout.noData = noData[number % 5];
          const int systems[] = {32633, 4326, 0, 3857, 31985, 2056};
          layout.epsg = systems[number % 6];
          layout.hasLevels = number % 3 == 0;
          const std::string path =
              (directory.Path() / ("s" + std::to_string(number) + "x.tif")).string();
          Make(path, layout, number);
          EXPECT_TRUE(ExpectSame(path)) << "GDAL had to read it";
          ++number;
        }
      }
    }
  }
  EXPECT_GT(number, 100);
}

/// Masks in strips and tiles, of levels and of cloud-optimised files, beside no-data values.
TEST(OwnTiff, MasksExcludeWhatTheyDoForGdal) {
  const test::TemporaryDirectory directory;
  const auto path = [&](const std::string& name) { return (directory.Path() / name).string(); };
  int number = 0;
  for (const std::vector<std::string>& block :
       {std::vector<std::string>{"TILED=YES", "BLOCKXSIZE=64", "BLOCKYSIZE=32"},
        {"TILED=YES", "BLOCKXSIZE=16", "BLOCKYSIZE=16", "COMPRESS=DEFLATE"},
        {"BLOCKYSIZE=7", "COMPRESS=ZSTD"},
        {"BLOCKYSIZE=149", "COMPRESS=LZW", "INTERLEAVE=BAND"}}) {
    for (const GDALDataType type : {GDT_Byte, GDT_Float32}) {
      Layout layout{type, block};
      layout.options.emplace_back("PHOTOMETRIC=MINISBLACK");
      layout.hasMask = true;
      layout.hasLevels = number % 2 == 0;
      layout.noData = number % 3 == 0 ? "7" : nullptr;
      const std::string plain = path("m" + std::to_string(number) + "x.tif");
      Make(plain, layout, number);
      EXPECT_TRUE(ExpectSame(plain)) << "GDAL had to read it";
      const std::string cog = path("c" + std::to_string(number++) + "x.tif");
      const char* const options[] = {"BLOCKSIZE=128", "COMPRESS=DEFLATE", nullptr};
      GDALDatasetH const source = GDALOpen(plain.c_str(), GA_ReadOnly);
      GDALClose(GDALCreateCopy(GDALGetDriverByName("COG"), cog.c_str(), source, FALSE,
                               const_cast<char**>(options), nullptr, nullptr));
      GDALClose(source);
      EXPECT_TRUE(ExpectSame(cog)) << "GDAL had to read it";
    }
  }
}

/// JPEG in its forms; the bands of each are grey, or colours that may be stored as such or not.
TEST(OwnTiff, JpegIsDecodedAsByGdal) {
  const test::TemporaryDirectory directory;
  const std::vector<std::vector<std::string>> blocks = {
      {"TILED=YES", "BLOCKXSIZE=64", "BLOCKYSIZE=32"}, {"BLOCKYSIZE=16"}, {"BLOCKYSIZE=149"}};
  const std::vector<std::pair<unsigned, std::vector<std::string>>> forms = {
      {1, {}},
      {3, {"PHOTOMETRIC=YCBCR"}},
      {3, {"PHOTOMETRIC=RGB"}},
      {3, {"PHOTOMETRIC=MINISBLACK"}},
      {5, {"INTERLEAVE=BAND", "PHOTOMETRIC=MINISBLACK"}},
      {3, {"INTERLEAVE=BAND", "PHOTOMETRIC=RGB"}}};
  int number = 0;
  for (const auto& block : blocks) {
    for (const auto& [bands, options] : forms) {
      for (const char* const quality : {"JPEG_QUALITY=75", "JPEG_QUALITY=23", "JPEG_QUALITY=100"}) {
        Layout layout{GDT_Byte, block, bands};
        layout.options.insert(layout.options.end(), options.begin(), options.end());
        layout.options.insert(layout.options.end(), {"COMPRESS=JPEG", quality});
        layout.hasLevels = number % 3 == 0;
        layout.noData = number % 4 == 1 ? "7" : nullptr;
        const std::string path =
            (directory.Path() / ("j" + std::to_string(number++) + "x.tif")).string();
        Make(path, layout, number);
        EXPECT_TRUE(ExpectSame(path))
            << "GDAL had to read it: " << number << " " << bands << " " << quality;
      }
    }
  }
}

/// Alpha bands mask the others, unless these have no-data values; levels have them too.
TEST(OwnTiff, AlphaBandsAreThoseOfGdal) {
  const test::TemporaryDirectory directory;
  const std::vector<std::vector<std::string>> blocks = {
      {"TILED=YES", "BLOCKXSIZE=64", "BLOCKYSIZE=32", "COMPRESS=DEFLATE"}, {"BLOCKYSIZE=7"}};
  int number = 0;
  for (const GDALDataType type : {GDT_Byte, GDT_UInt16}) {
    for (const auto& block : blocks) {
      for (const char* const alpha : {"ALPHA=YES", "ALPHA=PREMULTIPLIED"}) {
        for (const char* const order : {"INTERLEAVE=PIXEL", "INTERLEAVE=BAND"}) {
          for (const unsigned bands : {4U, 2U}) {
            Layout layout{type, block, bands};
            layout.options.insert(
                layout.options.end(),
                {alpha, order, bands == 4 ? "PHOTOMETRIC=RGB" : "PHOTOMETRIC=MINISBLACK"});
            layout.hasLevels = number % 3 == 0;
            layout.noData = number % 5 == 4 ? "7" : nullptr;
            const std::string path =
                (directory.Path() / ("a" + std::to_string(number++) + "x.tif")).string();
            Make(path, layout, number);
            EXPECT_TRUE(ExpectSame(path)) << "GDAL had to read it: " << alpha << order << bands;
          }
        }
      }
    }
  }
}

TEST(OwnTiff, PalettesAreThoseOfGdal) {
  const test::TemporaryDirectory directory;
  for (int number = 0; number < 6; ++number) {
    const std::string path = (directory.Path() / ("p" + std::to_string(number) + "x.tif")).string();
    Layout layout{GDT_Byte, {"PHOTOMETRIC=PALETTE"}, 1};
    if (number % 2 == 0) layout.options.insert(layout.options.end(), {"TILED=YES", "COMPRESS=LZW"});
    layout.noData = number % 3 == 1 ? "7" : nullptr;
    layout.hasLevels = number % 3 == 2;
    layout.changeNew = [&](GDALDatasetH file) {
      GDALColorTableH const table = GDALCreateColorTable(GPI_RGB);
      for (short i = 0; i < (number == 5 ? 30 : 256); ++i) {
        const GDALColorEntry entry{i, static_cast<short>(255 - i), static_cast<short>(i * 7 % 256),
                                   255};
        GDALSetColorEntry(table, i, &entry);
      }
      EXPECT_EQ(GDALSetRasterColorTable(GDALGetRasterBand(file, 1), table), CE_None);
      GDALDestroyColorTable(table);
    };
    Make(path, layout, number);
    EXPECT_TRUE(ExpectSame(path)) << "GDAL had to read it: " << number;
  }
  // Colours of which all parts are small are in another range, as GDAL guesses.
  const std::string dark = (directory.Path() / "darkx.tif").string();
  Layout layout{GDT_Byte, {"PHOTOMETRIC=PALETTE"}, 1};
  layout.changeNew = [](GDALDatasetH file) {
    GDALColorTableH const table = GDALCreateColorTable(GPI_RGB);
    const GDALColorEntry entry{0, 0, 0, 255};
    GDALSetColorEntry(table, 0, &entry);
    GDALSetRasterColorTable(GDALGetRasterBand(file, 1), table);
    GDALDestroyColorTable(table);
  };
  Make(dark, layout, 1);
  EXPECT_FALSE(ExpectSame(dark));
}

/// Systems of all kinds: in feet and degrees, with other meridians, withdrawn ones.
TEST(OwnTiff, SystemsOfTheRegistryAreThoseOfGdal) {
  GDALAllRegister();
  const test::TemporaryDirectory directory;
  unsigned own = 0, all = 0;
  for (int code = 2000; code < 32767; code += code < 5000 ? 41 : 97) {
    const std::string path = (directory.Path() / ("c" + std::to_string(code) + "x.tif")).string();
    {
      OGRSpatialReferenceH const system = OSRNewSpatialReference(nullptr);
      CPLPushErrorHandler(CPLQuietErrorHandler);
      if (OSRImportFromEPSG(system, code) == OGRERR_NONE &&
          (OSRIsProjected(system) != 0 || OSRIsGeographic(system) != 0)) {
        GDALDatasetH const file =
            GDALCreate(GDALGetDriverByName("GTiff"), path.c_str(), 3, 2, 1, GDT_Byte, nullptr);
        double grid[] = {100, 1, 0, 50, 0, -1};
        GDALSetGeoTransform(file, grid);
        GDALSetSpatialRef(file, system);
        GDALClose(file);
      }
      CPLPopErrorHandler();
      OSRRelease(system);
    }
    if (!fs::exists(path)) continue;
    own += ExpectSame(path) ? 1 : 0;
    ++all;
    fs::remove(path);
  }
  EXPECT_GT(all, 80U);
  EXPECT_GT(own, all / 3);
}

TEST(OwnTiff, LeavesToGdalWhatItDoesNotKnow) {
  const test::TemporaryDirectory directory;
  const auto path = [&](const char* name) { return (directory.Path() / name).string(); };
  const auto isOwn = [&](const char* name, const Layout& layout) {
    Make(path(name), layout, 1);
    return ExpectSame(path(name));
  };
  EXPECT_FALSE(isOwn("cmyk.tif", {GDT_Byte, {"COMPRESS=JPEG", "PHOTOMETRIC=CMYK"}, 4}));
  EXPECT_FALSE(isOwn("packed.tif", {GDT_Byte, {"COMPRESS=PACKBITS"}}));
  EXPECT_FALSE(isOwn("bits.tif", {GDT_Byte, {"NBITS=4"}}));
  EXPECT_FALSE(isOwn("signed.tif", {GDT_Byte, {"PIXELTYPE=SIGNEDBYTE"}, 1}));
  EXPECT_FALSE(isOwn("alpha-of-five.tif", {GDT_Byte, {"ALPHA=YES"}, 5}));
  EXPECT_FALSE(isOwn("first-alpha.tif", {GDT_Byte, {"ALPHA=YES", "PHOTOMETRIC=MINISBLACK"}, 4}));
  EXPECT_FALSE(isOwn("float-alpha.tif", {GDT_Float32, {"ALPHA=YES"}, 4}));
  EXPECT_FALSE(isOwn("complex.tif", {GDT_CFloat32, {}, 1}));
  EXPECT_FALSE(isOwn("other-end.tif", {GDT_UInt16, {"ENDIANNESS=BIG"}}));
  EXPECT_FALSE(isOwn("white.tif", {GDT_Byte, {"PHOTOMETRIC=MINISWHITE"}, 1}));
  EXPECT_FALSE(isOwn("sparse.tif", {GDT_UInt64, {}, 1, 32633, "5"}));
  EXPECT_TRUE(isOwn("colours.tif", {GDT_Byte, {"PHOTOMETRIC=RGB"}}));
  // Files beside a file may change what it is.
  for (const char* const beside : {"plain.tif.aux.xml", "plain.tfw", "PLAIN.TFW", "plain.tif.ovr",
                                   "plain.tif.msk", "plain_rpc.txt", "plain.IMD", "pla_MTL.txt"}) {
    SCOPED_TRACE(beside);
    Make(path("plain.tif"), {GDT_Byte, {}}, 2);
    const auto opened = [&] {
      const RasterDataConnectionPtr file = OpenBy(*FactoryForFormat("TIFF"), path("plain.tif"));
      return file && IsOwn(*file);
    };
    EXPECT_TRUE(opened());
    std::ofstream(path(beside)) << "0\n";
    EXPECT_FALSE(opened());
    fs::remove(path(beside));
  }
}

/// Reads all of a damaged file both ways.
template <typename T>
void ExpectSameOutcome(const RasterDataConnectionPtr& ours, const RasterDataConnectionPtr& theirs) {
  const RasterReaderPtr<T> own = test::ReaderOf<T>(ours), other = test::ReaderOf<T>(theirs);
  ASSERT_EQ(bool(own), bool(other));
  if (!own) return;
  Array<unsigned> bands{ArrayDims(other->Bands())};
  for (unsigned i = 0; i < bands.GetCount(); ++i) bands[i] = i;
  const std::size_t count = std::size_t{other->Samples(0)} * other->Lines(0) * bands.GetCount();
  if (count > 1 << 24) return;
  std::vector<T> a(count), b(count);
  std::vector<unsigned char> state(count);
  const bool isOurs =
      own->ReadPixels(0, 0, other->Samples(0), other->Lines(0), bands, 0, a.data(), state.data());
  const String ourRead = TakeFault();
  const bool isTheirs =
      other->ReadPixels(0, 0, other->Samples(0), other->Lines(0), bands, 0, b.data(), state.data());
  const String theirRead = TakeFault();
  EXPECT_EQ(isOurs, isTheirs) << ourRead.ToUTF8() << " / " << theirRead.ToUTF8();
  if (isOurs && isTheirs) {
    EXPECT_EQ(a, b);
  } else if (!isOurs && !isTheirs) {
    EXPECT_EQ(ourRead, theirRead);
  }
}

TEST(OwnTiff, DamageIsWhatGdalSaysOfIt) {
  const test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "damaged.tif").string();
  for (const char* const codec : {"NONE", "DEFLATE", "LZW", "ZSTD", "JPEG"}) {
    for (int seed = 0; seed < 12; ++seed) {
      const bool isJpeg = std::string(codec) == "JPEG";
      Make(
          path,
          {isJpeg ? GDT_Byte : GDT_UInt16,
           {std::string("COMPRESS=").append(codec), "TILED=YES", "BLOCKXSIZE=64", "BLOCKYSIZE=64"}},
          seed);
      const auto size = static_cast<unsigned>(fs::file_size(path));
      std::mt19937 random(static_cast<unsigned>(seed));
      if (seed % 3 == 0) {
        fs::resize_file(path, size / 2 + random() % (size / 2));
      } else {
        std::fstream file(path, std::ios::in | std::ios::out | std::ios::binary);
        for (int i = 0; i < 20; ++i) {
          file.seekp(static_cast<std::streamoff>(random() % size));
          file.put(static_cast<char>(random()));
        }
      }
      SCOPED_TRACE(std::string(codec) + " " + std::to_string(seed));
      const RasterDataConnectionPtr ours = OpenBy(*FactoryForFormat("TIFF"), path);
      const String ourFault = TakeFault();
      const RasterDataConnectionPtr theirs = OpenBy(GdalFactory(), path);
      const String theirFault = TakeFault();
      ASSERT_EQ(bool(ours), bool(theirs));
      EXPECT_EQ(ourFault, theirFault);
      if (isJpeg) {
        ExpectSameOutcome<std::uint8_t>(ours, theirs);
      } else {
        ExpectSameOutcome<std::uint16_t>(ours, theirs);
      }
    }
  }
}

TEST(OwnTiff, SamplesAreThoseOfGdal) {
  if (test::SampleData(".").empty()) GTEST_SKIP() << "no sample data";
  unsigned own = 0;
  for (const auto& entry : fs::recursive_directory_iterator(test::SampleData("."))) {
    if (entry.path().extension() == ".tif" && ExpectSame(entry.path().string())) ++own;
  }
  EXPECT_GE(own, 7U);
}

/// Threads with readers of their own and of others, on windows that lie anywhere, and on the whole
/// in between, which takes the blocks that are kept: the blocks of all files are in one cache, and
/// go with their file.
TEST(OwnTiff, WindowsOfManyThreadsDoNotMixFiles) {
  const test::TemporaryDirectory directory;
  constexpr int kFiles = 3;
  constexpr const char* kCompressions[kFiles] = {"COMPRESS=LZW", "COMPRESS=NONE", "COMPRESS=NONE"};
  std::vector<RasterDataConnectionPtr> shared;
  std::vector<std::vector<std::uint8_t>> want;
  const auto path = [&](int file) {
    return (directory.Path() / ("w" + std::to_string(file) + "x.tif")).string();
  };
  const auto read = [](RasterReader<std::uint8_t>& reader, const SubRect& rect) {
    test::Block<std::uint8_t> block{rect, {0, 1, 2}, {}, {}};
    EXPECT_TRUE(block.Read(reader));
    return block.pixels;
  };
  for (int file = 0; file < kFiles; ++file) {
    Make(path(file),
         {GDT_Byte,
          {"TILED=YES", "BLOCKXSIZE=32", "BLOCKYSIZE=32", kCompressions[file], "INTERLEAVE=PIXEL"}},
         100 + file);
    shared.push_back(test::OpenSource({path(file)}));
    const auto peer = OpenBy(GdalFactory(), path(file));
    want.push_back(read(*test::ReaderOf<std::uint8_t>(peer), {0, 0, 202, 148}));
  }
  std::vector<std::jthread> threads;
  std::atomic<int> wrong{0};
  for (unsigned t = 0; t < 6; ++t) {
    threads.emplace_back([&, t] {
      std::mt19937 random(t);
      for (int i = 0; i < 60; ++i) {
        const auto file = static_cast<std::size_t>(random() % kFiles);
        const auto source =
            i % 4 == 0 ? test::OpenSource({path(static_cast<int>(file))}) : shared[file];
        const unsigned left = random() % 150, top = random() % 100;
        const SubRect rect = i % 5 == 1
                                 ? SubRect(0, 0, 202, 148)
                                 : SubRect(left, top, left + random() % 53, top + random() % 49);
        const auto got = read(*test::ReaderOf<std::uint8_t>(source), rect);
        std::size_t at = 0;
        for (unsigned y = rect.top; y <= rect.bottom; ++y) {
          for (unsigned x = rect.left * 3; x < (rect.right + 1) * 3; ++x) {
            if (got[at++] != want[file][y * 203 * 3 + x]) ++wrong;
          }
        }
      }
    });
  }
  threads.clear();
  EXPECT_EQ(wrong, 0);
}

/// Requests beyond reading go to GDAL, and reads afterwards give what it changed.
TEST(OwnTiff, ChangesGoThroughGdal) {
  const test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "changed.tif").string();
  Make(path, {GDT_Byte, {"TILED=YES", "COMPRESS=DEFLATE"}, 1}, 3);
  const RasterDataConnectionPtr file = OpenBy(*FactoryForFormat("TIFF"), path);
  ASSERT_TRUE(file && IsOwn(*file));
  const RasterReaderPtr<std::uint8_t> reader = test::ReaderOf<std::uint8_t>(file);
  test::Block<std::uint8_t> block{{5, 6, 8, 7}, {0}, {}, {}};
  ASSERT_TRUE(block.Read(*reader));
  block.pixels = {1, 2, 3, 4, 5, 6, 7, 8};
  ASSERT_TRUE(block.Write(*reader)) << TakeFault().ToUTF8();
  test::Block<std::uint8_t> again{{5, 6, 8, 7}, {0}, {}, {}};
  ASSERT_TRUE(again.Read(*reader));
  EXPECT_EQ(again.pixels, block.pixels);
  EXPECT_TRUE(reader->PyramidBuild(1, 2, 0, TileDimensions{}));
  EXPECT_EQ(reader->PyramidLevelMax(), 2);
  EXPECT_EQ(reader->Samples(1), 102U);
}

}  // namespace
}  // namespace lumo
