#include "raster/valid_pixels.h"

#include <algorithm>

#include "raster/block_strides.h"
#include "raster/pixel_states.h"

namespace lumo {

void ValidPixels::Add(const BasicTile& tile) {
  const std::size_t bands = counts_.size();
  if (bands == 0) return;
  const unsigned char* const states = tile.StateArray().GetData();
  const std::size_t count = tile.StateArray().GetCount();
  const std::size_t pixels = count / bands;
  if (tile.HasNoStates() || AllValid(states, count)) {
    const std::lock_guard lock(mutex_);
    for (std::uint64_t& band : counts_) band += pixels;
    return;
  }
  // All bands of a run lie pixel by pixel, or it is of one of them.
  const BlockStrides strides(tile.Order(), tile.Width(), tile.Height(), bands);
  const bool isByPixel = strides.band == 1;
  const bool isWhole = isByPixel || strides.line == tile.Width();
  const std::size_t runs = isWhole ? 1 : tile.Height();
  std::vector<std::uint64_t> valid(bands);
  for (std::size_t band = 0; band < (isByPixel ? 1 : bands); ++band) {
    for (std::size_t run = 0; run < runs; ++run) {
      CountValid(states + band * strides.band + run * strides.line, pixels / runs,
                 isByPixel ? bands : 1, &valid[band]);
    }
  }
  const std::lock_guard lock(mutex_);
  for (std::size_t band = 0; band < bands; ++band) counts_[band] += valid[band];
}

Array<std::uint64_t> ValidPixels::Get() const {
  Array<std::uint64_t> counts{ArrayDims(static_cast<unsigned>(counts_.size()))};
  std::copy(counts_.begin(), counts_.end(), counts.begin());
  return counts;
}

Array<unsigned> AllBands(const BasicRaster& raster) {
  Array<unsigned> bands{ArrayDims(raster.Bands())};
  for (unsigned i = 0; i < bands.GetCount(); ++i) bands[i] = i;
  return bands;
}

}  // namespace lumo
