#include <cstdlib>
#include <cstring>
#include <vector>

#include <benchmark/benchmark.h>

#include "raster/interleave.h"

// Changes of interleave, beside a plain copy of the same block. Arguments: bytes of an element,
// bands. Blocks have about 4 MiB, as the tiles of a run have.

namespace lumo {
namespace {

struct Block {
  explicit Block(const benchmark::State& state)
      : elementBytes(static_cast<std::size_t>(state.range(0))),
        bands(static_cast<std::size_t>(state.range(1))),
        lines((4U << 20) / (samples * bands * elementBytes)),
        from(Bytes()),
        to(Bytes()) {
    for (std::size_t i = 0; i < from.size(); ++i)
      from[i] = static_cast<unsigned char>(i * 31 + i / 7);
  }
  std::size_t Bytes() const { return samples * lines * bands * elementBytes; }

  std::size_t elementBytes;
  std::size_t bands;
  std::size_t samples = 1000;
  std::size_t lines;
  std::vector<unsigned char> from;
  std::vector<unsigned char> to;
};

void Check(const Block& block, Interleave order, bool fromPixels) {
  const std::size_t pixels = block.samples * block.lines;
  for (std::size_t pixel = 0; pixel < pixels; ++pixel) {
    const std::size_t line = pixel / block.samples;
    const std::size_t sample = pixel % block.samples;
    for (std::size_t band = 0; band < block.bands; ++band) {
      const std::size_t bip = pixel * block.bands + band;
      const std::size_t other = order == Interleave::BSQ
                                    ? band * pixels + pixel
                                    : (line * block.bands + band) * block.samples + sample;
      const std::size_t from = (fromPixels ? bip : other) * block.elementBytes;
      const std::size_t to = (fromPixels ? other : bip) * block.elementBytes;
      if (std::memcmp(&block.from[from], &block.to[to], block.elementBytes) != 0) std::abort();
    }
  }
}

void Convert(benchmark::State& state, Interleave from, Interleave to) {
  Block block(state);
  const auto convert = [&] {
    ConvertInterleave(block.from.data(), from, block.to.data(), to, block.samples, block.lines,
                      block.bands, block.elementBytes);
  };
  convert();
  Check(block, from == Interleave::BIP ? to : from, from == Interleave::BIP);
  for (auto _ : state) {
    convert();
    benchmark::ClobberMemory();
  }
  state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations() * block.Bytes()));
}

void Baseline_memcpy(benchmark::State& state) {
  Block block(state);
  for (auto _ : state) {
    std::memcpy(block.to.data(), block.from.data(), block.Bytes());
    benchmark::ClobberMemory();
  }
  state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations() * block.Bytes()));
}

void BipToBsq(benchmark::State& state) {
  Convert(state, Interleave::BIP, Interleave::BSQ);
}
void BsqToBip(benchmark::State& state) {
  Convert(state, Interleave::BSQ, Interleave::BIP);
}
void BipToBil(benchmark::State& state) {
  Convert(state, Interleave::BIP, Interleave::BIL);
}
void BilToBip(benchmark::State& state) {
  Convert(state, Interleave::BIL, Interleave::BIP);
}

const std::vector<std::vector<std::int64_t>> kShapes{{1, 2, 4}, {3, 4, 6, 200}};

BENCHMARK(Baseline_memcpy)->ArgsProduct(kShapes);
BENCHMARK(BipToBsq)->ArgsProduct(kShapes);
BENCHMARK(BsqToBip)->ArgsProduct(kShapes);
BENCHMARK(BipToBil)->ArgsProduct(kShapes);
BENCHMARK(BilToBip)->ArgsProduct(kShapes);

}  // namespace
}  // namespace lumo
