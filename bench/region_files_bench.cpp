// A file of 10 million regions with one band and the five spectral attributes (200 MB, in the page
// cache), region by region, beside pread and pwrite of the same bytes by blocks as large as a page
// of the file, whose values are used in the same way. Aim: in order within 2 times of that.

#include <cstdlib>
#include <filesystem>
#include <utility>
#include <vector>

#include <benchmark/benchmark.h>

#include "fx/region_kinds.h"
#include "support/temporary_directory.h"

namespace {

using lumo::SpectralRegionAttributesFile;
using lumo::String;
using lumo::URI;
using lumo::platform::RandomAccessFile;

constexpr unsigned kRegions = 10'000'000;
constexpr unsigned kAttributes = SpectralRegionAttributesFile::kAttributes;
constexpr std::size_t kElements = std::size_t{kRegions} * kAttributes;
constexpr std::size_t kBlock = 16384;  // elements
constexpr unsigned kTouched = 100'000;

void Require(bool holds) {
  if (!holds) std::abort();
}

float ValueAt(std::size_t element) {
  return static_cast<float>(element % 1021);
}

std::string PathOf(const char* name) {
  static const lumo::test::TemporaryDirectory directory;
  return (directory.Path() / name).string();
}

URI UriOf(const char* name) {
  return URI{String(PathOf(name))};
}

void WriteAll(const char* name) {
  std::filesystem::remove(PathOf(name));
  SpectralRegionAttributesFile store(UriOf(name), 1U);
  for (unsigned region = 0; region < kRegions; ++region) {
    for (unsigned attribute = 0; attribute < kAttributes; ++attribute) {
      store.Value(region, 0, attribute) = ValueAt(std::size_t{region} * kAttributes + attribute);
    }
  }
  Require(store.Close());
}

/// The file that is read, made at the first use.
const char* Made() {
  static const bool made = [] {
    WriteAll("made");
    return true;
  }();
  Require(made);
  return "made";
}

/// Sums of which only the total leaves a function stay in registers. The plain loop is faster
/// without it, and has it so.
double Total(const double (&sums)[kAttributes]) {
  double total = 0;
  for (const double sum : sums) total += sum;
  return total;
}

void SetBytes(benchmark::State& state, std::size_t elements) {
  state.SetBytesProcessed(static_cast<std::int64_t>(elements * sizeof(float)) *
                          static_cast<std::int64_t>(state.iterations()));
}

void Write_InOrder(benchmark::State& state) {
  for (auto _ : state) WriteAll("written");
  SetBytes(state, kElements);
}

void Baseline_Pwrite(benchmark::State& state) {
  std::vector<float> block(kBlock);
  for (auto _ : state) {
    std::filesystem::remove(PathOf("plain"));
    const auto file = RandomAccessFile::Create(PathOf("plain"));
    for (std::size_t at = 0; at < kElements; at += kBlock) {
      const std::size_t count = std::min(kBlock, kElements - at);
      for (std::size_t i = 0; i < count; ++i) block[i] = ValueAt(at + i);
      Require(file->Write(1024 + at * sizeof(float), block.data(), count * sizeof(float)));
    }
  }
  SetBytes(state, kElements);
}

void Read_InOrder(benchmark::State& state) {
  const SpectralRegionAttributesFile store(UriOf(Made()), false);
  for (auto _ : state) {
    double sums[kAttributes] = {};
    for (unsigned region = 0; region < kRegions; ++region) {
      for (unsigned attribute = 0; attribute < kAttributes; ++attribute) {
        sums[attribute] += store.Value(region, 0, attribute);
      }
    }
    benchmark::DoNotOptimize(Total(sums));
  }
  SetBytes(state, kElements);
}

void Baseline_Pread(benchmark::State& state) {
  const auto file = RandomAccessFile::Open(PathOf(Made()), RandomAccessFile::Access::kRead);
  constexpr std::size_t kWhole = kBlock / kAttributes * kAttributes;
  std::vector<float> block(kWhole);
  for (auto _ : state) {
    double sums[kAttributes] = {};
    for (std::size_t at = 0; at < kElements; at += kWhole) {
      const std::size_t count = std::min(kWhole, kElements - at);
      Require(file->Read(1024 + at * sizeof(float), block.data(), count * sizeof(float)));
      for (std::size_t i = 0; i < count; i += kAttributes) {
        for (unsigned attribute = 0; attribute < kAttributes; ++attribute) {
          sums[attribute] += block[i + attribute];
        }
      }
    }
    benchmark::DoNotOptimize(sums);
  }
  SetBytes(state, kElements);
}

/// Changes every value in its place.
void Update_InOrder(benchmark::State& state) {
  SpectralRegionAttributesFile store(UriOf(Made()), true);
  for (auto _ : state) {
    for (unsigned region = 0; region < kRegions; ++region) {
      for (unsigned attribute = 0; attribute < kAttributes; ++attribute) {
        store.Value(region, 0, attribute) += 1.0F;
      }
    }
  }
  Require(store.Close());
  SetBytes(state, kElements);
}

void Baseline_PreadPwrite(benchmark::State& state) {
  const auto file = RandomAccessFile::Open(PathOf(Made()), RandomAccessFile::Access::kUpdate);
  std::vector<float> block(kBlock);
  for (auto _ : state) {
    for (std::size_t at = 0; at < kElements; at += kBlock) {
      const std::size_t bytes = std::min(kBlock, kElements - at) * sizeof(float);
      Require(file->Read(1024 + at * sizeof(float), block.data(), bytes));
      for (float& value : block) value += 1.0F;
      Require(file->Write(1024 + at * sizeof(float), block.data(), bytes));
    }
  }
  SetBytes(state, kElements);
}

/// The region of a step, all over the file.
unsigned RegionOf(unsigned step) {
  return static_cast<unsigned>(step * 2654435761U % kRegions);
}

void Read_AtRandom(benchmark::State& state) {
  const SpectralRegionAttributesFile store(UriOf(Made()), false);
  for (auto _ : state) {
    float sum = 0;
    for (unsigned i = 0; i < kTouched; ++i) sum += store.Value(RegionOf(i), 0, 2);
    benchmark::DoNotOptimize(sum);
  }
  state.SetItemsProcessed(state.iterations() * kTouched);
}

void Update_AtRandom(benchmark::State& state) {
  SpectralRegionAttributesFile store(UriOf(Made()), true);
  for (auto _ : state) {
    for (unsigned i = 0; i < kTouched; ++i) store.Value(RegionOf(i), 0, 2) += 1.0F;
  }
  Require(store.Close());
  state.SetItemsProcessed(state.iterations() * kTouched);
}

/// A value at a time, of which each window of the file reads a page.
void Baseline_PreadAtRandom(benchmark::State& state) {
  const auto file = RandomAccessFile::Open(PathOf(Made()), RandomAccessFile::Access::kRead);
  for (auto _ : state) {
    float sum = 0, value = 0;
    for (unsigned i = 0; i < kTouched; ++i) {
      const std::uint64_t element = std::uint64_t{RegionOf(i)} * kAttributes + 2;
      Require(file->Read(1024 + element * sizeof(float), &value, sizeof value));
      sum += value;
    }
    benchmark::DoNotOptimize(sum);
  }
  state.SetItemsProcessed(state.iterations() * kTouched);
}

BENCHMARK(Write_InOrder)->Unit(benchmark::kMillisecond);
BENCHMARK(Baseline_Pwrite)->Unit(benchmark::kMillisecond);
BENCHMARK(Read_InOrder)->Unit(benchmark::kMillisecond);
BENCHMARK(Baseline_Pread)->Unit(benchmark::kMillisecond);
BENCHMARK(Update_InOrder)->Unit(benchmark::kMillisecond);
BENCHMARK(Baseline_PreadPwrite)->Unit(benchmark::kMillisecond);
BENCHMARK(Read_AtRandom)->Unit(benchmark::kMillisecond);
BENCHMARK(Update_AtRandom)->Unit(benchmark::kMillisecond);
BENCHMARK(Baseline_PreadAtRandom)->Unit(benchmark::kMillisecond);

}  // namespace
