#include "viewer/band_histograms.h"

#include <algorithm>
#include <cmath>
#include <numeric>

#include "rasters/band_bins.h"

namespace lumo::host {
namespace {

/// The value below which a share of the counted values lies.
double Percentile(const Json& histogram, double share) {
  const double min = histogram["min"], max = histogram["max"], size = histogram["binSize"];
  const auto counts = histogram["counts"].get<std::vector<double>>();
  const bool isWhole = size == 1 && min == std::floor(min);
  double rest = share * std::accumulate(counts.begin(), counts.end(), 0.0);
  for (std::size_t bin = 0; bin < counts.size(); ++bin) {
    if (rest <= counts[bin] && counts[bin] > 0) {
      const double inside = isWhole ? 0 : rest / counts[bin];
      return std::min(min + (static_cast<double>(bin) + inside) * size, max);
    }
    rest -= counts[bin];
  }
  return max;
}

}  // namespace

Json CountBands(const ViewedRaster& raster, const std::vector<std::uint32_t>& bands) {
  constexpr std::uint64_t kMostPixels = 4U << 20;
  unsigned level = 0;
  while (level + 1 < raster.LevelCount() &&
         (std::uint64_t{raster.Samples()} * raster.Lines()) >> (2 * level) > kMostPixels) {
    ++level;
  }
  Array<unsigned> counted{ArrayDims(static_cast<unsigned>(bands.size()))};
  std::copy(bands.begin(), bands.end(), counted.begin());
  JobDraft draft;
  RasterChain chain(draft);
  raster.AddTo(chain, level);
  AddCounting(draft, chain.GetTop(), counted, raster.Code(), {});
  chain.Close();
  return {{"level", level},
          {"bands", AsJson(ReadBins(raster.GetDoor().Run(draft), raster.Code()))}};
}

std::pair<double, double> BandEnds::Find(const ViewedRaster& raster, std::size_t number,
                                         std::uint32_t band, double cut) {
  Json histogram;
  {
    const std::lock_guard lock(mutex_);
    const auto at = histograms_.find({number, band});
    if (at != histograms_.end()) histogram = at->second;
  }
  if (histogram.is_null()) {
    histogram = CountBands(raster, {band})["bands"][0];
    const std::lock_guard lock(mutex_);
    histograms_[{number, band}] = histogram;
  }
  if (histogram["min"].is_null()) return {0, 1};
  double low = Percentile(histogram, cut / 100), high = Percentile(histogram, 1 - cut / 100);
  if (!(high > low)) {
    low = histogram["min"];
    high = histogram["max"];
  }
  return {low, high > low ? high : low + 1};
}

}  // namespace lumo::host
