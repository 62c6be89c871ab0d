#include "foundation/run_controls.h"
#include "mosaic/overlap_raster.h"
#include "mosaic/pvs_raster.h"
#include "support/placed_raster.h"

namespace lumo {
namespace {

using Overlap = OverlapRaster<int, int>;

int Ramp(unsigned x, unsigned y, unsigned band) {
  return static_cast<int>(x + 100 * y + 10000 * band);
}

template <typename T>
bool Read(Raster<T>& raster, const SubRect& rect, const std::vector<unsigned>& bands,
          Interleave interleave, std::vector<T>& pixels, std::vector<unsigned char>& state) {
  Array<T> block;
  Array<unsigned char> states;
  const bool whole = raster.GetSubRect(rect, MakeArray(bands), interleave, block, states);
  pixels.assign(block.begin(), block.end());
  state.assign(states.begin(), states.end());
  return whole;
}

TEST(OverlapRaster, ShowsTheFirstWhereBothAreValid) {
  const auto first = MakePlaced<int>(MakeGrid(0, 0, 10, 40, 30), 2, Ramp);
  // Begins at column 25 and line 8 of the first one, and has pixels of half the size.
  const auto second =
      MakePlaced<int>(MakeGrid(250, -80, 5, 100, 40), 2, [](auto...) { return -7; });
  first->states[first->At(26, 10, 0)] = PixelValueState::NoData;
  for (unsigned x = 4; x < 6; ++x)
    for (unsigned y = 4; y < 6; ++y) second->states[second->At(x, y, 0)] = PixelValueState::Masked;
  Overlap view{RasterPtr<int>(first), RasterPtr<int>(second)};
  ASSERT_EQ(view.Samples(), 15u);
  ASSERT_EQ(view.Lines(), 20u);
  EXPECT_EQ(view.Bands(), 2u);
  EXPECT_EQ(view.GetRasterDef().geoRef->TieMapX(), 250);
  EXPECT_EQ(view.GetRasterDef().geoRef->TieMapY(), -80);

  for (const Interleave order : {Interleave::BIP, Interleave::BIL, Interleave::BSQ}) {
    std::vector<int> pixels;
    std::vector<unsigned char> state;
    ASSERT_TRUE(Read(view, {0, 1, 400, 3}, {1, 0}, order, pixels, state));  // cut to 15 columns
    ASSERT_EQ(pixels.size(), 15u * 3 * 2);
    for (unsigned y = 0; y < 3; ++y)
      for (unsigned x = 0; x < 15; ++x)
        for (unsigned i = 0; i < 2; ++i) {
          const std::size_t at = order == Interleave::BIP   ? (y * 15 + x) * 2 + i
                                 : order == Interleave::BIL ? (y * 2 + i) * 15 + x
                                                            : (i * 3 + y) * 15 + x;
          const unsigned band = 1 - i;
          EXPECT_EQ(pixels[at], Ramp(25 + x, 9 + y, band));
          const bool hidden = band == 0 && ((x == 1 && y == 1) || (x == 2 && y == 1));
          EXPECT_EQ(state[at], hidden ? PixelValueState::NoData : PixelValueState::Valid);
        }
  }
  EXPECT_EQ(view.PixelCount(0, IPC()), 15u * 20 - 2);
  EXPECT_EQ(view.PixelCount(1, IPC()), 15u * 20);
  EXPECT_EQ(view.Max(1, IPC()), Ramp(39, 27, 1));  // of the overlap, not of the first raster
  EXPECT_EQ(view.Min(1, IPC()), Ramp(25, 8, 1));

  second->fails = true;
  std::vector<int> pixels;
  std::vector<unsigned char> state;
  EXPECT_FALSE(Read(view, {0, 0, 5, 5}, {0}, Interleave::BIP, pixels, state));
}

TEST(OverlapRaster, IsEmptyWithoutACommonArea) {
  const auto make = [](double x, double y) {
    return RasterPtr<int>(MakePlaced<int>(MakeGrid(x, y, 1, 10, 10), 1, Ramp));
  };
  const RasterPtr<int> first = make(0, 0);
  const struct {
    const char* name;
    RasterPtr<int> first, second;
  } cases[] = {{"touches along an edge", first, make(10, 0)},
               {"touches in a corner", first, make(10, -10)},
               {"far away", first, make(100, 100)},
               {"no geo-reference", RasterPtr<int>(MakeRamp<int>(10, 10, 1)), first},
               {"none of the second", first, RasterPtr<int>(MakeRamp<int>(10, 10, 1))},
               {"no second", first, {}}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    Overlap view(c.first, c.second);
    EXPECT_EQ(view.Samples(), 0u);
    EXPECT_EQ(view.Lines(), 0u);
    EXPECT_EQ(view.Bands(), 0u);
    EXPECT_EQ(view.PixelCount(0, IPC()), 0u);
    std::vector<int> pixels;
    std::vector<unsigned char> state;
    EXPECT_FALSE(Read(view, {0, 0, 0, 0}, {0}, Interleave::BIP, pixels, state));
  }
  EXPECT_EQ(Overlap(first, make(9.4, 0)).Samples(), 1u);  // 0.6 of a pixel, rounded
}

TEST(OverlapRaster, FindsTheAreaInAnotherCoordinateSystem) {
  // The middle of zone 33: 500000 east is 15 degrees.
  const RasterPtr<int> utm(
      MakePlaced<int>(MakeGrid(499000, 5001000, 20, 100, 100, "EPSG:32633"), 1, Ramp));
  const RasterPtr<int> degrees(
      MakePlaced<int>(MakeGrid(15, 46, 0.01, 100, 100, "EPSG:4326"), 1, [](auto...) { return 1; }));
  Overlap view(utm, degrees);
  EXPECT_NEAR(view.Samples(), 50, 1);  // the eastern half
  EXPECT_EQ(view.Lines(), 100u);
  EXPECT_NEAR(static_cast<double>(view.PixelCount(0, IPC())), 5000, 150);
}

TEST(PVSRaster, TellsPixelsFromNoData) {
  const auto source = MakePlaced<int>(MakeGrid(0, 0, 1, 6, 4), 3, Ramp);
  const auto mark = [&](unsigned x, unsigned y, std::vector<unsigned char> states) {
    for (unsigned band = 0; band < 3; ++band) source->states[source->At(x, y, band)] = states[band];
  };
  mark(1, 1, {1, 1, 1});
  mark(2, 1, {1, 0, 1});
  mark(3, 1, {1, 3, 1});  // masked besides
  mark(4, 1, {1, 1, 8 | 1});
  PVSRaster<int> view{RasterPtr<int>(source)};
  EXPECT_EQ(view.Bands(), 1u);
  EXPECT_EQ(view.Samples(), 6u);
  std::vector<int> pixels;
  std::vector<unsigned char> state;
  ASSERT_TRUE(Read(view, {0, 1, 5, 1}, {0}, Interleave::BSQ, pixels, state));
  EXPECT_EQ(pixels, std::vector<int>(6, 1));  // no band has a no-data value
  EXPECT_EQ(source->reads, 0u);

  source->noData = 0;
  ASSERT_TRUE(Read(view, {0, 1, 5, 1}, {0}, Interleave::BSQ, pixels, state));
  EXPECT_EQ(pixels, (std::vector<int>{1, 0, 1, 1, 0, 1}));
  EXPECT_EQ(state, std::vector<unsigned char>(6, 0));
  // More bands than there are: the first one has the pixels.
  ASSERT_TRUE(Read(view, {1, 1, 2, 1}, {0, 0}, Interleave::BIP, pixels, state));
  EXPECT_EQ(pixels, (std::vector<int>{0, 1, 1, 1}));
  EXPECT_FALSE(Read(view, {0, 0, 1, 1}, {0}, Interleave::None, pixels, state));
  EXPECT_EQ(view.Sum(0, IPC()), 22);

  PVSRaster<int> none{RasterPtr<int>()};
  EXPECT_EQ(none.Sum(0, IPC()), 0);
  EXPECT_FALSE(Read(none, {0, 0, 1, 1}, {0}, Interleave::BIP, pixels, state));
}

}  // namespace
}  // namespace lumo
