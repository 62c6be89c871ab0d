#include <cmath>
#include <cstdlib>
#include <cstring>
#include <numeric>

#include <benchmark/benchmark.h>

#include "raster/raster_tasks.h"
#include "stats/dynamic_raster_histogram.h"
#include "stats/dynamic_raster_stats.h"
#include "stats/raster_stats_process.h"
#include "support/test_rasters.h"
#include "tasks/thread_limit.h"

// Statistics and histograms of rasters in memory, beside the reading of the same blocks alone, and
// beside a plain copy of the same memory.

namespace lumo {
namespace {

constexpr unsigned kSamples = 4096;
constexpr unsigned kLines = 2048;

template <typename T>
Pointer<OrderedTestRaster<T>> MakeScene(unsigned bands, Interleave order, bool holes = false) {
  const Pointer<OrderedTestRaster<T>> scene(
      new OrderedTestRaster<T>(kSamples, kLines, bands, order));
  for (std::size_t i = 0; i < scene->pixels.size(); ++i) {
    scene->pixels[i] = static_cast<T>((i * 2654435761U >> 16) % 200 + i % 13);
    if (holes && i % 10 == 0) scene->states[i] = PixelValueState::NoData;
  }
  return scene;
}

template <typename T>
void SetBytes(benchmark::State& state, unsigned bands) {
  state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations()) * kSamples * kLines *
                          bands * static_cast<std::int64_t>(sizeof(T)));
}

/// Copies pixels and states once: what any read of a raster in memory does.
template <typename T, unsigned kBands>
void Baseline_Copy(benchmark::State& state) {
  const auto scene = MakeScene<T>(kBands, Interleave::BIP);
  std::vector<T> pixels(scene->pixels.size());
  std::vector<unsigned char> states(scene->states.size());
  for (auto _ : state) {
    std::memcpy(pixels.data(), scene->pixels.data(), pixels.size() * sizeof(T));
    std::memcpy(states.data(), scene->states.data(), states.size());
    benchmark::ClobberMemory();
  }
  SetBytes<T>(state, kBands);
}

/// Reads all blocks and looks at nothing.
template <typename T, unsigned kBands>
void Baseline_Read(benchmark::State& state) {
  const auto scene = MakeScene<T>(kBands, Interleave::BIP);
  RasterIteratorStream<T> iterator(scene);
  Tile<T> tile;
  for (auto _ : state) {
    for (unsigned row = 0; row < iterator.Rows(); ++row) {
      for (unsigned column = 0; column < iterator.Columns(); ++column) {
        if (!iterator.Read(column, row, tile)) std::abort();
      }
    }
  }
  SetBytes<T>(state, kBands);
}

/// The mean of band 0 by the plain running form.
template <typename T>
double PlainMean(const OrderedTestRaster<T>& scene) {
  LargeStatsAccumulator<T> plain;
  for (std::size_t line = 0; line < kLines; ++line) {
    for (std::size_t sample = 0; sample < kSamples; ++sample) {
      const std::size_t at = scene.At(sample, line, 0);
      if (scene.states[at] == 0) plain.Add(scene.pixels[at]);
    }
  }
  return plain.mean;
}

template <typename Stats, typename T>
bool Run(const RasterIteratorPtr<T>& iterator, const Pointer<Stats>& stats) {
  RasterStatsProcess<T, Stats> process(iterator, stats);
  return process.RunProcess(process.kHere);
}

/// Arguments: threads, KiB of a block, 1 for pixels that do not count.
template <typename T, template <typename> typename Stats, unsigned kBands, Interleave kOrder>
void Statistics(benchmark::State& state) {
  const ThreadLimit limit(static_cast<unsigned>(state.range(0)));
  const auto scene = MakeScene<T>(kBands, kOrder, state.range(2) != 0);
  const RasterIteratorPtr<T> iterator(
      new RasterIteratorStream<T>(scene, static_cast<unsigned>(state.range(1)) * 1024));
  const Pointer<Stats<T>> stats(new Stats<T>);
  if (!Run(iterator, stats)) std::abort();
  const double mean = PlainMean(*scene);
  if (std::fabs(stats->Means()[0] - mean) > 1e-11 * mean) std::abort();
  for (auto _ : state) {
    if (!Run(iterator, stats)) std::abort();
  }
  SetBytes<T>(state, kBands);
}

/// Arguments: threads, bins, 1 for statistics of the same raster at the same time.
template <typename T, unsigned kBands, Interleave kOrder>
void Histogram(benchmark::State& state) {
  const ThreadLimit limit(static_cast<unsigned>(state.range(0)));
  const auto scene = MakeScene<T>(kBands, kOrder);
  const auto bins = static_cast<unsigned>(state.range(1));
  DynamicRasterHistogram<T> histogram(scene.Get());
  DynamicRasterStats<T> stats(scene.Get());
  for (auto _ : state) {
    AsyncPtr both[2] = {histogram.HistogramAllBands(0, 255, bins, HistogramSign::kBoth, IPC()), {}};
    if (state.range(2) != 0) both[1] = stats.StatsBuild(IPC());
    for (const AsyncPtr& run : both) {
      if (run) run->WaitFinished();
    }
  }
  // Checked after the runs, which all leave the same: every pixel is in one bin.
  const auto counts = histogram.BandHistogram(kBands - 1)[0].counts;
  if (std::accumulate(counts.begin(), counts.end(), 0ULL) != std::uint64_t{kSamples} * kLines) {
    std::abort();
  }
  SetBytes<T>(state, kBands);
}

/// The running form, pixel by pixel, on one thread.
template <typename T, unsigned kBands>
void Baseline_RunningForm(benchmark::State& state) {
  const auto scene = MakeScene<T>(kBands, Interleave::BIP);
  for (auto _ : state) {
    std::vector<LargeStatsAccumulator<T>> bands(kBands);
    for (std::size_t i = 0; i < scene->pixels.size(); ++i) {
      if ((scene->states[i] & PixelValueState::NotValid) == 0)
        bands[i % kBands].Add(scene->pixels[i]);
    }
    benchmark::DoNotOptimize(bands.data());
  }
  SetBytes<T>(state, kBands);
}

constexpr Interleave kBIP = Interleave::BIP;
constexpr Interleave kBIL = Interleave::BIL;
constexpr Interleave kBSQ = Interleave::BSQ;

void Timed(benchmark::internal::Benchmark* bench) {
  bench->UseRealTime()->MeasureProcessCPUTime()->Unit(benchmark::kMillisecond);
}
void OnThreads(benchmark::internal::Benchmark* bench) {
  bench->ArgsProduct({{1, 2}, {1024}, {0, 1}})->Apply(Timed);
}
void OfBlocks(benchmark::internal::Benchmark* bench) {
  bench->ArgsProduct({{2}, {128, 256, 512, 1024, 2048, 4096, 8192}, {0}})->Apply(Timed);
}
void Histograms(benchmark::internal::Benchmark* bench) {
  bench->ArgsProduct({{1, 2}, {256}, {0, 1}})->Apply(Timed);
}

BENCHMARK(Baseline_Copy<std::uint8_t, 6>)->Apply(Timed);
BENCHMARK(Baseline_Read<std::uint8_t, 6>)->Apply(Timed);
BENCHMARK(Statistics<std::uint8_t, RasterStats, 6, kBIP>)->Apply(OnThreads);
BENCHMARK(Statistics<std::uint8_t, RasterStats, 6, kBSQ>)->Apply(OnThreads);
BENCHMARK(Statistics<std::uint8_t, ExtendedRasterStats, 6, kBIP>)->Apply(OnThreads);
BENCHMARK(Histogram<std::uint8_t, 6, kBIP>)->Apply(Histograms);

BENCHMARK(Baseline_Copy<std::uint16_t, 6>)->Apply(Timed);
BENCHMARK(Baseline_Read<std::uint16_t, 6>)->Apply(Timed);
BENCHMARK(Statistics<std::uint16_t, RasterStats, 6, kBIP>)->Apply(OnThreads);
BENCHMARK(Statistics<std::uint16_t, RasterStats, 6, kBSQ>)->Apply(OnThreads);
BENCHMARK(Statistics<std::uint16_t, ExtendedRasterStats, 6, kBIP>)->Apply(OnThreads);
BENCHMARK(Histogram<std::uint16_t, 6, kBIP>)->Apply(Histograms);

BENCHMARK(Baseline_Copy<float, 6>)->Apply(Timed);
BENCHMARK(Baseline_Read<float, 6>)->Apply(Timed);
BENCHMARK(Statistics<float, RasterStats, 6, kBIP>)->Apply(OnThreads);
BENCHMARK(Statistics<float, RasterStats, 6, kBIL>)->Apply(OnThreads);
BENCHMARK(Statistics<float, RasterStats, 6, kBSQ>)->Apply(OnThreads);
BENCHMARK(Statistics<float, ExtendedRasterStats, 6, kBIP>)->Apply(OnThreads);
BENCHMARK(Histogram<float, 6, kBIP>)->Apply(Histograms);
BENCHMARK(Baseline_RunningForm<float, 6>)->Apply(Timed);

BENCHMARK(Statistics<std::uint8_t, RasterStats, 4, kBIP>)->Apply(OfBlocks);
BENCHMARK(Statistics<float, RasterStats, 4, kBIP>)->Apply(OfBlocks);

}  // namespace
}  // namespace lumo
