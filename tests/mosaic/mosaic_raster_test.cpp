#include "mosaic/mosaic_raster.h"

#include "support/placed_raster.h"

namespace lumo {
namespace {

/// A definition of scenes in memory.
template <typename T>
MosaicRasterDefPtr<T> Define(const std::vector<RasterPtr<T>>& scenes,
                             const MosaicSettings& settings = {}) {
  Array<RasterPtr<T>> list{ArrayDims(static_cast<unsigned>(scenes.size()))};
  std::copy(scenes.begin(), scenes.end(), list.begin());
  return MosaicRasterDefPtr<T>(new MosaicRasterDef<T>(list, settings));
}

RasterDef Grid(const GeoRefPtr& grid, unsigned bands) {
  RasterDef def;
  def.samples = grid->Samples();
  def.lines = grid->Lines();
  def.bands = bands;
  def.SetGeoRef(grid);
  return def;
}

TEST(MosaicRaster, TakesAPixelFromTheFirstSceneThatHasIt) {
  const auto first = MakePlaced<int>(MakeGrid(0, 0, 1, 6, 4), 2, [](auto...) { return 1; });
  const auto second = MakePlaced<int>(MakeGrid(4, 0, 1, 6, 4), 2, [](auto...) { return 2; });
  for (const unsigned band : {0U, 1U}) {
    first->states[first->At(5, 1, band)] = PixelValueState::NoData;
  }
  first->states[first->At(4, 1, 0)] = PixelValueState::NoData;  // its other band is there
  MosaicSettings settings;
  settings.noData = -9;
  RasterDef grid = Grid(MakeGrid(0, 0, 1, 12, 4), 2);
  grid.noData = {{0, -9.0}, {1, -9.0}};
  const MosaicRasterPtr<int> mosaic(new MosaicRaster<int>(
      Define<int>({RasterPtr<int>(first), RasterPtr<int>(second)}, settings), grid));
  ASSERT_TRUE(mosaic->IsValid());
  EXPECT_TRUE(BasicMosaicRasterDefPtr(mosaic->Definition())->IsA(BasicMosaicRasterDef::TypeCode));
  EXPECT_TRUE(MosaicRasterPtr<int>(RasterPtr<int>(mosaic)));

  Array<int> pixels;
  Array<unsigned char> state;
  ASSERT_TRUE(mosaic->GetSubRect({0, 1, 11, 1}, MakeArray<unsigned>({0, 1}), Interleave::BSQ,
                                 pixels, state));
  const std::vector<int> band0(pixels.begin(), pixels.begin() + 12);
  EXPECT_EQ(std::vector<int>(band0.begin(), band0.begin() + 4), std::vector<int>(4, 1));
  EXPECT_NE(state[4], PixelValueState::Valid);
  EXPECT_EQ(pixels[12 + 4], 1);
  EXPECT_EQ(std::vector<int>(band0.begin() + 5, band0.end()),
            (std::vector<int>{2, 2, 2, 2, 2, -9, -9}));
  EXPECT_EQ(state[11], PixelValueState::NoData);
  EXPECT_EQ(mosaic->NoDataValue(1), -9);
}

}  // namespace
}  // namespace lumo
