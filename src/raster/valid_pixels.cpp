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
  if (AllValid(states, count)) {
    const std::lock_guard lock(mutex_);
    for (std::uint64_t& band : counts_) band += pixels;
    return;
  }
  const BlockStrides strides(tile.Order(), tile.Width(), tile.Height(), bands);
  for (std::size_t band = 0; band < bands; ++band) {
    std::uint64_t valid = 0;
    for (std::size_t line = 0; line < tile.Height(); ++line) {
      const unsigned char* state = states + band * strides.band + line * strides.line;
      for (unsigned x = 0; x < tile.Width(); ++x, state += strides.pixel) {
        valid += IsValidState(*state) ? 1 : 0;
      }
    }
    const std::lock_guard lock(mutex_);
    counts_[band] += valid;
  }
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
