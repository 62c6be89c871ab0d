#pragma once

#include <charconv>
#include <cmath>
#include <limits>
#include <locale>
#include <optional>
#include <sstream>
#include <string>

#include "foundation/text_case.h"
#include "raster/band_values.h"
#include "raster/pixel_value.h"

namespace lumo::gdal {

/// A band's statistics as GDAL keeps them, as text so that whole numbers stay exact.
///
/// GDAL's deviation is divided by n, ours by n - 1, and it has no count and no sums. So ours stand
/// beside them in a record, which counts as long as GDAL's numbers are those it was written with.
struct StoredStats {
  std::string min, max, mean, std;
  std::string validPercent;  ///< share of the pixels that counted, rounded; "" where not known
  std::string record;        ///< the pixel count and the text form of RasterBandStats; or ""
};

inline constexpr const char* kStatsMin = "STATISTICS_MINIMUM";
inline constexpr const char* kStatsMax = "STATISTICS_MAXIMUM";
inline constexpr const char* kStatsMean = "STATISTICS_MEAN";
inline constexpr const char* kStatsStd = "STATISTICS_STDDEV";
inline constexpr const char* kStatsApproximate = "STATISTICS_APPROXIMATE";
inline constexpr const char* kStatsValidPercent = "STATISTICS_VALID_PERCENT";
inline constexpr const char* kStatsRecord = "STATISTICS_RECORD";

/// The statistics that items of a band hold; nothing for those of a part of the pixels.
/// @param item  gives the text of the item of a name, "" for one that isn't there.
template <typename Item>
std::optional<StoredStats> StatsOfItems(const Item& item) {
  StoredStats stats{item(kStatsMin), item(kStatsMax),          item(kStatsMean),
                    item(kStatsStd), item(kStatsValidPercent), item(kStatsRecord)};
  const bool isWhole =
      !stats.min.empty() && !stats.max.empty() && !stats.mean.empty() && !stats.std.empty();
  const std::string approximate = LowerCase(item(kStatsApproximate));
  // As GDAL reads words that are yes or no.
  const bool isWord = approximate == "no" || approximate == "false" || approximate == "off" ||
                      approximate == "0" || approximate.empty();
  return isWhole && isWord ? std::optional(stats) : std::nullopt;
}

/// The number at the start of a text, as atof has it in the C locale; 0 for none. Some programs
/// write infinities and NaN as 1.#INF and 1.#QNAN.
inline double LeadingNumber(const std::string& text) {
  const std::size_t start = text.find_first_not_of(" \t\n\r\f\v");
  if (start == text.npos) return 0;
  const char* const first = text.data() + start + (text[start] == '+' ? 1 : 0);
  double number = 0;
  constexpr double kInfinite = std::numeric_limits<double>::infinity();
  if (text.find("#INF") != text.npos) return *first == '-' ? -kInfinite : kInfinite;
  if (text.find('#') != text.npos) return std::numeric_limits<double>::quiet_NaN();
  const auto [end, fault] = std::from_chars(first, text.data() + text.size(), number);
  const bool isLarge = fault == std::errc::result_out_of_range && text.find("e-") == text.npos;
  return !isLarge ? number : *first == '-' ? -kInfinite : kInfinite;
}

/// A number out of a text, as a pixel value.
template <typename T>
std::optional<T> ParsePixel(const std::string& text) {
  if constexpr (std::is_integral_v<T>) {
    T whole{};
    const auto [end, fault] = std::from_chars(text.data(), text.data() + text.size(), whole);
    if (fault == std::errc() && end == text.data() + text.size()) return whole;
  }
  return ToPixel<T>(LeadingNumber(text));
}

template <typename T>
std::string PrintPixel(T value) {
  if constexpr (std::is_integral_v<T>) {
    return std::to_string(value);
  } else {
    char text[40];
    const auto [end, fault] = std::to_chars(text, text + sizeof text, static_cast<double>(value),
                                            std::chars_format::general, 17);
    return std::string(text, end);
  }
}

/// Statistics as GDAL keeps them, with ours in the record.
template <typename T>
StoredStats ToStored(const RasterBandStats<T>& stats) {
  StoredStats stored;
  stored.min = PrintPixel(stats.min);
  stored.max = PrintPixel(stats.max);
  stored.mean = PrintPixel(stats.mean);
  const auto n = static_cast<double>(stats.pixelCount);
  stored.std = PrintPixel(n > 0 ? stats.std * std::sqrt((n - 1) / n) : stats.std);
  std::ostringstream record;
  record.imbue(std::locale::classic());
  record << stats.pixelCount << ' ' << stats;
  stored.record = record.str();
  return stored;
}

/// The record of ours, when GDAL's numbers are still those it was written with.
template <typename T>
std::optional<RasterBandStats<T>> ReadRecord(const StoredStats& stored) {
  std::istringstream record(stored.record);
  record.imbue(std::locale::classic());
  std::uint64_t pixelCount = 0;
  RasterBandStats<T> stats;
  if (!(record >> pixelCount >> stats)) return std::nullopt;
  stats.pixelCount = pixelCount;
  const StoredStats same = ToStored(stats);
  const bool stands = same.min == stored.min && same.max == stored.max &&
                      same.mean == stored.mean && same.std == stored.std;
  return stands ? std::optional(stats) : std::nullopt;
}

/// Statistics out of those that are stored: ours, or what GDAL's numbers tell.
/// @param n  how many pixels there are.
/// @param allValid  none of them is left out.
template <typename T>
RasterBandStats<T> FromStored(const StoredStats& stored, std::uint64_t n, bool allValid) {
  if (const auto record = ReadRecord<T>(stored)) return *record;
  RasterBandStats<T> stats;
  const auto min = ParsePixel<T>(stored.min);
  const auto max = ParsePixel<T>(stored.max);
  if (!min || !max) return stats;
  stats.mask = StatsMask::Min | StatsMask::Max | StatsMask::Mean;
  stats.min = *min;
  stats.max = *max;
  stats.mean = LeadingNumber(stored.mean);
  // GDAL keeps no count. Where nothing can be left out it is known all the same.
  if (allValid) stats.pixelCount = n;
  double counted = static_cast<double>(n);
  if (!allValid) counted *= LeadingNumber(stored.validPercent) / 100;
  if (counted < 2) return stats;
  stats.mask |= StatsMask::Std;
  stats.std = LeadingNumber(stored.std) * std::sqrt(counted / (counted - 1));
  return stats;
}

}  // namespace lumo::gdal
