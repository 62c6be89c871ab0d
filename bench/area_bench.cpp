#include <cstdlib>

#include <benchmark/benchmark.h>

#include "geometry/geometry.h"
#include "regions/roi_def.h"
#include "stats/raster_stats_process.h"
#include "support/test_rasters.h"
#include "views/masked_raster.h"
#include "views/no_data_raster.h"
#include "views/roi_raster.h"
#include "views/spatial_subset_raster.h"
#include "views/spectral_subset_raster.h"

// Views that say which pixels count, beside the raster that they stand on. Goals, of times in one
// run: the read of tiles wholly inside a region at most 1.05 of Read_Plain; statistics inside a
// region at most 1.2 of those of the rectangle around it, Statistics_Rectangle.

namespace lumo {
namespace {

using Pixel = std::uint16_t;
using View = RasterPtr<Pixel>;
constexpr unsigned kSize = 4096, kBands = 3;
const SubRect kAround(400, 300, 3600, 3700);

View MakeScene() {
  const Pointer<OrderedTestRaster<Pixel>> scene(
      new OrderedTestRaster<Pixel>(kSize, kSize, kBands, Interleave::BIP));
  for (std::size_t i = 0; i < scene->pixels.size(); ++i) {
    scene->pixels[i] = static_cast<Pixel>((i * 2654435761U >> 16) % 200 + i % 13);
  }
  return scene;
}

ROIDefPtr MakeRegion(const std::vector<Point2D<double>>& ring) {
  const Pointer<MemoryGeometry> geometry(new MemoryGeometry(CoordSys()));
  std::uint32_t record = 0, part = 0;
  if (!geometry->AddRecord(kPolygonRecord, record) ||
      !geometry->AddPart(record, false, part, MakeArray<Point2D<double>>(ring))) {
    std::abort();
  }
  return ROIDefPtr(new GeometryROIDef(geometry));
}

View Plain(const View& scene) {
  return scene;
}
View InsideRegion(const View& scene) {
  return View(new ROIRaster<Pixel>(
      scene,
      MakeRegion({{-9, -9}, {kSize + 9.0, -9}, {kSize + 9.0, kSize + 9.0}, {-9, kSize + 9.0}})));
}
View PartlyInRegion(const View& scene) {
  return View(new ROIRaster<Pixel>(
      scene, MakeRegion({{400.3, 900.2}, {2000.7, 300.4}, {3600.2, 1500.5}, {1900.1, 3700.6}})));
}
template <unsigned kStep>
View Masked(const View& scene) {
  const View band(new SpectralSubsetRaster<Pixel>(scene, MakeArray<unsigned>({1})));
  Array<RasterMaskDef<Pixel>> defs{ArrayDims(1)};
  defs[0].values.Resize(ArrayDims(200 / kStep));
  for (unsigned i = 0; i < defs[0].values.GetCount(); ++i) {
    defs[0].values[i] = static_cast<Pixel>(i * kStep);
  }
  return View(new MaskedRaster<Pixel>(scene, RasterMaskPtr(new RasterMask(band, defs))));
}
View NoData(const View& scene) {
  return View(new NoDataRaster<Pixel>(scene, MakeArray<Pixel>({7}), false));
}
View Rectangle(const View& scene) {
  return View(new SpatialSubsetRaster<Pixel>(scene, kAround, Form::kExact));
}
View RegionInRectangle(const View& scene) {
  return Rectangle(PartlyInRegion(scene));
}

/// Reads all tiles of 512 by 512.
template <View (*kView)(const View&)>
void Read(benchmark::State& state) {
  const View view = kView(MakeScene());
  RasterIteratorTile<Pixel> iterator(view);
  Tile<Pixel> tile;
  for (auto _ : state) {
    for (unsigned row = 0; row < iterator.Rows(); ++row) {
      for (unsigned column = 0; column < iterator.Columns(); ++column) {
        if (!iterator.Read(column, row, tile)) std::abort();
      }
    }
  }
}

template <View (*kView)(const View&)>
void Statistics(benchmark::State& state) {
  const View view = kView(MakeScene());
  for (auto _ : state) {
    const RasterIteratorPtr<Pixel> iterator(new RasterIteratorStream<Pixel>(view));
    const Pointer<RasterStats<Pixel>> stats(new RasterStats<Pixel>);
    RasterStatsProcess<Pixel, RasterStats<Pixel>> process(iterator, stats);
    if (!process.RunProcess(process.kHere)) std::abort();
  }
}

/// Reads a raster once and marks one value of one band.
void MakeMask(benchmark::State& state) {
  const View scene = MakeScene();
  for (auto _ : state) benchmark::DoNotOptimize(Masked<200>(scene));
}

#define VEXG_TIMED ->Unit(benchmark::kMillisecond)->MeasureProcessCPUTime()
BENCHMARK(Read<Plain>)->Name("Read_Plain") VEXG_TIMED;
BENCHMARK(Read<InsideRegion>)->Name("Read_InsideRegion") VEXG_TIMED;
BENCHMARK(Read<PartlyInRegion>)->Name("Read_PartlyInRegion") VEXG_TIMED;
BENCHMARK(Read<Masked<200>>)->Name("Read_MaskOfFew") VEXG_TIMED;
BENCHMARK(Read<Masked<2>>)->Name("Read_MaskOfMany") VEXG_TIMED;
BENCHMARK(Read<NoData>)->Name("Read_NoData") VEXG_TIMED;
BENCHMARK(Statistics<Rectangle>)->Name("Statistics_Rectangle") VEXG_TIMED;
BENCHMARK(Statistics<RegionInRectangle>)->Name("Statistics_RegionInRectangle") VEXG_TIMED;
BENCHMARK(MakeMask)->Name("MakeMask") VEXG_TIMED;

}  // namespace
}  // namespace lumo
