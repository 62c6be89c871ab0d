#include "viewer/band_histograms.h"

#include <algorithm>

#include "rasters/band_bins.h"

namespace lumo::host {

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

}  // namespace lumo::host
