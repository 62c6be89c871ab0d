#include "gdal_band_values.h"

#include <algorithm>
#include <climits>
#include <cmath>
#include <cpl_conv.h>
#include <cpl_string.h>
#include <cstdio>
#include <gdal_pam.h>
#include <memory>
#include <string>
#include <vector>

namespace lumo::gdal {
namespace {

constexpr const char* kMin = "STATISTICS_MINIMUM";
constexpr const char* kMax = "STATISTICS_MAXIMUM";
constexpr const char* kMean = "STATISTICS_MEAN";
constexpr const char* kStd = "STATISTICS_STDDEV";
constexpr const char* kApproximate = "STATISTICS_APPROXIMATE";
constexpr const char* kValidPercent = "STATISTICS_VALID_PERCENT";
constexpr const char* kRecord = "STATISTICS_RECORD";

std::string Item(GDALRasterBandH band, const char* name) {
  const char* const value = GDALGetMetadataItem(band, name, nullptr);
  return value != nullptr ? value : "";
}

/// The colour's own name when it has one in the table.
String NameOf(std::uint8_t r, std::uint8_t g, std::uint8_t b, std::uint8_t a) {
  const std::uint32_t value =
      r | std::uint32_t{g} << 8 | std::uint32_t{b} << 16 | std::uint32_t{a} << 24;
  for (const NamedColor& color : kNamedColors) {
    if (color.value == value && !color.isNull) return color.name;
  }
  char text[8];
  std::snprintf(text, sizeof text, "#%02x%02x%02x", r, g, b);
  return text;
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
  StoredStats stats{Item(band, kMin), Item(band, kMax),          Item(band, kMean),
                    Item(band, kStd), Item(band, kValidPercent), Item(band, kRecord)};
  const bool isWhole =
      !stats.min.empty() && !stats.max.empty() && !stats.mean.empty() && !stats.std.empty();
  // Statistics of a sample of the pixels are not those of the band.
  const std::string approximate = Item(band, kApproximate);
  if (!isWhole || (!approximate.empty() && CPLTestBool(approximate.c_str()))) return std::nullopt;
  return stats;
}

bool WriteStoredStats(GDALRasterBandH band, const StoredStats& stats) {
  const std::pair<const char*, const char*> items[] = {
      {kMin, stats.min.c_str()}, {kMax, stats.max.c_str()},       {kMean, stats.mean.c_str()},
      {kStd, stats.std.c_str()}, {kRecord, stats.record.c_str()},
  };
  for (const auto& [name, value] : items) {
    if (GDALSetMetadataItem(band, name, value, nullptr) != CE_None) return false;
  }
  for (const char* const name : {kApproximate, kValidPercent}) {
    if (!Item(band, name).empty()) GDALSetMetadataItem(band, name, nullptr, nullptr);
  }
  return true;
}

void DeleteStoredStats(GDALRasterBandH band) {
  if (Item(band, kMin).empty()) return;
  for (const char* const name : {kMin, kMax, kMean, kStd, kApproximate, kValidPercent, kRecord}) {
    GDALSetMetadataItem(band, name, nullptr, nullptr);
  }
}

void DeleteStoredPairs(GDALRasterBandH band) {
  std::string record = Item(band, kRecord);
  constexpr std::string_view kNone = "0: [] 0: []";
  record.erase(record.find_last_not_of(' ') + 1);
  if (record.empty() || record.ends_with(kNone)) return;
  GDALSetMetadataItem(band, kRecord, nullptr, nullptr);
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
    palette.Append(Color(NameOf(r, g, b, a), r, g, b, a));
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
