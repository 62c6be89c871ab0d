// Reading of large TIFF files through the plug-in, beside a plain loop of GDAL's own over the same
// blocks, on one thread, in the same run. Each pass opens the file anew, so that no block of it is
// in GDAL's cache. Aim: at least 0.8 of the plain loop. Argument: a row of kFiles.

#include <cstdlib>
#include <cstring>
#include <gdal.h>
#include <vector>

#include <benchmark/benchmark.h>

#include "data/data_manager.h"
#include "data/raster_reader.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

constexpr int kSide = 4096;
constexpr int kBands = 4;
constexpr int kLines = 256;  // of a block: 8 MiB

struct File {
  const char* name;
  std::vector<const char*> options;
};
const File kFiles[] = {
    {"strips by pixel", {"INTERLEAVE=PIXEL"}},
    {"strips by band", {"INTERLEAVE=BAND"}},
    {"tiles by pixel", {"INTERLEAVE=PIXEL", "TILED=YES"}},
    {"tiles by band", {"INTERLEAVE=BAND", "TILED=YES"}},
    {"deflated tiles", {"INTERLEAVE=PIXEL", "TILED=YES", "COMPRESS=DEFLATE", "PREDICTOR=2"}},
    {"deflated strips", {"INTERLEAVE=PIXEL", "COMPRESS=DEFLATE"}},
    {"LZW tiles by band", {"INTERLEAVE=BAND", "TILED=YES", "COMPRESS=LZW"}},
};

using Pixels = std::vector<std::uint16_t>;

void Require(bool holds) {
  if (!holds) std::abort();
}

/// Makes the files at the first call; they go with the program.
std::string PathOf(int row) {
  static const test::TemporaryDirectory directory;
  const std::string path = (directory.Path() / (std::to_string(row) + ".tif")).string();
  GDALAllRegister();
  if (GDALIdentifyDriver(path.c_str(), nullptr) != nullptr) return path;
  std::vector<const char*> options = kFiles[row].options;
  options.push_back(nullptr);
  GDALDatasetH const file = GDALCreate(GDALGetDriverByName("GTiff"), path.c_str(), kSide, kSide,
                                       kBands, GDT_UInt16, const_cast<char**>(options.data()));
  Pixels line(kSide * kBands);
  for (int y = 0; y < kSide; ++y) {
    for (int i = 0; i < kSide * kBands; ++i) {
      line[static_cast<std::size_t>(i)] =
          static_cast<std::uint16_t>(1000 + i / 8 + y + (i * y) % 61);
    }
    Require(GDALDatasetRasterIO(file, GF_Write, 0, y, kSide, 1, line.data(), kSide, 1, GDT_UInt16,
                                kBands, nullptr, kBands * 2, kSide * kBands * 2, 2) == CE_None);
  }
  GDALClose(file);
  return path;
}

bool IsByPixel(int row) {
  return std::strcmp(kFiles[row].options[0], "INTERLEAVE=PIXEL") == 0;
}

template <typename Visit>
void ReadPlainly(int row, Pixels& block, Visit&& visit) {
  GDALDatasetH const file = GDALOpen(PathOf(row).c_str(), GA_ReadOnly);
  const bool byPixel = IsByPixel(row);
  for (int y = 0; y < kSide; y += kLines) {
    Require(GDALDatasetRasterIO(file, GF_Read, 0, y, kSide, kLines, block.data(), kSide, kLines,
                                GDT_UInt16, kBands, nullptr, byPixel ? kBands * 2 : 2,
                                byPixel ? kSide * kBands * 2 : kSide * 2,
                                byPixel ? 2 : kSide * kLines * 2) == CE_None);
    visit();
  }
  GDALClose(file);
}

template <typename Visit>
void ReadByPlugin(int row, Pixels& block, Visit&& visit) {
  const RasterDataConnectionPtr source(GetGlobalDataManager().Connect(
      ConnStrings({"TIFF", String(PathOf(row))}), GeoRefPtr(), MetadataPtr()));
  Require(bool(source));
  const auto reader = source->RasterReaderDispatch()->Get<std::uint16_t>();
  std::vector<unsigned char> state(block.size());
  Array<unsigned> bands{ArrayDims(kBands)};
  for (unsigned i = 0; i < kBands; ++i) bands[i] = i;
  for (unsigned y = 0; y < kSide; y += kLines) {
    Require(reader->ReadPixels(0, y, kSide, kLines, bands, 0, block.data(), state.data()));
    visit();
  }
}

/// One number of all pixels, so that two ways of reading can be compared.
template <typename Read>
std::uint64_t Digest(Read&& read, int row) {
  Pixels block(kSide * kLines * kBands);
  std::uint64_t digest = 0;
  read(row, block, [&] {
    for (const std::uint16_t pixel : block) digest = digest * 31 + pixel;
  });
  return digest;
}

template <typename Read>
void Run(benchmark::State& state, Read&& read) {
  const auto row = static_cast<int>(state.range(0));
  state.SetLabel(kFiles[row].name);
  PathOf(row);
  Pixels block(kSide * kLines * kBands);
  for (auto _ : state) read(row, block, [&] { benchmark::DoNotOptimize(block.data()); });
  state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations()) * kSide * kSide * kBands *
                          2);
}

void PlainLoop(benchmark::State& state) {
  Run(state, [](auto&&... args) { ReadPlainly(args...); });
}

void Plugin(benchmark::State& state) {
  const auto row = static_cast<int>(state.range(0));
  Require(Digest([](auto&&... args) { ReadPlainly(args...); }, row) ==
          Digest([](auto&&... args) { ReadByPlugin(args...); }, row));
  Run(state, [](auto&&... args) { ReadByPlugin(args...); });
}

BENCHMARK(PlainLoop)
    ->DenseRange(0, std::size(kFiles) - 1)
    ->MeasureProcessCPUTime()
    ->UseRealTime()
    ->Unit(benchmark::kMillisecond);
BENCHMARK(Plugin)
    ->DenseRange(0, std::size(kFiles) - 1)
    ->MeasureProcessCPUTime()
    ->UseRealTime()
    ->Unit(benchmark::kMillisecond);

}  // namespace
}  // namespace lumo
