// Pyramids beside GDAL's overviews, in the same run and process, over one TIFF file of 4000 by 4000
// pixels and 6 bands: building levels 1 to 5 without statistics, and reading blocks of 256 by 256
// of level 1 at random places. Aims: not slower to build, twice the reads. First argument: a row of
// kTypes; second: 1 for a tiled file.

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <gdal.h>
#include <random>
#include <vector>

#include <benchmark/benchmark.h>

#include "data/data_manager.h"
#include "pyramid/pyramid_process.h"
#include "support/temporary_directory.h"
#include "views/sources/reader_raster.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

constexpr int kSide = 4000;
constexpr int kBands = 6;
constexpr int kBlock = 256;
constexpr unsigned kLevelMax = 5;

struct Type {
  const char* name;
  GDALDataType gdal;
  unsigned code;
};
const Type kTypes[] = {{"Byte", GDT_Byte, kDataTypeOf<std::uint8_t>},
                       {"UInt16", GDT_UInt16, kDataTypeOf<std::uint16_t>},
                       {"Float32", GDT_Float32, kDataTypeOf<float>}};

void Require(bool holds) {
  if (!holds) std::abort();
}

/// Fills a file with slopes and noise.
void FillFile(GDALDatasetH file) {
  std::mt19937 noise(1);
  std::vector<float> line(static_cast<std::size_t>(kSide) * kBands);
  for (int y = 0; y < kSide; ++y) {
    for (std::size_t i = 0; i < line.size(); ++i) {
      const auto slope = static_cast<float>((i / kBands + static_cast<std::size_t>(y)) / 40);
      line[i] = slope + static_cast<float>(noise() % 50);
    }
    Require(GDALDatasetRasterIO(file, GF_Write, 0, y, kSide, 1, line.data(), kSide, 1, GDT_Float32,
                                kBands, nullptr, kBands * 4, 0, 4) == CE_None);
  }
}

/// Makes a file at the first call; it goes with the program.
std::string PathOf(int row, bool isTiled) {
  static const test::TemporaryDirectory directory;
  const std::string name = std::string(kTypes[row].name) + (isTiled ? "_tiles.tif" : "_strips.tif");
  const std::string path = (directory.Path() / name).string();
  GDALAllRegister();
  if (fs::exists(path)) return path;
  const char* tiled[] = {"TILED=YES", "INTERLEAVE=PIXEL", nullptr};
  const char* strips[] = {"INTERLEAVE=BAND", nullptr};
  GDALDatasetH const file =
      GDALCreate(GDALGetDriverByName("GTiff"), path.c_str(), kSide, kSide, kBands, kTypes[row].gdal,
                 const_cast<char**>(isTiled ? tiled : strips));
  FillFile(file);
  GDALClose(file);
  return path;
}

void BuildOverviews(const std::string& path) {
  int factors[] = {2, 4, 8, 16, 32};
  GDALDatasetH const file = GDALOpen(path.c_str(), GA_ReadOnly);
  Require(GDALBuildOverviews(file, "NEAREST", 5, factors, 0, nullptr, nullptr, nullptr) == CE_None);
  GDALClose(file);
}

/// A raster with a pyramid file that is made, or is there.
template <typename T>
RasterPtr<T> OpenWithPyramid(const std::string& path, bool isNew) {
  DataManager& manager = GetGlobalDataManager();
  const RasterDataConnectionPtr source(
      manager.Connect(ConnStrings({"TIFF", String(path)}), GeoRefPtr(), MetadataPtr()));
  Require(bool(source));
  RasterDef def = source->RasterDef();
  def.format = "Pyramid";
  const Array<String> names = ConnStrings({"Pyramid", String(path + ".pyr")});
  const RasterDataConnectionPtr pyramid(isNew ? manager.CreateRaster(names, def)
                                              : manager.Connect(names, GeoRefPtr(), MetadataPtr()));
  Require(bool(pyramid));
  return RasterPtr<T>(new ReaderRaster<T>(source->RasterReaderDispatch()->Get<T>(), source,
                                          pyramid->RasterReaderDispatch()->Get<T>(), pyramid));
}

/// Builds the levels alone.
template <typename T>
void BuildPyramid(const std::string& path) {
  DataManager& manager = GetGlobalDataManager();
  const RasterDataConnectionPtr source(
      manager.Connect(ConnStrings({"TIFF", String(path)}), GeoRefPtr(), MetadataPtr()));
  RasterDef def = source->RasterDef();
  def.format = "Pyramid";
  const RasterDataConnectionPtr pyramid(
      manager.CreateRaster(ConnStrings({"Pyramid", String(path + ".pyr")}), def));
  const auto reader = source->RasterReaderDispatch()->Get<T>();
  const auto pyramidReader = pyramid->RasterReaderDispatch()->Get<T>();
  const RasterPtr<T> plain(new ReaderRaster<T>(reader, source));
  const RasterPtr<T> full(new ReaderRaster<T>(reader, source, pyramidReader, pyramid));
  constexpr unsigned kTile = 128;
  Require(pyramidReader->PyramidBuild(1, kLevelMax, 2, TileDimensions{kTile, kTile}));
  RasterPyramidDecimateRasterProcess<T> process({plain, full, 1, kLevelMax, kTile});
  Require(process.RunProcess(process.kHere));
  Require(full->PyramidRefresh());
}

template <typename Run>
void ForType(int row, const Run& run) {
  Require(DispatchType(TypeList<std::uint8_t, std::uint16_t, float>{}, kTypes[row].code,
                       [&]<typename T>() {
                         run.template operator()<T>();
                         return true;
                       }));
}

void BuildByGdal(benchmark::State& state) {
  const std::string path = PathOf(static_cast<int>(state.range(0)), state.range(1) != 0);
  state.SetLabel(fs::path(path).stem());
  for (auto _ : state) {
    fs::remove(path + ".ovr");
    BuildOverviews(path);
  }
}

void BuildByVexg(benchmark::State& state) {
  const std::string path = PathOf(static_cast<int>(state.range(0)), state.range(1) != 0);
  state.SetLabel(fs::path(path).stem());
  ForType(static_cast<int>(state.range(0)), [&]<typename T>() {
    for (auto _ : state) {
      fs::remove(path + ".pyr");
      BuildPyramid<T>(path);
    }
  });
}

/// Places of blocks in level 1, the same for every run.
std::vector<std::pair<int, int>> Places() {
  std::mt19937 random(7);
  std::vector<std::pair<int, int>> places(1024);
  for (auto& [x, y] : places) {
    x = static_cast<int>(random() % (kSide / 2 - kBlock));
    y = static_cast<int>(random() % (kSide / 2 - kBlock));
  }
  return places;
}

void ReadByGdal(benchmark::State& state) {
  const int row = static_cast<int>(state.range(0));
  const std::string path = PathOf(row, state.range(1) != 0);
  state.SetLabel(fs::path(path).stem());
  if (!fs::exists(path + ".ovr")) BuildOverviews(path);
  GDALDatasetH const file = GDALOpen(path.c_str(), GA_ReadOnly);
  GDALDatasetH const level = GDALGetBandDataset(GDALGetOverview(GDALGetRasterBand(file, 1), 0));
  Require(GDALGetRasterXSize(level) == kSide / 2);
  const int bytes = GDALGetDataTypeSizeBytes(kTypes[row].gdal);
  std::vector<char> block(static_cast<std::size_t>(kBlock * kBlock * kBands * bytes));
  const auto places = Places();
  std::size_t i = 0;
  for (auto _ : state) {
    const auto [x, y] = places[i++ % places.size()];
    Require(GDALDatasetRasterIO(level, GF_Read, x, y, kBlock, kBlock, block.data(), kBlock, kBlock,
                                kTypes[row].gdal, kBands, nullptr, kBands * bytes,
                                kBlock * kBands * bytes, bytes) == CE_None);
    benchmark::DoNotOptimize(block.data());
  }
  state.SetItemsProcessed(static_cast<std::int64_t>(state.iterations()));
  GDALClose(file);
}

void ReadByVexg(benchmark::State& state) {
  const int row = static_cast<int>(state.range(0));
  const std::string path = PathOf(row, state.range(1) != 0);
  state.SetLabel(fs::path(path).stem());
  ForType(row, [&]<typename T>() {
    if (!fs::exists(path + ".pyr")) BuildPyramid<T>(path);
    const RasterPtr<T> raster = OpenWithPyramid<T>(path, false);
    const RasterPtr<T> level = raster->PyramidLevel(1);
    Array<unsigned> bands{ArrayDims(kBands)};
    for (unsigned b = 0; b < kBands; ++b) bands[b] = b;
    Array<T> block, full;
    Array<unsigned char> states;
    const auto places = Places();
    const auto read = [&](Raster<T>& from, int x, int y, int side, Array<T>& into) {
      Require(from.GetSubRect(
          {static_cast<unsigned>(x), static_cast<unsigned>(y), static_cast<unsigned>(x + side - 1),
           static_cast<unsigned>(y + side - 1)},
          bands, Interleave::BIP, into, states));
    };
    read(*level, places[0].first, places[0].second, kBlock, block);
    read(*raster, 2 * places[0].first, 2 * places[0].second, 2 * kBlock, full);
    for (std::size_t k = 0; k < block.GetCount(); ++k) {
      const std::size_t pixel = k / kBands, px = pixel % kBlock, py = pixel / kBlock;
      Require(block[k] == full[(2 * py * 2 * kBlock + 2 * px) * kBands + k % kBands]);
    }
    std::size_t i = 0;
    for (auto _ : state) {
      const auto [x, y] = places[i++ % places.size()];
      read(*level, x, y, kBlock, block);
      benchmark::DoNotOptimize(block.GetData());
    }
    state.SetItemsProcessed(static_cast<std::int64_t>(state.iterations()));
  });
}

void Rows(benchmark::internal::Benchmark* bench) {
  bench->ArgsProduct({benchmark::CreateDenseRange(0, std::size(kTypes) - 1, 1), {0, 1}})
      ->UseRealTime();
}

BENCHMARK(BuildByGdal)->Apply(Rows)->Unit(benchmark::kMillisecond);
BENCHMARK(BuildByVexg)->Apply(Rows)->Unit(benchmark::kMillisecond);
BENCHMARK(ReadByGdal)->Apply(Rows)->Unit(benchmark::kMicrosecond);
BENCHMARK(ReadByVexg)->Apply(Rows)->Unit(benchmark::kMicrosecond);

}  // namespace
}  // namespace lumo
