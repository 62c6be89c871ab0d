#include <filesystem>
#include <random>

#include "gdal_peer.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

using test::Block;
using test::CreateSource;
using test::Peer;
using test::ReaderOf;
using test::Release;

/// The raster that a file should hold, element by element in the order of bands, lines, samples.
struct Model {
  explicit Model(const RasterDef& def, float fill)
      : samples(def.samples),
        lines(def.lines),
        values(std::size_t{def.samples} * def.lines * def.bands, fill) {}
  float& At(unsigned x, unsigned y, unsigned band) {
    return values[(std::size_t{band} * lines + y) * samples + x];
  }
  unsigned samples, lines;
  std::vector<float> values;
};

SubRect RandomRect(std::mt19937& random, const RasterDef& def) {
  const auto side = [&](unsigned size) {
    unsigned first = random() % size, last = random() % size;
    if (random() % 3 == 0) first = 0;
    if (random() % 3 == 0) last = size - 1;
    return std::minmax({first, last});
  };
  const auto [left, right] = side(def.samples);
  const auto [top, bottom] = side(def.lines);
  return {left, top, right, bottom};
}

std::vector<unsigned> RandomBands(std::mt19937& random, const RasterDef& def) {
  std::vector<unsigned> bands(def.bands);
  for (unsigned i = 0; i < def.bands; ++i) bands[i] = i;
  if (random() % 2 == 0) return bands;
  std::shuffle(bands.begin(), bands.end(), random);
  bands.resize(1 + random() % def.bands);
  return bands;
}

void ExpectBlock(RasterReader<float>& reader, Model& model, Block<float> block) {
  ASSERT_TRUE(block.Read(reader)) << TakeFault().ToUTF8();
  std::size_t at = 0, wrong = 0;
  test::VisitBlock(reader.RasterDef().interleave, block.rect, block.bands,
                   [&](unsigned x, unsigned y, unsigned band) {
                     if (block.pixels[at++] != model.At(x, y, band)) ++wrong;
                   });
  EXPECT_EQ(wrong, 0U);
}

/// Writes and reads blocks here and there, lets the raster go, and looks at it through GDAL.
void TryBlocks(const RasterDef& def, float fill, int writes) {
  const test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "made.tif").string();
  std::mt19937 random(7);
  Model model(def, fill);
  auto made = CreateSource({path}, def);
  ASSERT_TRUE(made) << TakeFault().ToUTF8();
  {
    const auto writer = ReaderOf<float>(made);
    ASSERT_TRUE(writer);
    for (int i = 0; i < writes; ++i) {
      Block<float> block{RandomRect(random, def), RandomBands(random, def), {}, {}};
      test::VisitBlock(writer->RasterDef().interleave, block.rect, block.bands,
                       [&](unsigned x, unsigned y, unsigned band) {
                         const auto value = static_cast<float>(random() % 1000 + 1);
                         block.pixels.push_back(value);
                         model.At(x, y, band) = value;
                       });
      block.state.assign(block.pixels.size(), 0);
      ASSERT_TRUE(block.Write(*writer)) << TakeFault().ToUTF8();
      ExpectBlock(*writer, model, {RandomRect(random, def), RandomBands(random, def), {}, {}});
    }
  }
  ASSERT_EQ(Release(made), "");
  const Peer peer(path);
  for (unsigned band = 0; band < def.bands; ++band) {
    const auto pixels = Peer::Pixels(peer.Band(band));
    std::size_t wrong = 0;
    for (std::size_t i = 0; i < pixels.size(); ++i) {
      const float want = model.values[band * pixels.size() + i];
      if (pixels[i].real() != static_cast<double>(want)) ++wrong;
    }
    EXPECT_EQ(wrong, 0U) << "band " << band;
  }
}

TEST(TiffPixels, BlocksGoToTheirPlacesInEveryLayout) {
  for (const Interleave interleave : {Interleave::BIP, Interleave::BSQ}) {
    for (const unsigned tile : {0U, 16U, 48U, 256U}) {
      for (const bool hasNoData : {false, true}) {
        for (const int writes : {0, 1, 12}) {
          SCOPED_TRACE(testing::Message()
                       << "interleave " << static_cast<int>(interleave) << " tile " << tile
                       << " no data " << hasNoData << " writes " << writes);
          RasterDef def;
          def.format = "TIFF";
          def.samples = 101;
          def.lines = 75;
          def.bands = 4;
          def.dataType = kDataTypeOf<float>;
          def.interleave = interleave;
          def.tileWidth = def.tileHeight = tile;
          for (unsigned band = 0; hasNoData && band < def.bands; ++band) def.noData[band] = -7;
          TryBlocks(def, hasNoData ? -7.0F : 0.0F, writes);
        }
      }
    }
  }
}

TEST(TiffPixels, RastersBeyondFourGigabytes) {
  const test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / "large.tif").string();
  RasterDef def;
  def.format = "TIFF";
  def.samples = def.lines = 50'000;
  def.bands = 2;
  def.dataType = kDataTypeOf<std::uint8_t>;
  def.interleave = Interleave::BIP;
  auto made = CreateSource({path}, def);
  ASSERT_TRUE(made) << TakeFault().ToUTF8();
  const Block<std::uint8_t> corner{
      {49'998, 49'999, 49'999, 49'999}, {0, 1}, {1, 2, 3, 4}, {0, 0, 0, 0}};
  ASSERT_TRUE(corner.Write(*ReaderOf<std::uint8_t>(made))) << TakeFault().ToUTF8();
  ASSERT_EQ(Release(made), "");
  const Peer peer(path);
  unsigned char pixels[2] = {};
  ASSERT_EQ(GDALRasterIO(peer.Band(1), GF_Read, 49'998, 49'999, 2, 1, pixels, 2, 1, GDT_Byte, 0, 0),
            CE_None);
  EXPECT_EQ(pixels[0], 2);
  EXPECT_EQ(pixels[1], 4);
}

}  // namespace
}  // namespace lumo
