#include <random>

#include "gdal_peer.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

using test::Block;
using test::Peer;

/// Makes a TIFF file of 700 by 600 pixels with these creation options, most of it filled.
void MakeTiff(const std::string& path, GDALDataType type, int bands,
              const std::vector<const char*>& options) {
  constexpr int kSamples = 700, kLines = 600, kFilled = 520;  // the rest stays sparse
  GDALAllRegister();
  std::vector<const char*> list(options);
  list.push_back("SPARSE_OK=YES");
  list.push_back(nullptr);
  GDALDatasetH const file = GDALCreate(GDALGetDriverByName("GTiff"), path.c_str(), kSamples, kLines,
                                       bands, type, const_cast<char**>(list.data()));
  ASSERT_NE(file, nullptr);
  std::mt19937 random(7);
  std::vector<double> line(kSamples);
  for (int band = 1; band <= bands; ++band) {
    for (int y = 0; y < kFilled; ++y) {
      for (int x = 0; x < kSamples; ++x) {
        line[static_cast<std::size_t>(x)] = (x / 3 + y + band * 17) % 200 + random() % 5;
      }
      ASSERT_EQ(GDALRasterIO(GDALGetRasterBand(file, band), GF_Write, 0, y, kSamples, 1,
                             line.data(), kSamples, 1, GDT_Float64, 0, 0),
                CE_None);
    }
  }
  GDALSetRasterNoDataValue(GDALGetRasterBand(file, 1), 42);
  GDALClose(file);
}

/// However a file is laid out and compressed, and by whichever way its blocks are read, its pixels
/// are those that GDAL gives by its plainest way.
TEST(GdalLayouts, AllGiveTheSamePixels) {
  const char* const compressions[] = {"COMPRESS=NONE", "COMPRESS=DEFLATE", "COMPRESS=LZW",
                                      "COMPRESS=ZSTD", "COMPRESS=PACKBITS"};
  const std::vector<const char*> layouts[] = {
      {"TILED=YES"},
      {"TILED=YES", "BLOCKXSIZE=512", "BLOCKYSIZE=512"},
      {"TILED=NO"},
      {"TILED=NO", "BLOCKYSIZE=130"},
  };
  const struct {
    GDALDataType type;
    int bands;
  } pixels[] = {{GDT_Byte, 3}, {GDT_UInt16, 4}, {GDT_Float32, 1}, {GDT_CFloat32, 2}};
  test::TemporaryDirectory directory;
  std::mt19937 random(11);
  int number = 0;
  for (const char* const compression : compressions) {
    for (const auto& layout : layouts) {
      for (const char* const interleave : {"INTERLEAVE=PIXEL", "INTERLEAVE=BAND"}) {
        const auto& pixel = pixels[number % 4];
        std::vector<const char*> options(layout);
        options.push_back(compression);
        options.push_back(interleave);
        if (number % 3 == 0 && pixel.type != GDT_CFloat32) options.push_back("PREDICTOR=2");
        const std::string path = (directory.Path() / (std::to_string(number++) + ".tif")).string();
        std::string trace = GDALGetDataTypeName(pixel.type);
        for (const char* const option : options) trace.append(" ").append(option);
        SCOPED_TRACE(trace);
        ASSERT_NO_FATAL_FAILURE(MakeTiff(path, pixel.type, pixel.bands, options));
        const Peer peer(path);
        std::vector<std::vector<std::complex<double>>> want;
        for (unsigned band = 0; band < peer.Bands(); ++band) {
          want.push_back(Peer::Pixels(peer.Band(band)));
        }
        const auto source = test::OpenSource({"TIFF", path});
        const auto compare = [&]<typename T>(RasterReader<T>& reader) {
          const RasterDef def = reader.RasterDef();
          for (int i = 0; i < 6; ++i) {
            SubRect rect(random() % 700, random() % 600, random() % 700, random() % 600);
            if (i == 0) rect = SubRect(0, 0, 699, 599);
            Block<T> block{rect, {}, {}, {}};
            const unsigned count = 1 + static_cast<unsigned>(random() % (peer.Bands() + 1));
            for (unsigned b = 0; b < count; ++b) block.bands.push_back(random() % peer.Bands());
            ASSERT_TRUE(block.Read(reader)) << TakeFault().ToUTF8();
            std::size_t at = 0, wrong = 0;
            test::VisitBlock(def.interleave, rect, block.bands,
                             [&](unsigned x, unsigned y, unsigned band) {
                               const auto& value = want[band][y * 700 + x];
                               const bool isNoData = value == 42.0;
                               if (test::AsComplex(block.pixels[at]) != value ||
                                   (block.state[at] != 0) != isNoData) {
                                 ++wrong;
                               }
                               ++at;
                             });
            ASSERT_EQ(wrong, 0U);
          }
        };
        EXPECT_TRUE(test::WithType(source, compare));
      }
    }
  }
}

/// Masks of the file, at the full size and at a reduced one.
TEST(GdalLayouts, MasksExcludePixelsOfEveryLevel) {
  const struct {
    const char* name;
    bool alpha;  // a band for it; else a mask inside the file
  } cases[] = {{"mask", false}, {"alpha", true}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    test::TemporaryDirectory directory;
    const std::string path = (directory.Path() / "masked.tif").string();
    GDALAllRegister();
    CPLSetConfigOption("GDAL_TIFF_INTERNAL_MASK", "YES");
    const char* const options[] = {"INTERLEAVE=PIXEL", "TILED=YES", "COMPRESS=DEFLATE",
                                   c.alpha ? "ALPHA=YES" : nullptr, nullptr};
    GDALDatasetH const file = GDALCreate(GDALGetDriverByName("GTiff"), path.c_str(), 300, 260,
                                         c.alpha ? 4 : 2, GDT_Byte, const_cast<char**>(options));
    for (int band = 1; band <= 2; ++band) GDALFillRaster(GDALGetRasterBand(file, band), 50, 0);
    if (!c.alpha) GDALCreateDatasetMaskBand(file, GMF_PER_DATASET);
    GDALRasterBandH const mask =
        c.alpha ? GDALGetRasterBand(file, 4) : GDALGetMaskBand(GDALGetRasterBand(file, 1));
    GDALFillRaster(mask, 255, 0);
    std::vector<unsigned char> none(100 * 80, 0);
    ASSERT_EQ(GDALRasterIO(mask, GF_Write, 40, 30, 100, 80, none.data(), 100, 80, GDT_Byte, 0, 0),
              CE_None);
    const int factor = 2;
    ASSERT_EQ(GDALBuildOverviews(file, "NEAREST", 1, &factor, 0, nullptr, nullptr, nullptr),
              CE_None);
    GDALClose(file);
    CPLSetConfigOption("GDAL_TIFF_INTERNAL_MASK", nullptr);

    const auto source = test::OpenSource({path});
    const auto reader = test::ReaderOf<std::uint8_t>(source);
    ASSERT_TRUE(reader) << TakeFault().ToUTF8();
    ASSERT_EQ(reader->PyramidLevelMax(), 1);
    const bool byPixel = reader->RasterDef().interleave == Interleave::BIP;
    for (unsigned level = 0; level <= 1; ++level) {
      const unsigned width = reader->Samples(level), height = reader->Lines(level);
      Block<std::uint8_t> block{{0, 0, width - 1, height - 1}, {1, 0}, {}, {}};
      block.pixels.resize(std::size_t{width} * height * 2);
      block.state.resize(block.pixels.size());
      ASSERT_TRUE(reader->ReadPixels(0, 0, width, height, block.BandArray(), level,
                                     block.pixels.data(), block.state.data()));
      std::size_t at = 0, wrong = 0;
      test::VisitBlock(byPixel ? Interleave::BIP : Interleave::BSQ, block.rect, block.bands,
                       [&](unsigned x, unsigned y, unsigned) {
                         const unsigned fullX = x << level, fullY = y << level;
                         const bool isOut =
                             fullX >= 40 && fullX < 140 && fullY >= 30 && fullY < 110;
                         const unsigned want = isOut ? PixelValueState::Masked : 0;
                         if (block.state[at++] != want) ++wrong;
                       });
      EXPECT_EQ(wrong, 0U) << "level " << level;
    }
  }
}

}  // namespace
}  // namespace lumo
