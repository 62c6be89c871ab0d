#include "gdal_levels.h"

#include <algorithm>

#include "gdal_common/level_number.h"

namespace lumo::gdal {
namespace {

unsigned SizeOf(int size) {
  return static_cast<unsigned>(std::max(size, 0));
}

/// Overview `index` of every band; without bands when the bands don't all have one of this size.
RasterLevel OverviewOf(const RasterLevel& full, int index) {
  RasterLevel level;
  for (const GDALRasterBandH band : full.bands) {
    const GDALRasterBandH overview =
        index < GDALGetOverviewCount(band) ? GDALGetOverview(band, index) : nullptr;
    const unsigned samples = overview != nullptr ? SizeOf(GDALGetRasterBandXSize(overview)) : 0;
    const unsigned lines = overview != nullptr ? SizeOf(GDALGetRasterBandYSize(overview)) : 0;
    if (samples == 0 || (level.samples != 0 && level.samples != samples) ||
        (level.lines != 0 && level.lines != lines)) {
      return {};
    }
    level.samples = samples;
    level.lines = lines;
    level.bands.push_back(overview);
  }
  GDALDatasetH const owner = GDALGetBandDataset(level.bands.front());
  if (owner == nullptr || SizeOf(GDALGetRasterXSize(owner)) != level.samples ||
      SizeOf(GDALGetRasterYSize(owner)) != level.lines) {
    return level;
  }
  for (std::size_t i = 0; i < level.bands.size(); ++i) {
    const auto number = static_cast<int>(i + 1);
    if (GDALGetRasterCount(owner) < number || GDALGetRasterBand(owner, number) != level.bands[i]) {
      return level;
    }
  }
  level.dataset = owner;
  return level;
}

}  // namespace

std::map<unsigned, RasterLevel> FindLevels(GDALDatasetH dataset) {
  std::map<unsigned, RasterLevel> levels;
  if (dataset == nullptr) return levels;
  RasterLevel& full = levels[0];
  full.dataset = dataset;
  full.samples = SizeOf(GDALGetRasterXSize(full.dataset));
  full.lines = SizeOf(GDALGetRasterYSize(full.dataset));
  for (int i = 1; i <= GDALGetRasterCount(full.dataset); ++i) {
    full.bands.push_back(GDALGetRasterBand(full.dataset, i));
  }
  std::map<unsigned, RasterLevel> reduced;
  const int count = GDALGetOverviewCount(full.bands.front());
  for (int i = 0; i < count; ++i) {
    RasterLevel level = OverviewOf(full, i);
    const unsigned number = LevelNumber(full.samples, full.lines, level.samples, level.lines);
    if (number != 0) reduced.try_emplace(number, std::move(level));
  }
  for (auto& [number, level] : reduced) {
    const unsigned last = levels.rbegin()->first;
    if (last != 0 && number != last + 1) break;
    levels.emplace(number, std::move(level));
  }
  return levels;
}

}  // namespace lumo::gdal
