#include "block_trials.h"

namespace lumo {
namespace {

using test::Block;
using test::CreateSource;
using test::Peer;
using test::ReaderOf;
using test::Release;

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
          test::TryBlocks<float>(def, hasNoData ? -7.0F : 0.0F, {writes, 7});
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
