#include "../../examples/circle_raster.h"
#include "../../examples/commands/mirror_command.cpp"
#include "../../examples/mirrored_raster.h"
#include "commands/catalog.h"
#include "support/run_command.h"
#include "support/stats_support.h"
#include "support/test_rasters.h"

namespace lumo {
namespace {

using example::CircleRaster;
using example::MirroredRaster;
using Pixel = std::int32_t;
constexpr Interleave kOrders[] = {Interleave::None, Interleave::BIP, Interleave::BIL,
                                  Interleave::BSQ};

/// Reads a block of a view in every order, and calls `check(value, state, x, y, band)` for each
/// element of it.
template <typename Check>
void ReadInEveryOrder(Raster<Pixel>& view, const SubRect& rect, const Check& check) {
  for (const Interleave order : kOrders) {
    SCOPED_TRACE(static_cast<int>(order));
    const std::vector<unsigned> bands =
        order == Interleave::None ? std::vector{1U} : std::vector{2U, 0U, 2U};
    Array<Pixel> pixels;
    Array<unsigned char> states;
    ASSERT_TRUE(view.GetSubRect(rect, MakeArray(bands), order, pixels, states));
    const std::size_t w = rect.Width(), h = rect.Height(), n = bands.size();
    ASSERT_EQ(pixels.GetCount(), w * h * n);
    for (unsigned y = 0; y < h; ++y)
      for (unsigned x = 0; x < w; ++x)
        for (unsigned b = 0; b < n; ++b) {
          const std::size_t at = order == Interleave::BIP   ? (y * w + x) * n + b
                                 : order == Interleave::BIL ? (y * n + b) * w + x
                                                            : (b * h + y) * w + x;
          check(pixels[at], states[at], rect.left + x, rect.top + y, bands[b]);
        }
  }
}

TEST(ExampleViews, MirroredShowsTheOtherPlacesAndWritesThere) {
  MirroredRaster<Pixel> view(MakeRamp<Pixel>(10, 8, 3));
  for (const SubRect& rect : {SubRect(0, 0, 9, 7), SubRect(2, 1, 6, 5), SubRect(9, 7, 9, 7)}) {
    ReadInEveryOrder(view, rect,
                     [](Pixel value, unsigned char state, unsigned x, unsigned y, unsigned band) {
                       EXPECT_EQ(value, RampValue<Pixel>(9 - x, y, band));
                       EXPECT_EQ(state, 0);
                     });
  }
  Array<Pixel> pixels;
  Array<unsigned char> states;
  EXPECT_FALSE(
      view.GetSubRect({5, 0, 10, 0}, MakeArray<unsigned>({0U}), Interleave::BIP, pixels, states));

  const Pointer<MemoryTestRaster<Pixel>> store(new MemoryTestRaster<Pixel>(5, 2, 1));
  pixels = MakeArray<Pixel>({1, 2, 3});
  states = MakeArray<unsigned char>({0, 1, 2});
  ASSERT_TRUE(MirroredRaster<Pixel>(store).PutSubRect({0, 1, 2, 1}, MakeArray<unsigned>({0U}),
                                                      Interleave::BIP, pixels, states));
  EXPECT_EQ(store->pixels, (std::vector<Pixel>{0, 0, 0, 0, 0, 0, 0, 3, 2, 1}));
  EXPECT_EQ(store->states, (std::vector<unsigned char>{0, 0, 0, 0, 0, 0, 0, 2, 1, 0}));
  EXPECT_EQ(pixels[0], 1);  // the caller's as they were
}

TEST(ExampleViews, CircleMasksWhatLiesOutside) {
  const auto isInside = [](unsigned x, unsigned y) {
    return (x + 0.5 - 4) * (x + 0.5 - 4) + (y + 0.5 - 3) * (y + 0.5 - 3) <= 2.5 * 2.5;
  };
  CircleRaster<Pixel> view(MakeRamp<Pixel>(10, 8, 3), 4, 3, 2.5);
  ReadInEveryOrder(view, {1, 0, 8, 7},
                   [&](Pixel value, unsigned char state, unsigned x, unsigned y, unsigned band) {
                     EXPECT_EQ(value, RampValue<Pixel>(x, y, band));
                     EXPECT_EQ(state, isInside(x, y) ? 0 : 2) << x << ", " << y;
                   });
  double sum = 0, count = 0;
  for (unsigned y = 0; y < 8; ++y)
    for (unsigned x = 0; x < 10; ++x) {
      sum += isInside(x, y) ? RampValue<Pixel>(x, y, 1) : 0;
      count += isInside(x, y) ? 1 : 0;
    }
  EXPECT_TRUE(test::Near(view.Mean(1, IPC()), sum / count));
}

TEST(ExampleViews, ACommandMakesOne) {
  const auto made =
      test::RunCommand("CreateMemoryRasterCommand",
                       {{"Samples", "5"}, {"Lines", "4"}, {"Bands", "3"}, {"DataType", "UInt16"}});
  ASSERT_TRUE(made.Succeeded()) << made.reason;
  const std::string source = made.outputs.at("URI");
  const auto view = test::RunCommand("ExampleMirrorCommand", {{"SrcURI", source}});
  ASSERT_TRUE(view.Succeeded()) << view.reason;
  EXPECT_EQ(view.outputs.at("DataType"), "UInt16");
  EXPECT_NE(view.outputs.at("URI"), source);
  for (const std::string& uri : {view.outputs.at("URI"), source}) {
    test::RunCommand("CloseRasterCommand", {{"URI", uri}});
  }
  EXPECT_EQ(test::RunCommand("ExampleMirrorCommand", {{"SrcURI", source}}).result,
            CommandResult::kFailed);
}

}  // namespace
}  // namespace lumo
