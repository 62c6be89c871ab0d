#include "raster/block_states.h"
#include "raster/block_strides.h"
#include "raster/tile_functions.h"
#include "support/test_rasters.h"
#include "views/no_data_raster.h"
#include "views/spatial_subset_raster.h"
#include "views/spectral_subset_raster.h"

namespace lumo {
namespace {

constexpr unsigned kSide = 40, kBands = 3;

/// A raster whose pixels have a state in one rectangle, and that makes states for blocks that touch
/// it. It holds what is written.
class SparseRaster final : public TestRaster<float>, public StatesOnDemand<float> {
 public:
  explicit SparseRaster(const SubRect& marked)
      : TestRaster<float>(kSide, kSide, kBands), marked_(marked) {}

  bool CanWrite() const override { return true; }
  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave order,
                  Array<float>& pixels, Array<unsigned char>& state) override {
    BlockStates states(state);
    return GetBlock(rect, bands, order, pixels, states) &&
           states.Make(order, rect.Width(), rect.Height(), bands.GetCount()) != nullptr;
  }
  bool GetBlock(const SubRect& rect, const Array<unsigned>& bands, Interleave order,
                Array<float>& pixels, BlockStates& states) override {
    const unsigned width = rect.Width(), height = rect.Height(), count = bands.GetCount();
    if (!pixels.Resize(BlockDims(order, width, height, count))) return false;
    const BlockStrides strides(order, width, height, count);
    for (unsigned i = 0; i < width * height * count; ++i) {
      const unsigned x = i % width, y = i / width % height, band = i / width / height;
      const std::size_t at = x * strides.pixel + y * strides.line + band * strides.band;
      pixels[at] = ValueAt(rect.left + x, rect.top + y, bands[band]);
      if (!IsMarked(rect.left + x, rect.top + y, bands[band])) continue;
      unsigned char* const state = states.Make(order, width, height, count);
      if (state == nullptr) return false;
      state[at] = PixelValueState::Masked;
    }
    return true;
  }
  bool PutSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave,
                  Array<float>& pixels, Array<unsigned char>& state) override {
    if (state.GetCount() != rect.Width() * rect.Height() * bands.GetCount()) return false;
    written += pixels.GetCount();
    marks += state.GetCount() - static_cast<unsigned>(std::count(state.begin(), state.end(), 0));
    if (!onlyReads) state[0] = PixelValueState::NoData;  // which it may
    return true;
  }
  bool OnlyReadsStates() const override { return onlyReads; }

  static float ValueAt(unsigned x, unsigned y, unsigned band) {
    return static_cast<float>(y * 1000 + x * 10 + band);
  }
  bool IsMarked(unsigned x, unsigned y, unsigned band) const {
    return band == 1 && x >= marked_.left && x <= marked_.right && y >= marked_.top &&
           y <= marked_.bottom;
  }

  bool onlyReads = true;
  unsigned written = 0, marks = 0;

 private:
  SubRect marked_;
};

/// Reads all tiles of a raster into one tile, compares each state with `want(x, y, band)`, and
/// gives how many tiles had no states.
template <typename Want>
unsigned CountTilesWithout(const RasterPtr<float>& raster, const Want& want) {
  RasterIterator<float> tiles(raster, TileDimensions{8, 8});
  Tile<float> tile;
  unsigned without = 0;
  for (unsigned row = 0; row < tiles.Rows(); ++row)
    for (unsigned column = 0; column < tiles.Columns(); ++column) {
      EXPECT_TRUE(tiles.Read(column, row, tile));
      without += tile.HasNoStates() ? 1 : 0;
      for (unsigned i = 0; i < tile.Width() * tile.Height() * tile.Bands(); ++i) {
        const unsigned x = i % tile.Width(), y = i / tile.Width() % tile.Height();
        const unsigned band = i / tile.Width() / tile.Height();
        const auto [left, top] = tile.Origin();
        EXPECT_EQ(tile.PixelState(static_cast<int>(x), static_cast<int>(y), band),
                  want(left + x, top + y, band))
            << left + x << ' ' << top + y << ' ' << band;
      }
    }
  return without;
}

TEST(StatesOnDemand, ComeWithTheTilesThatHaveSome) {
  const Pointer<SparseRaster> source(new SparseRaster({10, 17, 12, 18}));
  const auto inSource = [&](unsigned x, unsigned y, unsigned band) {
    return source->IsMarked(x, y, band) ? PixelValueState::Masked : 0;
  };
  EXPECT_EQ(CountTilesWithout(source, inSource), 24U);

  // Views that only choose hand states on as they are; another one adds to them.
  const RasterPtr<float> part(new SpatialSubsetRaster<float>(source, {8, 8, 39, 39}));
  EXPECT_EQ(CountTilesWithout(part, [&](unsigned x, unsigned y,
                                        unsigned b) { return inSource(x + 8, y + 8, b); }),
            15U);
  const RasterPtr<float> chosen(
      new SpectralSubsetRaster<float>(source, MakeArray<unsigned>({2, 0})));
  EXPECT_EQ(CountTilesWithout(chosen, [](unsigned, unsigned, unsigned) { return 0; }), 25U);
  const RasterPtr<float> noData(
      new NoDataRaster<float>(chosen, MakeArray<float>({SparseRaster::ValueAt(5, 30, 0)}), false));
  const auto isNoData = [](unsigned x, unsigned y, unsigned band) {
    return x == 5 && y == 30 && band == 1 ? PixelValueState::NoData : 0;
  };
  EXPECT_EQ(CountTilesWithout(noData, isNoData), 0U);
  noData->Sum(1, IPC());
  EXPECT_EQ(noData->BandStats(1).pixelCount, kSide * kSide - 1);
}

TEST(StatesOnDemand, GoWithACopyToWhoOnlyReadsThemAndToOthers) {
  for (const bool onlyReads : {true, false}) {
    const Pointer<SparseRaster> source(new SparseRaster({10, 17, 12, 18}));
    const Pointer<SparseRaster> target(new SparseRaster({0, 0, 0, 0}));
    target->onlyReads = onlyReads;
    const TileInputs<float> tiles =
        TilesBy(RasterIteratorPtr<float>(new RasterIterator<float>(source, TileDimensions{8, 8})));
    const RasterPtr<float> to(target);
    ASSERT_TRUE(CopyTiles("Copy", tiles, to, [](Tile<float>&) {}));
    EXPECT_EQ(target->written, kSide * kSide * kBands);
    EXPECT_EQ(target->marks, 6U);
    // A function that makes values of others has their states, and may mark more.
    target->marks = 0;
    ASSERT_TRUE(MapTiles("Map", tiles, to, [](const Tile<float>& in, Tile<float>& out) {
      std::copy(in.PixelArray().begin(), in.PixelArray().end(), out.PixelArray().begin());
      if (in.Origin() == TilePosition(24, 24)) out.SetNoData(1, 1, 2, true);
    }));
    EXPECT_EQ(target->marks, 7U);
  }
}

}  // namespace
}  // namespace lumo
