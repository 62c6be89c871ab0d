// Bytes per second of ORVA rasters whose files lie in the page cache, beside memcpy of the same
// bytes, and of writing beside write(2). Aim: a whole scene at 0.7 of memcpy's rate, directly and
// through the proxy; writing near the system's rate. The block rates count the bytes asked for.

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <map>
#include <numeric>
#include <string>
#include <vector>

#include <benchmark/benchmark.h>

#include "data/data_manager.h"
#include "data/raster_reader.h"
#include "platform/random_access_file.h"
#include "support/temporary_directory.h"

namespace {

using lumo::Array;
using lumo::ArrayDims;
using lumo::Interleave;
using lumo::RasterDataConnectionPtr;
using lumo::RasterReaderPtr;
using lumo::String;
using Pixel = std::uint16_t;

constexpr unsigned kSamples = 4096, kLines = 4096, kBands = 4;  // 128 MiB
constexpr std::size_t kElements = std::size_t{kSamples} * kLines * kBands;

void Require(bool holds) {
  if (!holds) std::abort();
}

Pixel ValueAt(std::size_t element) {
  return static_cast<Pixel>(element * 40503 >> 3);
}

/// The scenes, made at the first use, without the library.
std::string SceneFile(Interleave interleave, bool swapped, bool hasNoData) {
  static const lumo::test::TemporaryDirectory directory;
  static std::map<std::string, std::string> made;
  const std::string word = interleave == Interleave::BIP   ? "BIP"
                           : interleave == Interleave::BIL ? "BIL"
                                                           : "BSQ";
  std::string& path = made[word + (swapped ? "s" : "") + (hasNoData ? "n" : "")];
  if (!path.empty()) return path;
  path = (directory.Path() / ("scene" + std::to_string(made.size()))).string();
  std::vector<Pixel> pixels(kElements);
  for (std::size_t i = 0; i < kElements; ++i) pixels[i] = ValueAt(i);
  std::ofstream(path, std::ios::binary)
      .write(reinterpret_cast<const char*>(pixels.data()), kElements * sizeof(Pixel));
  std::ofstream(path + ".hdr") << "ORVA\nsamples = " << kSamples << "\nlines = " << kLines
                               << "\nbands = " << kBands
                               << "\nheader offset = 0\ndata type = UInt16\ninterleave = " << word
                               << "\nbyte order = " << (swapped ? "big" : "little") << " endian\n"
                               << (hasNoData ? "no data values = {7, 7, 9, none}\n" : "")
                               << "end = ORVA\n";
  return path;
}

Array<String> Strings(const std::string& path) {
  Array<String> strings{ArrayDims(2)};
  strings[0] = "ORVA";
  strings[1] = String(path);
  return strings;
}

struct Source {
  Source(const std::string& path, bool proxy) {
    lumo::DataManager& manager = lumo::GetGlobalDataManager();
    connection = proxy ? manager.Connect(Strings(path), {}, {})
                       : manager.ConnectDirect(Strings(path), {}, {});
    Require(bool(connection));
    reader = connection->RasterReaderDispatch()->Get<Pixel>();
    Require(bool(reader));
  }
  RasterDataConnectionPtr connection;
  RasterReaderPtr<Pixel> reader;
};

Array<unsigned> Bands(std::initializer_list<unsigned> list) {
  Array<unsigned> bands{ArrayDims(static_cast<unsigned>(list.size()))};
  std::copy(list.begin(), list.end(), bands.begin());
  return bands;
}

std::vector<Pixel>& Pixels() {
  static std::vector<Pixel> pixels(kElements);
  return pixels;
}

std::vector<unsigned char>& State() {
  static std::vector<unsigned char> state(kElements);
  return state;
}

void Memcpy(benchmark::State& state) {
  const std::vector<Pixel> from(kElements, 1);
  std::fill(Pixels().begin(), Pixels().end(), Pixel{0});
  for (auto _ : state) {
    std::memcpy(Pixels().data(), from.data(), kElements * sizeof(Pixel));
    benchmark::ClobberMemory();
  }
  state.SetBytesProcessed(state.iterations() *
                          static_cast<std::int64_t>(kElements * sizeof(Pixel)));
}
BENCHMARK(Memcpy)->UseRealTime();

void ReadScene(benchmark::State& state, Interleave interleave, bool proxy, bool swapped = false,
               bool hasNoData = false) {
  const Source source(SceneFile(interleave, swapped, hasNoData), proxy);
  const Array<unsigned> bands = Bands({0, 1, 2, 3});
  const auto read = [&] {
    return source.reader->ReadPixels(0, 0, kSamples, kLines, bands, 0, Pixels().data(),
                                     State().data());
  };
  Require(read());
  for (std::size_t i = 0; i < kElements; i += 997) {
    const Pixel value = ValueAt(i);
    Require(Pixels()[i] == (swapped ? __builtin_bswap16(value) : value));
  }
  for (auto _ : state) Require(read());
  state.SetBytesProcessed(state.iterations() *
                          static_cast<std::int64_t>(kElements * sizeof(Pixel)));
}
BENCHMARK_CAPTURE(ReadScene, BIP, Interleave::BIP, false)->UseRealTime();
BENCHMARK_CAPTURE(ReadScene, BSQ, Interleave::BSQ, false)->UseRealTime();
BENCHMARK_CAPTURE(ReadScene, BIP_proxy, Interleave::BIP, true)->UseRealTime();
BENCHMARK_CAPTURE(ReadScene, BIP_swapped, Interleave::BIP, false, true)->UseRealTime();
BENCHMARK_CAPTURE(ReadScene, BIP_noData, Interleave::BIP, false, false, true)->UseRealTime();
BENCHMARK_CAPTURE(ReadScene, BSQ_noData, Interleave::BSQ, false, false, true)->UseRealTime();

/// Reads the scene by blocks of one size, some of its bands.
void ReadBlocks(benchmark::State& state, Interleave interleave, unsigned width, unsigned height,
                std::initializer_list<unsigned> chosen) {
  const Source source(SceneFile(interleave, false, false), false);
  const Array<unsigned> bands = Bands(chosen);
  for (auto _ : state) {
    for (unsigned top = 0; top < kLines; top += height)
      for (unsigned left = 0; left < kSamples; left += width)
        Require(source.reader->ReadPixels(left, top, width, height, bands, 0, Pixels().data(),
                                          State().data()));
  }
  state.SetBytesProcessed(
      state.iterations() *
      static_cast<std::int64_t>(kElements / kBands * chosen.size() * sizeof(Pixel)));
}
BENCHMARK_CAPTURE(ReadBlocks, BIP_512, Interleave::BIP, 512, 512, {0, 1, 2, 3})->UseRealTime();
BENCHMARK_CAPTURE(ReadBlocks, BIL_512, Interleave::BIL, 512, 512, {0, 1, 2, 3})->UseRealTime();
BENCHMARK_CAPTURE(ReadBlocks, BSQ_512, Interleave::BSQ, 512, 512, {0, 1, 2, 3})->UseRealTime();
BENCHMARK_CAPTURE(ReadBlocks, BIP_lines, Interleave::BIP, 4096, 256, {0, 1, 2, 3})->UseRealTime();
BENCHMARK_CAPTURE(ReadBlocks, BIP_1_of_4, Interleave::BIP, 4096, 256, {2})->UseRealTime();
BENCHMARK_CAPTURE(ReadBlocks, BIP_3_of_4, Interleave::BIP, 4096, 256, {2, 1, 0})->UseRealTime();
BENCHMARK_CAPTURE(ReadBlocks, BIL_1_of_4, Interleave::BIL, 4096, 256, {2})->UseRealTime();
BENCHMARK_CAPTURE(ReadBlocks, BSQ_1_of_4, Interleave::BSQ, 4096, 256, {2})->UseRealTime();

/// Reads the scene by blocks in an order of the axes, as rasters do. Arguments: samples and lines
/// of a block.
void ReadInOrder(benchmark::State& state, Interleave stored, Interleave order, bool hasNoData) {
  const Source source(SceneFile(stored, false, hasNoData), true);
  const Array<unsigned> bands = Bands({0, 1, 2, 3});
  const auto width = static_cast<unsigned>(state.range(0));
  const auto height = static_cast<unsigned>(state.range(1));
  Array<Pixel> pixels;
  Array<unsigned char> states;
  for (auto _ : state) {
    for (unsigned top = 0; top < kLines; top += height) {
      for (unsigned left = 0; left < kSamples; left += width) {
        const lumo::SubRect rect(left, top, left + width - 1, top + height - 1);
        Require(source.reader->ReadBlock(rect, bands, 0, order, pixels, states));
      }
    }
  }
  state.SetBytesProcessed(state.iterations() *
                          static_cast<std::int64_t>(kElements * sizeof(Pixel)));
}
void Blocks(benchmark::internal::Benchmark* bench) {
  bench->Args({512, 512})->Args({4096, 32})->Args({4096, 256})->Args({4096, 1024})->UseRealTime();
}
BENCHMARK_CAPTURE(ReadInOrder, BIP_as_BIP, Interleave::BIP, Interleave::BIP, false)->Apply(Blocks);
BENCHMARK_CAPTURE(ReadInOrder, BIP_as_BSQ, Interleave::BIP, Interleave::BSQ, false)->Apply(Blocks);
BENCHMARK_CAPTURE(ReadInOrder, BIP_as_BIL, Interleave::BIP, Interleave::BIL, false)->Apply(Blocks);
BENCHMARK_CAPTURE(ReadInOrder, BSQ_as_BIP, Interleave::BSQ, Interleave::BIP, false)->Apply(Blocks);
BENCHMARK_CAPTURE(ReadInOrder, noData_as_BSQ, Interleave::BIP, Interleave::BSQ, true)
    ->Apply(Blocks);

/// Writes the scene line block by line block over a file that has its pages already, so that the
/// rate is that of the calls and not of the disk.
template <typename Write>
void MeasureWriting(benchmark::State& state, Write&& write) {
  constexpr unsigned kHeight = 256;
  std::iota(Pixels().begin(), Pixels().end(), Pixel{0});
  const auto all = [&] {
    for (unsigned top = 0; top < kLines; top += kHeight) Require(write(top, kHeight));
  };
  all();
  for (auto _ : state) all();
  state.SetBytesProcessed(state.iterations() *
                          static_cast<std::int64_t>(kElements * sizeof(Pixel)));
}

void WriteScene(benchmark::State& state) {
  const lumo::test::TemporaryDirectory directory;
  lumo::RasterDef def;
  def.samples = kSamples;
  def.lines = kLines;
  def.bands = kBands;
  def.interleave = Interleave::BIP;
  def.dataType = lumo::kDataTypeOf<Pixel>;
  def.format = "ORVA";
  RasterDataConnectionPtr connection(
      lumo::GetGlobalDataManager().CreateRaster(Strings((directory.Path() / "new").string()), def));
  Require(bool(connection));
  const auto reader = connection->RasterReaderDispatch()->Get<Pixel>();
  const Array<unsigned> bands = Bands({0, 1, 2, 3});
  MeasureWriting(state, [&](unsigned top, unsigned height) {
    const std::size_t at = std::size_t{top} * kSamples * kBands;
    return reader->WritePixels(0, top, kSamples, height, bands, 0, &Pixels()[at], &State()[at]);
  });
}
BENCHMARK(WriteScene)->UseRealTime();

void WriteSystem(benchmark::State& state) {
  const lumo::test::TemporaryDirectory directory;
  const auto file = lumo::platform::RandomAccessFile::Create((directory.Path() / "new").string());
  Require(file != nullptr);
  MeasureWriting(state, [&](unsigned top, unsigned height) {
    const std::size_t line = std::size_t{kSamples} * kBands;
    return file->Write(top * line * sizeof(Pixel), &Pixels()[top * line],
                       height * line * sizeof(Pixel));
  });
}
BENCHMARK(WriteSystem)->UseRealTime();

void OpenRaster(benchmark::State& state) {
  const std::string path = SceneFile(Interleave::BIP, false, false);
  for (auto _ : state) const Source source(path, false);
}
BENCHMARK(OpenRaster)->UseRealTime();

}  // namespace
