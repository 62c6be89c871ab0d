#pragma once

#include <algorithm>
#include <map>
#include <vector>

#include "raster/band_values.h"
#include "raster/raster_enums.h"

namespace lumo {

// Changes of the statistics and histograms that a source stores, made by one of several that have
// it open: each takes away only values that it has known, so that those of others since then stay.

/// Puts statistics into the stored ones. A band without any takes its stored ones away, unless
/// another has replaced them since they were looked at.
/// @param given   of some bands; one without any stands for none.
/// @param known   those that were stored when they were last looked at.
/// @param stored  [in, out] those that are stored by now.
template <typename T>
void MergeStats(const Array<RasterBandStats<T>>& given,
                const std::map<unsigned, RasterBandStats<T>>& known,
                std::map<unsigned, RasterBandStats<T>>& stored) {
  for (const RasterBandStats<T>& band : given) {
    if (band.mask != StatsMask::None) {
      stored[band.band] = band;
      continue;
    }
    const auto before = known.find(band.band);
    const auto now = stored.find(band.band);
    if (before == known.end() || now == stored.end()) continue;
    const bool isSame = before->second.mask == now->second.mask &&
                        before->second.pixelCount == now->second.pixelCount &&
                        before->second.sum == now->second.sum &&
                        before->second.sum2 == now->second.sum2;
    if (isSame) stored.erase(now);
  }
}

/// Puts histograms in the place of the stored ones that were known. Those that another has stored
/// since stay, behind the given ones.
/// @param given   all histograms that are to be stored.
/// @param known   those that were stored when they were last looked at.
/// @param stored  [in, out] those that are stored by now.
template <typename T>
void MergeHistograms(const Array<RasterBandHistogram<T>>& given,
                     const std::vector<RasterBandHistogram<T>>& known,
                     std::vector<RasterBandHistogram<T>>& stored) {
  const auto isIn = [](const auto& list, const RasterBandHistogram<T>& histogram) {
    return std::find(list.begin(), list.end(), histogram) != list.end();
  };
  std::vector<RasterBandHistogram<T>> merged(given.begin(), given.end());
  for (const RasterBandHistogram<T>& histogram : stored) {
    if (!isIn(known, histogram) && !isIn(given, histogram)) merged.push_back(histogram);
  }
  stored = std::move(merged);
}

}  // namespace lumo
