#include <algorithm>
#include <cmath>
#include <cstdlib>

#include <benchmark/benchmark.h>

#include "../tests/support/test_rasters.h"
#include "foundation/scalar.h"
#include "raster/tile_functions.h"
#include "tasks/thread_limit.h"

// Measures the cost of a pipeline: the overhead of a token, and a chain that reads, computes and
// writes beside a plain loop over the same memory.

namespace lumo {
namespace {

/// Does nothing, `left` times.
class CountTask final : public SequentialTask {
 public:
  explicit CountTask(ArgList& setup) : SequentialTask("CountTask") {
    left_ = *FindScalarValue<std::int64_t>(setup.Get(0));
  }
  bool Execute(ArgList&) override { return left_-- > 0; }

 private:
  std::int64_t left_;
};

class EmptyTask final : public SequentialTask {
 public:
  explicit EmptyTask(ArgList&) : SequentialTask("EmptyTask") {}
  bool Execute(ArgList&) override { return true; }
};

class CountProcess final : public ProcessBuilder<Process> {
 public:
  CountProcess(std::int64_t tokens, unsigned stages) : ProcessBuilder("CountProcess") {
    const auto id = MakeArray<ArgID>({0});
    GetPipeline().AddTask(0, TaskDescriptor(&count_, id, id));
    for (unsigned i = 1; i < stages; ++i) {
      GetPipeline().AddTask(i, TaskDescriptor(&empty_, id, id));
    }
    GetPipeline().SetTotalTokens(static_cast<std::uint64_t>(tokens));
    SetArg(0, ScalarPtr<std::int64_t>(new Scalar<std::int64_t>(tokens)));
    SetBuilt();
  }

 private:
  ManagedTask<CountTask> count_;
  ManagedTask<EmptyTask> empty_;
};

/// Time per token of a chain whose stages do nothing. Arguments: threads, stages.
void TokenOverhead(benchmark::State& state) {
  constexpr std::int64_t kTokens = 20'000;
  const ThreadLimit limit(static_cast<unsigned>(state.range(0)));
  for (auto _ : state) {
    CountProcess process(kTokens, static_cast<unsigned>(state.range(1)));
    if (!process.RunProcess(0)) std::abort();
  }
  state.counters["per_token"] = benchmark::Counter(
      static_cast<double>(kTokens),
      benchmark::Counter::kIsIterationInvariantRate | benchmark::Counter::kInvert);
}
BENCHMARK(TokenOverhead)->ArgsProduct({{1, 2}, {3, 5}})->UseRealTime();

constexpr unsigned kSamples = 4096;
constexpr unsigned kLines = 2048;
constexpr unsigned kBands = 4;

/// Leaves a scaled value as it is.
struct Keep {
  double operator()(double value) const { return value; }
};

/// Brightness temperature of a radiance by Planck's law, with the constants of a thermal band at 11
/// micrometres (NASA, Landsat 8 Data Users Handbook, section 5).
struct Temperature {
  double operator()(double radiance) const {
    return 1321.08 / std::log(774.89 / (std::fabs(radiance) + 1) + 1);
  }
};

/// output = Op(gain[band] * input + offset[band]) for pixels with all their bands; 0 where the
/// state says that a pixel is not valid.
template <typename Op>
void ScalePixels(const std::int16_t* in, const unsigned char* state, float* out, std::size_t pixels,
                 const double* gains, const double* offsets) {
  for (std::size_t pixel = 0; pixel < pixels; ++pixel) {
    for (unsigned b = 0; b < kBands; ++b, ++in, ++state, ++out) {
      const double value = Op()(gains[b] * static_cast<double>(*in) + offsets[b]);
      *out = (*state & PixelValueState::NotValid) == 0 ? static_cast<float>(value) : 0.0F;
    }
  }
}

struct Scaling {
  Pointer<MemoryTestRaster<std::int16_t>> from{
      new MemoryTestRaster<std::int16_t>(kSamples, kLines, kBands)};
  Pointer<MemoryTestRaster<float>> to{new MemoryTestRaster<float>(kSamples, kLines, kBands)};
  double gains[kBands] = {0.1, 0.2, 0.3, 0.4};
  double offsets[kBands] = {1, 2, 3, 4};

  Scaling() {
    for (std::size_t i = 0; i < from->pixels.size(); ++i) {
      from->pixels[i] = static_cast<std::int16_t>(i * 7);
      from->states[i] = i % 1000 == 0 ? PixelValueState::NoData : PixelValueState::Valid;
    }
  }

  /// The same arithmetic on the whole rasters at once.
  template <typename Op>
  void PlainLoop() {
    ScalePixels<Op>(from->pixels.data(), from->states.data(), to->pixels.data(),
                    std::size_t{kSamples} * kLines, gains, offsets);
    std::ranges::copy(from->states, to->states.begin());
  }

  template <typename Op>
  bool Chain() {
    const auto scale = [&](const Tile<std::int16_t>& in, Tile<float>& out, const TilePart& part) {
      for (unsigned y = part.rowFrom; y < part.rowTo; ++y) {
        const auto row = RowOf(in, part, y);
        ScalePixels<Op>(row.values, row.states, RowOf(out, part, y).values, row.count / kBands,
                        gains, offsets);
      }
    };
    return MapTiles("Scale", TilesOf<std::int16_t>(from), RasterPtr<float>(to), scale);
  }
};

void SetPixels(benchmark::State& state) {
  state.SetItemsProcessed(state.iterations() * std::int64_t{kSamples} * kLines);
}

template <typename Op>
void Baseline_PlainLoop(benchmark::State& state) {
  Scaling scaling;
  scaling.PlainLoop<Op>();
  for (auto _ : state) {
    scaling.PlainLoop<Op>();
    benchmark::ClobberMemory();
  }
  SetPixels(state);
}

/// Argument: threads.
template <typename Op>
void ReadComputeWrite(benchmark::State& state) {
  Scaling scaling;
  scaling.PlainLoop<Op>();
  const auto want = scaling.to->pixels;
  const auto wantStates = scaling.to->states;
  std::ranges::fill(scaling.to->pixels, -1.0F);
  const ThreadLimit limit(static_cast<unsigned>(state.range(0)));
  if (!scaling.Chain<Op>() || scaling.to->pixels != want || scaling.to->states != wantStates) {
    std::abort();
  }
  for (auto _ : state) {
    if (!scaling.Chain<Op>()) std::abort();
    benchmark::ClobberMemory();
  }
  SetPixels(state);
}
BENCHMARK(Baseline_PlainLoop<Keep>)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(ReadComputeWrite<Keep>)->Arg(1)->Arg(2)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(Baseline_PlainLoop<Temperature>)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(ReadComputeWrite<Temperature>)
    ->Arg(1)
    ->Arg(2)
    ->UseRealTime()
    ->Unit(benchmark::kMillisecond);

}  // namespace
}  // namespace lumo
