#include "raster/tile_functions.h"

#include <chrono>
#include <map>
#include <random>
#include <stdexcept>
#include <thread>

#include "foundation/fault.h"
#include "support/test_rasters.h"
#include "tasks/thread_limit.h"

namespace lumo {
namespace {

template <typename T>
using MemoryPtr = Pointer<MemoryTestRaster<T>>;

/// Values and states from a seed.
template <typename T>
MemoryPtr<T> MakeScene(unsigned samples, unsigned lines, unsigned bands, unsigned seed) {
  const MemoryPtr<T> scene(new MemoryTestRaster<T>(samples, lines, bands));
  std::mt19937 random(seed);
  for (std::size_t i = 0; i < scene->pixels.size(); ++i) {
    scene->pixels[i] = static_cast<T>(random() % 1000);
    scene->states[i] = random() % 9 == 0 ? 1U << random() % 3 : 0;
  }
  return scene;
}

template <typename T>
TileInputs<T> TilesIn(const MemoryPtr<T>& raster, const TileDimensions& tiles) {
  return TilesBy(RasterIteratorPtr<T>(new RasterIterator<T>(raster, tiles)));
}

/// The sum of the valid pixels of `a` around a place, and a thousand times `b` in its last band: of
/// a whole raster, pixel by pixel.
double Around(const MemoryTestRaster<std::int16_t>& a, const MemoryTestRaster<float>& b, int x,
              int y, unsigned band, int reach) {
  double sum = 1000.0 * b.pixels[b.At(x, y, b.Bands() - 1)];
  for (int v = std::max(y - reach, 0); v <= y + reach && v < int(a.Lines()); ++v)
    for (int u = std::max(x - reach, 0); u <= x + reach && u < int(a.Samples()); ++u)
      if (a.states[a.At(u, v, band)] == 0) sum += a.pixels[a.At(u, v, band)];
  return sum;
}

/// The same through the tiles, in strips or in one piece.
bool MapAround(const TileInputs<std::int16_t>& a, const MemoryPtr<float>& b,
               const MemoryPtr<double>& out, int reach, bool whole) {
  const auto pixels = [&](const Tile<std::int16_t>& in, const Tile<float>& more, Tile<double>& to,
                          const TilePart& part) {
    for (int y = part.rowFrom; y < int(part.rowTo); ++y)
      for (int x = part.columnFrom; x < int(part.columnTo); ++x)
        for (unsigned band = 0; band < to.Bands(); ++band) {
          double sum = 1000.0 * more.Pixel(x, y, more.Bands() - 1);
          for (int v = y - reach; v <= y + reach; ++v)
            for (int u = x - reach; u <= x + reach; ++u)
              if (in.PixelState(u, v, band) == 0) sum += in.Pixel(u, v, band);
          to.Pixel(x, y, band) = sum;
        }
  };
  const auto tile = [&](const Tile<std::int16_t>& in, const Tile<float>& more, Tile<double>& to) {
    pixels(in, more, to, {0, to.Height(), 0, to.Width()});
  };
  const auto inputs = a.With(RasterPtr<float>(b));
  const RasterPtr<double> target(out);
  return whole ? MapTiles("Around", inputs, target, tile)
               : MapTiles("Around", inputs, target, pixels);
}

TEST(MapTiles, GivesWhatAWholeRasterGivesForAnyTilesBordersAndThreads) {
  const struct {
    unsigned samples, lines, bands, bandsOut, width, height;
    int reach;
  } cases[] = {
      {1, 1, 1, 1, 1, 1, 0},     {1, 1, 1, 1, 5, 5, 2},         {40, 30, 3, 3, 7, 5, 1},
      {40, 30, 2, 1, 64, 64, 2}, {33, 1, 3, 2, 10, 4, 1},       {1, 50, 1, 1, 3, 8, 2},
      {31, 29, 2, 2, 1, 1, 1},   {300, 200, 3, 3, 300, 200, 0}, {517, 97, 1, 1, 128, 97, 3}};
  for (const auto& c : cases) {
    for (const unsigned threads : {1U, 2U, 4U}) {
      SCOPED_TRACE(testing::Message()
                   << c.samples << " by " << c.lines << " by " << c.bands << " in " << c.width
                   << " by " << c.height << ", reach " << c.reach << ", threads " << threads);
      const ThreadLimit limit(threads);
      const auto a = MakeScene<std::int16_t>(c.samples, c.lines, c.bands, 1);
      const auto b = MakeScene<float>(c.samples, c.lines, 2, 2);
      const MemoryPtr<double> out(new MemoryTestRaster<double>(c.samples, c.lines, c.bandsOut));
      TileDimensions tiles{c.width, c.height};
      tiles.borderLeft = tiles.borderRight = tiles.borderTop = tiles.borderBottom = c.reach;
      ASSERT_TRUE(MapAround(TilesIn(a, tiles), b, out, c.reach, threads == 2));
      for (unsigned y = 0; y < c.lines; ++y)
        for (unsigned x = 0; x < c.samples; ++x) {
          unsigned char any = 0;
          for (unsigned band = 0; band < c.bands; ++band) any |= a->states[a->At(x, y, band)];
          for (unsigned band = 0; band < c.bandsOut; ++band) {
            ASSERT_EQ(out->pixels[out->At(x, y, band)], Around(*a, *b, x, y, band, c.reach));
            ASSERT_EQ(out->states[out->At(x, y, band)],
                      c.bands == c.bandsOut ? a->states[a->At(x, y, band)] : any);
          }
        }
    }
  }
}

TEST(MapTiles, ChoosesTilesOfItsOwnAndKeepsTheOrderOfTheAxes) {
  const auto scene = MakeScene<std::int16_t>(1000, 333, 4, 3);
  const MemoryPtr<std::int16_t> out(new MemoryTestRaster<std::int16_t>(1000, 333, 4));
  const auto negate = [](const Tile<std::int16_t>& in, Tile<std::int16_t>& to) {
    for (unsigned i = 0; i < in.PixelArray().GetCount(); ++i)
      to.PixelArray()[i] = static_cast<std::int16_t>(-in.PixelArray()[i]);
  };
  const auto tiles = TilesOf<std::int16_t>(scene);
  EXPECT_GT(std::get<0>(tiles.iterators)->Rows(), 4U);
  ASSERT_TRUE(MapTiles("Negate", tiles, RasterPtr<std::int16_t>(out), negate));
  for (std::size_t i = 0; i < out->pixels.size(); ++i) ASSERT_EQ(out->pixels[i], -scene->pixels[i]);
  EXPECT_EQ(out->states, scene->states);
}

/// How a body ends a run in the middle.
enum class End { kFalse, kThrow, kAbort, kReadFails };

/// Maps a ramp in 60 tiles, of which number 30 ends the run; and gives how many were written whole,
/// in order, with nothing behind them.
unsigned WrittenTiles(End end, bool& ran) {
  const auto ramp = MakeRamp<std::int32_t>(60, 10, 1);
  const MemoryPtr<std::int32_t> out(new MemoryTestRaster<std::int32_t>(60, 10, 1));
  if (end == End::kReadFails) ramp->failAtRead = 30;
  const IPC ipc;
  const auto body = [&](const Tile<std::int32_t>& in, Tile<std::int32_t>& to) {
    // The later a tile the sooner it is done, so that they are done out of order.
    std::this_thread::sleep_for(std::chrono::microseconds((60 - in.Index().first) % 7 * 100));
    std::copy_n(in.PixelArray().GetData(), in.PixelArray().GetCount(), to.PixelArray().GetData());
    if (in.Index().first != 30 || end == End::kReadFails) return true;
    if (end == End::kThrow) throw std::runtime_error("thrown");
    if (end == End::kAbort) ipc.abort->Set(true);
    if (end == End::kFalse) SetFault("tile 30 has no sense");
    return end == End::kAbort;
  };
  const auto tiles =
      TilesBy(RasterIteratorPtr<std::int32_t>(new RasterIterator<std::int32_t>(ramp, {1, 10})));
  ran = MapTiles("Ends", tiles, RasterPtr<std::int32_t>(out), body, ipc);
  unsigned written = 0;
  for (unsigned tile = 0; tile < 60; ++tile) {
    unsigned right = 0;
    for (unsigned y = 0; y < 10; ++y) {
      const bool same = out->pixels[out->At(tile, y, 0)] == RampValue<std::int32_t>(tile, y, 0);
      right += same && (tile != 0 || y != 0);  // where it is 0 it tells nothing
    }
    const bool whole = right == (tile == 0 ? 9U : 10U);
    EXPECT_TRUE(whole || right == 0) << "tile " << tile << " is half written";
    if (whole) {
      EXPECT_EQ(written, tile) << "a tile is missing before this one";
      ++written;
    }
  }
  return written;
}

TEST(MapTiles, EndsInTheMiddleWithWholeTilesInOrder) {
  for (const unsigned threads : {1U, 2U, 4U}) {
    const ThreadLimit limit(threads);
    bool ran = true;
    TakeFault();
    EXPECT_LE(WrittenTiles(End::kFalse, ran), 30U);
    EXPECT_FALSE(ran);
    EXPECT_EQ(TakeFault().ToUTF8(), "tile 30 has no sense");
    EXPECT_EQ(WrittenTiles(End::kReadFails, ran), 30U);
    EXPECT_FALSE(ran);
    EXPECT_LE(WrittenTiles(End::kThrow, ran), 30U);
    EXPECT_FALSE(ran);
    EXPECT_LE(WrittenTiles(End::kAbort, ran), 31U);
    EXPECT_TRUE(ran) << "an abort is no failure";
  }
}

TEST(MapTiles, TellsTheFaultOfAStripOnWhicheverThread) {
  const auto scene = MakeScene<float>(400, 400, 1, 4);
  const MemoryPtr<float> out(new MemoryTestRaster<float>(400, 400, 1));
  const auto body = [&](const Tile<float>&, Tile<float>&, const TilePart& part) {
    if (part.rowTo < 400) return true;
    SetFault("the last line");
    return false;
  };
  TakeFault();
  EXPECT_FALSE(MapTiles("Fails", TilesIn(scene, {400, 400}), RasterPtr<float>(out), body));
  EXPECT_EQ(TakeFault().ToUTF8(), "the last line");
}

TEST(MapTiles, RefusesRastersThatDoNotFit) {
  const auto scene = MakeScene<float>(40, 30, 1, 5);
  const MemoryPtr<float> out(new MemoryTestRaster<float>(40, 31, 1));
  const auto nothing = [](const auto&...) { FAIL() << "called"; };
  EXPECT_FALSE(MapTiles("Fits", TilesOf<float>(scene), RasterPtr<float>(out), nothing));
  EXPECT_EQ(TakeFault().ToUTF8(), "the rasters have 40 by 30 and 40 by 31 pixels");
  EXPECT_FALSE(MapTiles("Fits", TilesOf<float>(scene).With(RasterPtr<float>(out)),
                        RasterPtr<float>(scene), nothing));
  EXPECT_FALSE(MapTiles("Fits", TilesOf<float>({}), RasterPtr<float>(out), nothing));
  EXPECT_FALSE(MapTiles("Fits", TilesOf<float>(scene), RasterPtr<float>(), nothing));
  EXPECT_EQ(TakeFault().ToUTF8(), "a raster is missing");
}

TEST(ForEachTile, WorksOnSeveralTilesAtOnce) {
  if (ThreadLimit::GetCurrent() < 2) GTEST_SKIP() << "there is one thread";
  const auto ramp = MakeRamp<float>(40, 4, 1);
  std::atomic<int> inside{0}, most{0};
  const auto body = [&](const Tile<float>&) {
    const int now = ++inside;
    for (int seen = most; seen < now && !most.compare_exchange_weak(seen, now);) continue;
    for (int wait = 0; wait < 2000 && most < 2; ++wait)
      std::this_thread::sleep_for(std::chrono::milliseconds(1));
    --inside;
  };
  const auto tiles = TilesBy(RasterIteratorPtr<float>(new RasterIterator<float>(ramp, {1, 4})));
  EXPECT_TRUE(ForEachTile("Waits", tiles, body));
  EXPECT_GE(most, 2);
  EXPECT_EQ(ramp->reads, 40U);
}

TEST(CopyTiles, ChangesTilesOnTheWay) {
  const auto scene = MakeScene<std::uint8_t>(123, 45, 2, 6);
  const MemoryPtr<std::uint8_t> out(new MemoryTestRaster<std::uint8_t>(123, 45, 2));
  const auto mark = [](Tile<std::uint8_t>& tile, const TilePart& part) {
    for (unsigned y = part.rowFrom; y < part.rowTo; ++y) {
      const auto row = RowOf(tile, part, y);
      for (std::size_t i = 0; i < row.count; ++i)
        if (row.states[i] != 0) row.values[i] = 255;
    }
  };
  ASSERT_TRUE(CopyTiles("Mark", TilesIn(scene, {20, 20}), RasterPtr<std::uint8_t>(out), mark));
  for (std::size_t i = 0; i < out->pixels.size(); ++i)
    ASSERT_EQ(out->pixels[i], scene->states[i] != 0 ? 255 : scene->pixels[i]);
  EXPECT_EQ(out->states, scene->states);
}

TEST(ReduceTiles, JoinsTilesInTheirOrderWithTheSameBitsForAnyThreads) {
  const auto scene = MakeScene<float>(517, 211, 2, 7);
  for (std::size_t i = 0; i < scene->pixels.size(); ++i) scene->pixels[i] *= 1.0F / 3;
  std::vector<std::pair<unsigned, unsigned>> want;
  for (unsigned row = 0; row < 6; ++row)
    for (unsigned column = 0; column < 14; ++column) want.emplace_back(column, row);

  std::map<double, unsigned> sums;
  for (const unsigned threads : {1U, 2U, 3U, 4U}) {
    const ThreadLimit limit(threads);
    std::vector<std::pair<unsigned, unsigned>> order;
    const auto indexOf = [](const Tile<float>& tile) { return std::vector{tile.Index()}; };
    const auto append = [](auto& left, const auto& right) {
      left.insert(left.end(), right.begin(), right.end());
    };
    EXPECT_TRUE(ReduceTiles("Order", TilesIn(scene, {37, 37}), order, indexOf, append));
    EXPECT_EQ(order, want);

    double sum = 0;
    const auto sumOf = [](const Tile<float>& tile, const TilePart& part) {
      double ofPart = 0;
      for (unsigned y = part.rowFrom; y < part.rowTo; ++y) {
        const auto row = RowOf(tile, part, y);
        for (std::size_t i = 0; i < row.count; ++i)
          ofPart += row.states[i] == 0 ? row.values[i] : 0;
      }
      return ofPart;
    };
    const auto add = [](double& left, double right) { left += right; };
    EXPECT_TRUE(ReduceTiles("Sum", TilesIn(scene, {517, 100}), sum, sumOf, add));
    ++sums[sum];
  }
  long double plain = 0;
  for (std::size_t i = 0; i < scene->pixels.size(); ++i)
    plain += scene->states[i] == 0 ? scene->pixels[i] : 0;
  ASSERT_EQ(sums.size(), 1U) << "other bits for another number of threads";
  EXPECT_NEAR(sums.begin()->first, static_cast<double>(plain), 1e-9 * static_cast<double>(plain));
}

TEST(ReduceTiles, FailsWithAPartOrAJoin) {
  const auto scene = MakeScene<float>(300, 300, 1, 8);
  const auto tiles = TilesIn(scene, {300, 150});
  int total = 0;
  const auto part = [](const Tile<float>& tile, const TilePart& strip) -> std::optional<int> {
    if (tile.Index().second == 0 || strip.rowFrom == 0) return 1;
    SetFault("no sense");
    return std::nullopt;
  };
  const auto add = [](int& left, int right) { left += right; };
  EXPECT_FALSE(ReduceTiles("Fails", tiles, total, part, add));
  EXPECT_EQ(TakeFault().ToUTF8(), "no sense");
  const auto one = [](const Tile<float>&) { return 1; };
  EXPECT_FALSE(ReduceTiles("Fails", tiles, total, one, [](int&, int) { return false; }));

  const IPC ipc;
  ipc.abort->Set(true);
  EXPECT_TRUE(ReduceTiles("Aborted", tiles, total, part, add, ipc));
}

}  // namespace
}  // namespace lumo
