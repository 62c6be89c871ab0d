#include "raster/valid_pixels.h"

#include <algorithm>

#include "raster/block_strides.h"

namespace lumo {

void ValidPixels::Add(const BasicTile& tile) {
  const std::size_t bands = counts_.size();
  if (bands == 0) return;
  const unsigned char* const states = tile.StateArray().GetData();
  const std::size_t count = tile.StateArray().GetCount();
  const std::size_t pixels = count / bands;
  unsigned char any = 0;
  for (std::size_t i = 0; i < count; ++i) any |= states[i];
  const bool allValid = (any & PixelValueState::NotValid) == 0;
  if (allValid) {
    for (std::uint64_t& band : counts_) band += pixels;
    return;
  }
  const BlockStrides strides(tile.Order(), tile.Width(), tile.Height(), bands);
  for (std::size_t band = 0; band < bands; ++band) {
    for (std::size_t line = 0; line < tile.Height(); ++line) {
      const unsigned char* state = states + band * strides.band + line * strides.line;
      for (unsigned x = 0; x < tile.Width(); ++x, state += strides.pixel) {
        counts_[band] += (*state & PixelValueState::NotValid) == 0 ? 1 : 0;
      }
    }
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
