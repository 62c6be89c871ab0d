#pragma once

#include "raster/tile_functions.h"

namespace lumo::example {

/// Makes output = gain[band] * input + offset[band]; 0 where a pixel is not valid.
template <typename TIn, typename TOut>
bool Scale(const TileInputs<TIn>& input, const std::vector<double>& gains,
           const std::vector<double>& offsets, const RasterPtr<TOut>& output, const IPC& ipc = {}) {
  const auto scale = [&](const Tile<TIn>& in, Tile<TOut>& out, const TilePart& part) {
    const unsigned bands = in.Bands();
    if (gains.size() != bands || offsets.size() != bands || out.Bands() != bands) return false;
    for (unsigned y = part.rowFrom; y < part.rowTo; ++y) {
      const auto from = RowOf(in, part, y);
      const auto to = RowOf(out, part, y);
      for (std::size_t i = 0; i < from.count;) {
        for (unsigned band = 0; band < bands; ++band, ++i) {
          const bool valid = IsValidState(from.states[i]);
          to.values[i] = valid ? TOut(gains[band] * from.values[i] + offsets[band]) : TOut();
        }
      }
    }
    return true;
  };
  return MapTiles("ScaleProcess", input, output, scale, ipc);
}

}  // namespace lumo::example
