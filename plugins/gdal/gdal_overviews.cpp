#include "gdal_overviews.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <filesystem>

#include "foundation/fault.h"
#include "foundation/staged_files.h"
#include "gdal_common/messages.h"

namespace lumo::gdal {
namespace {

/// Levels that are reduced further are read back, but not compared with the raster.
constexpr int kLargestCompared = 64;
/// So many places of a level are compared along each side.
constexpr int kPlaces = 8;

/// A level of a band, beside the band.
struct LevelPair {
  GDALRasterBandH full, level;
  int width, height;  // of the level
  double xRatio, yRatio;

  LevelPair(GDALRasterBandH band, GDALRasterBandH overview)
      : full(band),
        level(overview),
        width(GDALGetRasterBandXSize(overview)),
        height(GDALGetRasterBandYSize(overview)),
        xRatio(1.0 * GDALGetRasterBandXSize(band) / width),
        yRatio(1.0 * GDALGetRasterBandYSize(band) / height) {}
};

/// True when each block of a band has a place in its file, and can be read. One without a place
/// would read as zeros.
bool HasAllBlocks(GDALRasterBandH band) {
  int width = 0, height = 0;
  GDALGetBlockSize(band, &width, &height);
  GDALDatasetH const file = GDALGetBandDataset(band);
  const bool isTiff = file != nullptr && GDALGetDatasetDriver(file) == GDALGetDriverByName("GTiff");
  std::vector<unsigned char> block(
      std::size_t{1} * static_cast<unsigned>(width) * static_cast<unsigned>(height) *
      static_cast<unsigned>(GDALGetDataTypeSizeBytes(GDALGetRasterDataType(band))));
  for (int y = 0; y * height < GDALGetRasterBandYSize(band); ++y) {
    for (int x = 0; x * width < GDALGetRasterBandXSize(band); ++x) {
      const std::string place = "BLOCK_OFFSET_" + std::to_string(x) + "_" + std::to_string(y);
      if (isTiff && GDALGetMetadataItem(band, place.c_str(), "TIFF") == nullptr) return false;
      if (GDALReadBlock(band, x, y, block.data()) != CE_None) return false;
    }
  }
  return true;
}

/// Compares a pixel of a level with those of the raster that it may have come from: it is one of
/// them, or where the method mixes them, not far from them. False as well when it can't be read.
bool IsMadeOf(const LevelPair& pair, int x, int y, bool mixes) {
  const auto from = [](int place, double ratio) {
    return std::max(0, static_cast<int>(std::floor((place - 1) * ratio)) - 1);
  };
  const auto to = [](int place, double ratio, int size) {
    return std::min(size, static_cast<int>(std::ceil((place + 2) * ratio)) + 1);
  };
  const int left = from(x, pair.xRatio), top = from(y, pair.yRatio);
  const int width = to(x, pair.xRatio, GDALGetRasterBandXSize(pair.full)) - left;
  const int height = to(y, pair.yRatio, GDALGetRasterBandYSize(pair.full)) - top;
  std::vector<double> around(std::size_t{1} * static_cast<unsigned>(width) *
                             static_cast<unsigned>(height));
  double value = 0;
  if (GDALRasterIO(pair.level, GF_Read, x, y, 1, 1, &value, 1, 1, GDT_Float64, 0, 0) != CE_None ||
      GDALRasterIO(pair.full, GF_Read, left, top, width, height, around.data(), width, height,
                   GDT_Float64, 0, 0) != CE_None) {
    return false;
  }
  const bool isOne = std::any_of(around.begin(), around.end(), [&](double pixel) {
    return pixel == value || (std::isnan(pixel) && std::isnan(value));
  });
  if (isOne || !mixes) return isOne;
  double low = HUGE_VAL, high = -HUGE_VAL;
  for (const double pixel : around) {
    if (!std::isnan(pixel)) low = std::min(low, pixel), high = std::max(high, pixel);
  }
  // Cubic weights overshoot by less than the range, and whole numbers are rounded.
  const double beyond = high - low + 1;
  return std::isnan(value) || (value >= low - beyond && value <= high + beyond);
}

bool IsLevelOf(const LevelPair& pair, bool mixes) {
  if (!HasAllBlocks(pair.level)) return false;
  if (pair.xRatio > kLargestCompared || pair.yRatio > kLargestCompared) return true;
  const int columns = std::min(kPlaces, pair.width), rows = std::min(kPlaces, pair.height);
  const auto place = [](int i, int count, int size) {
    return count == 1 ? 0 : static_cast<int>(std::int64_t{i} * (size - 1) / (count - 1));
  };
  for (int i = 0; i < rows; ++i) {
    for (int j = 0; j < columns; ++j) {
      if (!IsMadeOf(pair, place(j, columns, pair.width), place(i, rows, pair.height), mixes)) {
        return false;
      }
    }
  }
  return true;
}

/// True for a level of the size that one of the factors gives.
bool IsOfFactor(const LevelPair& pair, const std::vector<int>& factors) {
  const auto sizeOf = [](int full, int factor) { return (full + factor - 1) / factor; };
  return std::any_of(factors.begin(), factors.end(), [&](int factor) {
    return pair.width == sizeOf(GDALGetRasterBandXSize(pair.full), factor) &&
           pair.height == sizeOf(GDALGetRasterBandYSize(pair.full), factor);
  });
}

/// Reads the built levels of a raster back. False, with the fault set, for one that isn't of the
/// raster.
bool AreLevelsWhole(GDALDatasetH dataset, const std::string& method,
                    const std::vector<int>& factors, const std::string& name) {
  const Messages messages(Messages::Damage::kIsError);
  for (int number = 1; number <= GDALGetRasterCount(dataset); ++number) {
    GDALRasterBandH const band = GDALGetRasterBand(dataset, number);
    // Colours of a palette are mixed, not their numbers.
    const bool mixes = method != "NEAREST" && method != "MODE";
    const bool isComparable = !mixes || GDALGetRasterColorTable(band) == nullptr;
    const int count = GDALGetOverviewCount(band);
    bool isWhole = count > 0;
    for (int i = 0; isWhole && i < count; ++i) {
      GDALRasterBandH const level = GDALGetOverview(band, i);
      if (level != nullptr && !IsOfFactor(LevelPair(band, level), factors)) continue;  // older
      isWhole = level != nullptr &&
                (isComparable ? IsLevelOf(LevelPair(band, level), mixes) : HasAllBlocks(level));
    }
    if (!isWhole || messages.HasError()) {
      return messages.Fail(name, "the levels that were built are not those of the raster");
    }
  }
  return true;
}

}  // namespace

bool BuildOverviews(GDALDatasetH dataset, const char* method, const std::vector<int>& factors,
                    const std::string& name) {
  const Messages messages(Messages::Damage::kIsError);
  std::vector<int> list = factors;
  const CPLErr result = GDALBuildOverviews(dataset, method, static_cast<int>(list.size()),
                                           list.data(), 0, nullptr, nullptr, nullptr);
  GDALFlushCache(dataset);
  return (result == CE_None && !messages.HasError()) || messages.Fail(name);
}

bool BuildOverviewsBeside(const Source& source, const Format& format, const char* method,
                          const std::vector<int>& factors) {
  StagedFiles staged(source.name);
  {
    const Messages messages;
    DatasetPtr dataset = OpenDataset(source, format, GDAL_OF_RASTER);
    if (dataset == nullptr || !BuildOverviews(dataset.get(), method, factors, source.name)) {
      return false;
    }
    dataset.reset();
    if (messages.HasError()) return messages.Fail(source.name);
  }
  const DatasetPtr built = OpenDataset(source, format, GDAL_OF_RASTER);
  if (built == nullptr || !AreLevelsWhole(built.get(), method, factors, source.name)) return false;
  std::string fault;
  return staged.MoveIn(fault) || FailWith(source.name, fault);
}

bool HasLevelFile(const std::string& raster) {
  std::error_code ignored;
  return std::filesystem::exists(raster + ".ovr", ignored);
}

}  // namespace lumo::gdal
