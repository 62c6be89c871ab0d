#include "raster/raster_iterator.h"

#include <thread>

#include "raster/raster_props.h"
#include "raster/tile_loops.h"
#include "support/test_rasters.h"
#include "tasks/parallel.h"

namespace lumo {
namespace {

using State = PixelValueState;

TEST(Tile, PutsEveryPixelAtAPlaceOfItsOwn) {
  Tile<float> tile;
  ASSERT_TRUE(tile.Resize(3, 2, 2, 1, 2, 3, 4));
  EXPECT_EQ(tile.PixelArray().GetDims(), ArrayDims(9, 6, 2));
  std::size_t offset = 0;
  for (int y = -3; y < 6; ++y)
    for (int x = -1; x < 5; ++x, offset += 2) EXPECT_EQ(tile.Offset(x, y), offset);
}

TEST(Tile, KeepsItsStorageAndClearsItsStates) {
  Tile<std::int16_t> tile(TileDimensions{4, 4, 2});
  const auto* const storage = tile.PixelArray().GetData();
  tile.SetMaskedAll(3, 3, true);
  tile.Pixel(0, 0, 0) = 5;
  ASSERT_TRUE(tile.Resize(2, 2, 2, 1));
  EXPECT_EQ(tile.PixelArray().GetData(), storage);
  EXPECT_EQ(tile.BorderBottom(), 1U);
  EXPECT_FALSE(tile.AnyMasked(2, 2));

  EXPECT_FALSE(tile.Resize(0, 4, 1));
  EXPECT_FALSE(tile.IsValid());
  EXPECT_EQ(tile.Dimensions(), TileDimensions());
  EXPECT_TRUE(tile.AllNoData(0, 0)) << "of no bands all";
  EXPECT_FALSE(tile.AnyNoData(0, 0));
  EXPECT_FALSE(tile.Resize(100'000, 100'000, 10)) << "more than an array counts";
  EXPECT_FALSE(tile.Resize(0xFFFFFFFF, 1, 1, 0xFFFFFFFF)) << "an extent that wraps around";
  EXPECT_TRUE(tile.Resize(1, 1, 1)) << "a tile that failed can be sized again";
}

TEST(Tile, SetsEachBitOfTheStateByItself) {
  Tile<std::uint8_t> tile(TileDimensions{2, 2, 3});
  tile.SetNoData(1, 0, 2, true);
  tile.SetMaskedAll(1, 0, true);
  tile.SetOutsideROI(1, 0, 0, true);
  EXPECT_EQ(tile.PixelState(1, 0, 0), State::Masked | State::OutsideROI);
  EXPECT_EQ(tile.PixelState(1, 0, 1), State::Masked);
  EXPECT_EQ(tile.PixelState(1, 0, 2), State::Masked | State::NoData);
  EXPECT_TRUE(tile.AnyNoData(1, 0) && tile.IsNoData(1, 0, 2) && tile.AllMasked(1, 0));
  EXPECT_FALSE(tile.AllNoData(1, 0) || tile.AllOutsideROI(1, 0) || tile.AnyMasked(0, 0));
  tile.SetMasked(1, 0, 1, false);
  EXPECT_FALSE(tile.AllMasked(1, 0));
  EXPECT_EQ(tile.PixelState(1, 0, 1), State::Valid);
}

TEST(Tile, HasNoStatesUntilSomebodyChangesOne) {
  Tile<std::uint8_t> tile, other;
  ASSERT_TRUE(tile.ResizeAllValid({64, 32, 2}, Interleave::BSQ));
  ASSERT_TRUE(other.ResizeAllValid({64, 32, 2}));
  EXPECT_EQ(std::as_const(tile).StateArray().GetDims(), ArrayDims(2, 32, 64));
  const auto marked = [](const Tile<std::uint8_t>& of) {
    const Array<unsigned char>& states = of.StateArray();
    return of.StateArray().GetCount() - std::count(states.begin(), states.end(), 0);
  };
  EXPECT_EQ(marked(tile), 0);
  EXPECT_TRUE(tile.HasNoStates()) << "looking made them";
  // Threads that work on parts of a tile make its states together, and none loses what it marks.
  std::vector<std::thread> threads;
  for (unsigned part = 0; part < 8; ++part) {
    threads.emplace_back([&tile, part] {
      for (unsigned i = part; i < 4096; i += 8) tile.StateArray()[i] = State::Masked;
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_FALSE(tile.HasNoStates());
  EXPECT_EQ(marked(tile), 4096);
  EXPECT_EQ(marked(other), 0) << "the zeros are those of all tiles";

  other.SetNoData(3, 1, 1, true);
  EXPECT_TRUE(other.IsNoData(3, 1, 1) && !other.HasNoStates());
  EXPECT_EQ(marked(other), 1);
  ASSERT_TRUE(tile.ResizeAllValid({64, 32, 2}));
  EXPECT_EQ(marked(tile), 0) << "states of an earlier block";
  tile.StateArray();
  EXPECT_EQ(marked(tile), 0) << "states of an earlier block";
  EXPECT_FALSE(tile.ResizeAllValid({0, 4, 1}));
  EXPECT_FALSE(tile.HasNoStates());
}

TEST(TileFromTemplate, TakesShapeAndStates) {
  Tile<std::uint16_t> shape;
  ASSERT_TRUE(shape.Resize(3, 2, 2, 1));
  shape.SetIndex({4, 5});
  shape.SetMasked(-1, 2, 1, true);
  shape.SetNoData(0, 0, 0, true);

  const TileFromTemplate<double> same(shape);
  EXPECT_EQ(same.Dimensions(), shape.Dimensions());
  EXPECT_EQ(same.Index(), TilePosition(4, 5));
  EXPECT_TRUE(same.IsMasked(-1, 2, 1));
  EXPECT_FALSE(same.IsMasked(-1, 2, 0));

  const TileFromTemplate<double> other(shape, 3);
  EXPECT_EQ(other.Bands(), 3U);
  EXPECT_TRUE(other.AllMasked(-1, 2) && other.AllNoData(0, 0));
  EXPECT_FALSE(other.AnyNoData(-1, 2));

  const TileFromTemplateBorder<double> inner(shape, 0, 1, 0, 1);
  EXPECT_EQ(inner.Dimensions(), (TileDimensions{3, 2, 1, 0, 1, 0, 1, 0}));
  EXPECT_TRUE(inner.IsNoData(0, 0, 0));
  EXPECT_FALSE(inner.AnyNoData(3, 2));
  const TileFromTemplateBorder<double> wider(shape, 2, 0, 0, 0);
  EXPECT_TRUE(wider.IsNoData(-2, 0, 0)) << "outside the template";
}

TEST(TileLoops, TakeTheirRangeFromTheTile) {
  Tile<float> tile;
  ASSERT_TRUE(tile.Resize(30, 20, 2, 1, 2, 0, 3));
  std::ranges::fill(tile.PixelArray(), 0.0F);
  struct Add : BorderedTileParallelFor2<float> {
    using BorderedTileParallelFor2::BorderedTileParallelFor2;
    void Body(int x0, int x1, int y0, int y1) override {
      for (int y = y0; y < y1; ++y)
        for (int x = x0; x < x1; ++x) GetTile().Pixel(x, y, 1) += 1;
    }
  } add(tile);
  RunParallelFor2(add);
  struct Double : TileParallelFor3<float> {
    using TileParallelFor3::TileParallelFor3;
    void Body(unsigned x0, unsigned x1, unsigned y0, unsigned y1, unsigned b0,
              unsigned b1) override {
      if (Failed()) return;
      for (unsigned y = y0; y < y1; ++y)
        for (unsigned x = x0; x < x1; ++x)
          for (unsigned b = b0; b < b1; ++b)
            GetTile().Pixel(static_cast<int>(x), static_cast<int>(y), b) += 2;
    }
  } twice(tile);
  RunParallelFor3(twice);
  for (int y = 0; y < 23; ++y)
    for (int x = -1; x < 32; ++x) {
      const float inside = x >= 0 && x < 30 && y < 20 ? 2.0F : 0.0F;
      ASSERT_EQ(tile.Pixel(x, y, 0), inside);
      ASSERT_EQ(tile.Pixel(x, y, 1), inside + 1);
    }
  Double failed(tile);
  failed.Fail();
  RunParallelFor3(failed);
  EXPECT_EQ(tile.Pixel(0, 0, 0), 2.0F);
  EXPECT_TRUE(failed.HasError());
}

TEST(RasterIterator, ChoosesItsGrid) {
  const auto bytes = MakeRamp<std::uint8_t>(8192, 1000, 4);
  const auto floats = MakeRamp<float>(8192, 1000, 4);
  const auto small = MakeRamp<float>(10, 3, 2);
  const auto nothing = MakeRamp<float>(0, 0, 0);
  EXPECT_EQ(RasterIteratorWide<std::uint8_t>(bytes).Dimensions(), (TileDimensions{8192, 256, 4}));
  EXPECT_EQ(RasterIteratorWide<float>(floats, 2).Dimensions(),
            (TileDimensions{8192, 64, 4, 2, 2, 2, 2, 0}));
  EXPECT_EQ(WideTiles(nothing.Get(), 4, 0, 0), (TileDimensions{1, 1, 0}));
  EXPECT_EQ(RasterIteratorSquare<float>(floats).Dimensions(),
            (TileDimensions{724, 724, 4, 1, 1, 1, 1, 0}));
  EXPECT_EQ(RasterIteratorSquare<float>(floats, 100, 0).Dimensions(), (TileDimensions{2, 2, 4}));
  EXPECT_EQ(RasterIteratorTile<float>(floats).Dimensions(), (TileDimensions{512, 512, 4}));
  EXPECT_EQ(RasterIteratorSmart<float>(floats).Dimensions(), (TileDimensions{8192, 64, 4}));
  floats->tileHeight = 2;
  EXPECT_EQ(RasterIteratorSmart<float>(floats).Dimensions(), (TileDimensions{724, 724, 4}));
  EXPECT_EQ(SmartTiles(nullptr, 4, kTileBudget, 1), TileDimensions());

  const RasterIteratorScanline<float> lines(small);
  EXPECT_EQ(lines.Columns(), 1U);
  EXPECT_EQ(lines.Rows(), 3U);
  RasterIterator<float> grid(small, {4, 2, 0, 1, 2, 3, 4, 1});
  EXPECT_EQ(grid.Columns(), 3U);
  EXPECT_EQ(grid.Rows(), 2U);
  EXPECT_EQ(RasterIteratorFromTemplate<std::uint8_t>(bytes, grid).Dimensions(),
            (TileDimensions{4, 2, 4, 1, 2, 3, 4, 1}));
  EXPECT_EQ(RasterIteratorFromTemplateSpatial<std::uint8_t>(bytes, grid).Dimensions(),
            (TileDimensions{4, 2, 4, 0, 0, 0, 0, 1}));
  const RasterProps props(*small, grid);
  EXPECT_EQ(props.columns, 3U);
  EXPECT_EQ(props.tiles.bands, 2U);
}

TEST(RasterIterator, RefusesWhatItCannotWalk) {
  const auto ramp = MakeRamp<float>(10, 3, 2);
  Tile<float> tile;
  RasterIterator<float> none(RasterPtr<float>(), {4, 4});
  EXPECT_FALSE(none.IsValid());
  EXPECT_EQ(none.Columns(), 0U);
  EXPECT_FALSE(none.Read(0, 0, tile));
  RasterIterator<float> badBand(ramp, {4, 4}, MakeArray<unsigned>({0, 2}));
  EXPECT_EQ(badBand.GetErrorState().code, ObjectErrorNotConstructed::Code);
  EXPECT_FALSE(badBand.Read(0, 0, tile));
  EXPECT_FALSE(RasterIterator<float>(RasterPtr<float>(new RasterView<float>), {4, 4}).IsValid());

  RasterIterator<float> grid(ramp, {4, 2});
  EXPECT_TRUE(grid.Read(2, 1, tile));
  EXPECT_EQ(tile.Width(), 2U);
  EXPECT_EQ(tile.Height(), 1U);
  EXPECT_FALSE(grid.Read(3, 0, tile));
  EXPECT_FALSE(grid.Read(0, 2, tile));
  ramp->failAtRead = ramp->reads;
  EXPECT_FALSE(grid.Read(0, 0, tile));
  EXPECT_FALSE(grid.Write(0, 0, tile)) << "the raster can't be written";
}

/// Every pixel of every tile, borders included, against the ramp and the fill.
void CheckRead(const TileDimensions& dimensions, BorderMode mode) {
  constexpr unsigned kSamples = 11;
  constexpr unsigned kLines = 7;
  const auto ramp = MakeRamp<std::int32_t>(kSamples, kLines, 3);
  const std::vector<unsigned> bands{2, 0, 2};
  RasterIterator<std::int32_t> grid(ramp, dimensions, MakeArray(bands));
  grid.SetBorderFill(mode, -5);
  Tile<std::int32_t> tile;
  std::size_t inner = 0;
  for (unsigned row = 0; row < grid.Rows(); ++row)
    for (unsigned column = 0; column < grid.Columns(); ++column) {
      ASSERT_TRUE(grid.Read(column, row, tile));
      EXPECT_EQ(tile.Index(), TilePosition(column, row));
      const auto [x0, y0] = tile.Origin();
      EXPECT_EQ(x0, column * dimensions.width);
      inner += std::size_t{tile.Width()} * tile.Height();
      const int right = static_cast<int>(tile.Width() + tile.BorderRight());
      const int bottom = static_cast<int>(tile.Height() + tile.BorderBottom());
      for (int y = -static_cast<int>(tile.BorderTop()); y < bottom; ++y)
        for (int x = -static_cast<int>(tile.BorderLeft()); x < right; ++x)
          for (unsigned b = 0; b < 3; ++b) {
            const std::int64_t sample = std::int64_t{x0} + x;
            const std::int64_t line = std::int64_t{y0} + y;
            const bool real = sample >= 0 && line >= 0 && sample < kSamples && line < kLines;
            ASSERT_TRUE(real || dimensions.borderClamp == 0) << "a clamped border has no padding";
            std::int32_t want =
                mode == BorderMode::kNoDataValue ? RampValue<std::int32_t>(77, 0, bands[b]) : -5;
            if (real) {
              want = RampValue<std::int32_t>(static_cast<std::uint64_t>(sample),
                                             static_cast<std::uint64_t>(line), bands[b]);
            }
            ASSERT_EQ(tile.Pixel(x, y, b), want) << sample << " " << line;
            const bool valid = real || mode == BorderMode::kValidValue;
            ASSERT_EQ(tile.PixelState(x, y, b), valid ? State::Valid : State::NoData);
          }
    }
  EXPECT_EQ(inner, std::size_t{kSamples} * kLines) << "the tiles cover the raster once";
}

TEST(RasterIterator, ReadsTilesWithTheirBorders) {
  const TileDimensions grids[] = {{4, 3},
                                  {11, 7},
                                  {1, 1},
                                  {100, 100},
                                  {4, 3, 0, 1, 1, 1, 1, 0},
                                  {4, 3, 0, 2, 0, 0, 5, 0},
                                  {4, 3, 0, 6, 6, 6, 6, 0},
                                  {4, 3, 0, 6, 6, 6, 6, 1},
                                  {5, 7, 0, 1, 3, 2, 0, 1},
                                  {11, 1, 0, 0, 0, 20, 20, 0}};
  for (const TileDimensions& grid : grids)
    for (const BorderMode mode :
         {BorderMode::kNoDataValue, BorderMode::kValue, BorderMode::kValidValue}) {
      SCOPED_TRACE(testing::Message() << grid << " mode " << static_cast<unsigned>(mode));
      CheckRead(grid, mode);
    }
}

TEST(RasterIterator, WritesTheInnerPartOfATile) {
  for (const unsigned border : {0U, 2U}) {
    const auto ramp = MakeRamp<std::uint16_t>(10, 9, 2);
    const Pointer<MemoryTestRaster<std::uint16_t>> target(
        new MemoryTestRaster<std::uint16_t>(10, 9, 2));
    const TileDimensions dimensions{4, 5, 0, border, border, border, border, 0};
    RasterIterator<std::uint16_t> from(ramp, dimensions);
    RasterIterator<std::uint16_t> to(target, dimensions);
    Tile<std::uint16_t> tile;
    for (unsigned row = 0; row < 2; ++row)
      for (unsigned column = 0; column < 3; ++column) {
        ASSERT_TRUE(from.Read(column, row, tile));
        tile.SetMasked(0, 0, 1, true);
        ASSERT_TRUE(to.Write(column, row, tile));
      }
    for (unsigned line = 0; line < 9; ++line)
      for (unsigned sample = 0; sample < 10; ++sample)
        for (unsigned band = 0; band < 2; ++band) {
          const std::size_t at = target->At(sample, line, band);
          ASSERT_EQ(target->pixels[at], RampValue<std::uint16_t>(sample, line, band));
          const bool first = sample % 4 == 0 && line % 5 == 0 && band == 1;
          ASSERT_EQ(target->states[at], first ? State::Masked : State::Valid);
        }
    ASSERT_TRUE(tile.Resize(4, 5, 2, border));
    EXPECT_FALSE(to.Write(2, 0, tile)) << "reaches over the edge";
    EXPECT_FALSE(to.Write(3, 0, tile)) << "off the grid";
    ASSERT_TRUE(tile.Resize(4, 5, 1, border));
    EXPECT_FALSE(to.Write(0, 0, tile)) << "another number of bands";
  }
}

TEST(RasterIterator, WalksARasterOf40BillionPixels) {
  constexpr unsigned kSide = 200'000;
  const auto ramp = MakeRamp<double>(kSide, kSide, 3);
  const auto check = [&](RasterIterator<double>& grid) {
    ASSERT_TRUE(grid.IsValid());
    EXPECT_GE(std::uint64_t{grid.Columns()} * grid.Rows() * grid.Dimensions().width *
                  grid.Dimensions().height,
              std::uint64_t{kSide} * kSide);
    Tile<double> tile;
    const TilePosition ends[] = {
        {0, 0}, {grid.Columns() - 1, grid.Rows() - 1}, {grid.Columns() / 2, grid.Rows() / 2}};
    for (const auto& [column, row] : ends) {
      ASSERT_TRUE(grid.Read(column, row, tile));
      const auto [x, y] = tile.Origin();
      const unsigned w = tile.Width() - 1;
      const unsigned h = tile.Height() - 1;
      EXPECT_EQ(tile.Pixel(0, 0, 2), RampValue<double>(x, y, 2));
      EXPECT_EQ(tile.Pixel(static_cast<int>(w), static_cast<int>(h), 1),
                RampValue<double>(std::uint64_t{x} + w, std::uint64_t{y} + h, 1));
    }
  };
  constexpr unsigned kBudget = 1U << 19;
  RasterIteratorScanline<double> scanline(ramp);
  check(scanline);
  RasterIteratorWide<double> wide(ramp, 1, kBudget);
  check(wide);
  RasterIteratorSquare<double> square(ramp, kBudget, 3);
  check(square);
  RasterIteratorTile<double> tiles(ramp);
  check(tiles);
  RasterIteratorSmart<double> smart(ramp, 0, kBudget);
  check(smart);
  RasterIteratorFromTemplate<double> like(ramp, square);
  check(like);
  RasterIteratorFromTemplateSpatial<double> spatial(ramp, square);
  check(spatial);
  RasterIterator<double> pixels(ramp, {1, 1});
  EXPECT_EQ(std::uint64_t{pixels.Columns()} * pixels.Rows(), std::uint64_t{kSide} * kSide);
  check(pixels);
}

TEST(RasterIterator, ServesManyThreads) {
  const auto ramp = MakeRamp<std::uint16_t>(64, 64, 2);
  const Pointer<MemoryTestRaster<std::uint16_t>> target(
      new MemoryTestRaster<std::uint16_t>(64, 64, 2));
  RasterIterator<std::uint16_t> from(ramp, {8, 8, 0, 1, 1, 1, 1, 0});
  RasterIterator<std::uint16_t> to(target, {8, 8});
  std::atomic<unsigned> failures{0};
  std::vector<std::thread> threads;
  for (unsigned t = 0; t < 4; ++t)
    threads.emplace_back([&, t] {
      Tile<std::uint16_t> tile;
      for (unsigned i = t; i < 64; i += 4)
        if (!from.Read(i % 8, i / 8, tile) || !to.Write(i % 8, i / 8, tile)) ++failures;
    });
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(failures, 0U);
  for (unsigned line = 0; line < 64; ++line)
    for (unsigned sample = 0; sample < 64; ++sample)
      ASSERT_EQ(target->pixels[target->At(sample, line, 1)],
                RampValue<std::uint16_t>(sample, line, 1));
}

}  // namespace
}  // namespace lumo
