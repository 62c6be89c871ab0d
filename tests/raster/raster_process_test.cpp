#include <chrono>
#include <future>

#include "../../examples/scale_process.h"
#include "support/test_rasters.h"
#include "tasks/thread_limit.h"

namespace lumo {
namespace {

using In = std::int16_t;
using Out = float;

/// A ramp of 40 by 30 by 2 scaled into memory, in tiles of 7 by 5: 6 columns, 6 rows.
struct Scaling {
  Pointer<RampRaster<In>> ramp = MakeRamp<In>(40, 30, 2);
  Pointer<MemoryTestRaster<Out>> target{new MemoryTestRaster<Out>(40, 30, 2)};
  std::vector<double> gains{2, 3};
  std::vector<double> offsets{0.5, -1};
  RasterIteratorPtr<In> from{new RasterIterator<In>(ramp, {7, 5})};
  RasterPtr<Out> to{target};
  IPC ipc;

  bool Run() { return example::Scale(TilesBy(from), gains, offsets, to, ipc); }
  Out Want(unsigned sample, unsigned line, unsigned band) const {
    return static_cast<Out>(gains[band] * RampValue<In>(sample, line, band) + offsets[band]);
  }
  /// Tiles, in the order of reading, that were written whole; the rest must not be touched.
  unsigned WrittenTiles() const {
    unsigned written = 0;
    for (unsigned tile = 0; tile < 36; ++tile) {
      unsigned right = 0;
      unsigned untouched = 0;
      unsigned count = 0;
      for (unsigned line = tile / 6 * 5; line < tile / 6 * 5 + 5; ++line)
        for (unsigned sample = tile % 6 * 7; sample < std::min(tile % 6 * 7 + 7, 40U); ++sample)
          for (unsigned band = 0; band < 2; ++band, ++count) {
            const Out value = target->pixels[target->At(sample, line, band)];
            right += value == Want(sample, line, band);
            untouched += value == 0;
          }
      EXPECT_TRUE(right == count || untouched == count) << "tile " << tile << " is half written";
      if (right == count) {
        EXPECT_EQ(written, tile) << "a tile is missing before this one";
        ++written;
      }
    }
    return written;
  }
};

TEST(RasterProcess, ComputesEveryPixelForAnyNumberOfThreads) {
  for (const unsigned threads : {1U, 2U, 4U}) {
    const ThreadLimit limit(threads);
    Scaling scaling;
    EXPECT_TRUE(scaling.Run());
    EXPECT_EQ(scaling.WrittenTiles(), 36U);
    EXPECT_EQ(scaling.ipc.progress->GetProgress(), 1.0);
  }
}

TEST(RasterProcess, OfOneTileIsDoneByOneToken) {
  Scaling scaling;
  scaling.from = RasterIteratorPtr<In>(new RasterIterator<In>(scaling.ramp, {40, 30}));
  EXPECT_TRUE(scaling.Run());
  EXPECT_EQ(scaling.ramp->reads, 1U);
  EXPECT_EQ(scaling.WrittenTiles(), 36U);
}

TEST(RasterProcess, EndsAtATileThatCannotBeRead) {
  Scaling scaling;
  scaling.ramp->failAtRead = 20;
  EXPECT_FALSE(scaling.Run());
  EXPECT_EQ(scaling.WrittenTiles(), 20U);
}

TEST(RasterProcess, EndsAtATileThatCannotBeWritten) {
  Scaling scaling;
  scaling.to = MakeRamp<Out>(40, 30, 2);
  EXPECT_FALSE(scaling.Run());
}

TEST(RasterProcess, RefusesParametersThatItCannotUse) {
  Scaling few;
  few.gains.resize(1);
  EXPECT_FALSE(few.Run());
  EXPECT_EQ(few.WrittenTiles(), 0U);

  Scaling badIterator;
  badIterator.from = RasterIteratorPtr<In>(new RasterIterator<In>(RasterPtr<In>(), {7, 5}));
  EXPECT_FALSE(badIterator.Run());
  EXPECT_EQ(badIterator.ramp->reads, 0U);
}

TEST(RasterProcess, StopsAtAnAbortHalfWayWithWholeTilesOnly) {
  Scaling scaling;
  scaling.ramp->abort = scaling.ipc.abort;
  scaling.ramp->abortAtRead = 15;
  EXPECT_TRUE(scaling.Run()) << "an abort is no failure";
  EXPECT_LE(scaling.WrittenTiles(), 15U);
}

TEST(RasterProcess, OverASlowRasterEndsSoonAfterAnAbort) {
  Scaling scaling;
  scaling.ramp->delay = std::chrono::milliseconds(20);
  auto run = std::async(std::launch::async, [&] { return scaling.Run(); });
  while (scaling.ramp->reads < 3) std::this_thread::yield();
  const auto start = std::chrono::steady_clock::now();
  scaling.ipc.abort->Set(true);
  EXPECT_TRUE(run.get());
  const std::chrono::duration<double, std::milli> took = std::chrono::steady_clock::now() - start;
  RecordProperty("milliseconds", std::to_string(took.count()));
  EXPECT_LT(took.count(), 2000) << "the rule is 200 ms on an idle machine";
  EXPECT_LT(scaling.WrittenTiles(), 36U);
}

TEST(RasterProcess, UsesItsTilesAgain) {
  TilePool<float> pool;
  const Tile<float>* first = nullptr;
  {
    const TilePtr<float> tile = pool.Take();
    first = tile.Get();
    EXPECT_NE(pool.Take().Get(), first) << "still held";
  }
  EXPECT_EQ(pool.Take().Get(), first);
}

}  // namespace
}  // namespace lumo
