#include "gdal_band_values.h"

#include <algorithm>
#include <climits>
#include <cmath>
#include <cpl_conv.h>
#include <cpl_string.h>
#include <gdal_pam.h>
#include <memory>
#include <string>
#include <vector>

#include "gdal_common/color_name.h"

namespace lumo::gdal {
namespace {

std::string Item(GDALRasterBandH band, const char* name) {
  const char* const value = GDALGetMetadataItem(band, name, nullptr);
  return value != nullptr ? value : "";
}

/// Reaches what GDAL keeps of a band beside its file, and has no operation to remove.
class BesideBand : public GDALPamRasterBand {
 public:
  static void RemoveHistograms(GDALPamRasterBand& band) {
    GDALRasterBandPamInfo* const kept = band.*(&BesideBand::psPam);
    if (kept == nullptr || kept->psSavedHistograms == nullptr) return;
    CPLDestroyXMLNode(kept->psSavedHistograms);
    kept->psSavedHistograms = nullptr;
    (band.*(&BesideBand::MarkPamDirty))();
  }
};

class BesideDataset : public GDALPamDataset {
 public:
  static void DropUnsaved(GDALPamDataset& dataset) {
    dataset.*(&BesideDataset::nPamFlags) &= ~GPF_DIRTY;
  }
};

struct ColorTableDeleter {
  void operator()(void* table) const { GDALDestroyColorTable(table); }
};

}  // namespace

std::optional<StoredStats> ReadStoredStats(GDALRasterBandH band) {
  return StatsOfItems([band](const char* name) { return Item(band, name); });
}

bool WriteStoredStats(GDALRasterBandH band, const StoredStats& stats) {
  const std::pair<const char*, const char*> items[] = {
      {kStatsMin, stats.min.c_str()},       {kStatsMax, stats.max.c_str()},
      {kStatsMean, stats.mean.c_str()},     {kStatsStd, stats.std.c_str()},
      {kStatsRecord, stats.record.c_str()},
  };
  for (const auto& [name, value] : items) {
    if (GDALSetMetadataItem(band, name, value, nullptr) != CE_None) return false;
  }
  for (const char* const name : {kStatsApproximate, kStatsValidPercent}) {
    if (!Item(band, name).empty()) GDALSetMetadataItem(band, name, nullptr, nullptr);
  }
  return true;
}

void DeleteStoredStats(GDALRasterBandH band) {
  if (Item(band, kStatsMin).empty()) return;
  for (const char* const name : {kStatsMin, kStatsMax, kStatsMean, kStatsStd, kStatsApproximate,
                                 kStatsValidPercent, kStatsRecord}) {
    GDALSetMetadataItem(band, name, nullptr, nullptr);
  }
}

void DeleteStoredPairs(GDALRasterBandH band) {
  std::string record = Item(band, kStatsRecord);
  constexpr std::string_view kNone = "0: [] 0: []";
  record.erase(record.find_last_not_of(' ') + 1);
  if (record.empty() || record.ends_with(kNone)) return;
  GDALSetMetadataItem(band, kStatsRecord, nullptr, nullptr);
}

std::optional<StoredHistogram> ReadStoredHistogram(GDALRasterBandH band) {
  StoredHistogram histogram;
  int bins = 0;
  GUIntBig* counts = nullptr;
  const CPLErr result = GDALGetDefaultHistogramEx(band, &histogram.lowEdge, &histogram.highEdge,
                                                  &bins, &counts, FALSE, nullptr, nullptr);
  const std::unique_ptr<GUIntBig, decltype(&VSIFree)> owner(counts, &VSIFree);
  const bool isUsable =
      result == CE_None && counts != nullptr && bins > 0 && histogram.highEdge > histogram.lowEdge;
  if (!isUsable || !histogram.counts.Resize(ArrayDims(static_cast<unsigned>(bins)))) {
    return std::nullopt;
  }
  std::copy_n(counts, bins, histogram.counts.begin());
  return histogram;
}

bool WriteStoredHistogram(GDALRasterBandH band, const StoredHistogram& histogram) {
  std::vector<GUIntBig> counts(histogram.counts.begin(), histogram.counts.end());
  return GDALSetDefaultHistogramEx(band, histogram.lowEdge, histogram.highEdge,
                                   static_cast<int>(counts.size()), counts.data()) == CE_None;
}

void DeleteStoredHistograms(GDALRasterBandH band) {
  auto* const withSideFile = dynamic_cast<GDALPamRasterBand*>(GDALRasterBand::FromHandle(band));
  if (withSideFile != nullptr) BesideBand::RemoveHistograms(*withSideFile);
}

bool HasPalette(GDALRasterBandH band) {
  GDALColorTableH const table = GDALGetRasterColorTable(band);
  return table != nullptr && GDALGetColorEntryCount(table) > 0;
}

Palette ReadPalette(GDALRasterBandH band) {
  Palette palette;
  GDALColorTableH const table = GDALGetRasterColorTable(band);
  const int count = table != nullptr ? GDALGetColorEntryCount(table) : 0;
  for (int i = 0; i < count; ++i) {
    GDALColorEntry entry{};
    GDALGetColorEntryAsRGB(table, i, &entry);
    const auto part = [](short value) {
      return static_cast<std::uint8_t>(std::clamp<short>(value, 0, UCHAR_MAX));
    };
    const std::uint8_t r = part(entry.c1), g = part(entry.c2), b = part(entry.c3),
                       a = part(entry.c4);
    palette.Append(Color(ColorNameOf(r, g, b, a), r, g, b, a));
  }
  return palette;
}

bool WritePalette(GDALRasterBandH band, const Palette* palette) {
  if (palette == nullptr) return GDALSetRasterColorTable(band, nullptr) == CE_None;
  const std::unique_ptr<void, ColorTableDeleter> table(GDALCreateColorTable(GPI_RGB));
  Palette copy(*palette);
  for (unsigned i = 0; i < palette->GetCount(); ++i) {
    const Color& color = *copy.At(i);
    const GDALColorEntry entry{color.r, color.g, color.b, color.a};
    GDALSetColorEntry(table.get(), static_cast<int>(i), &entry);
  }
  return GDALSetRasterColorTable(band, table.get()) == CE_None;
}

void DropUnsaved(GDALDatasetH dataset) {
  auto* const withSideFile = dynamic_cast<GDALPamDataset*>(GDALDataset::FromHandle(dataset));
  if (withSideFile != nullptr) BesideDataset::DropUnsaved(*withSideFile);
}

}  // namespace lumo::gdal
