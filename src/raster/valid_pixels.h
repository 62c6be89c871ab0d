#pragma once

#include <cstdint>
#include <mutex>
#include <vector>

#include "raster/raster.h"
#include "raster/tile.h"

namespace lumo {

/// Counts the valid pixels of each band, tile by tile. Threads: Add may be called on many.
///
///     ValidPixels valid(raster->Bands());
///     ForEachTile("Count", TilesOf(raster), [&](const Tile<float>& tile) { valid.Add(tile); });
///     const Array<std::uint64_t> counts = valid.Get();
class VEXG_EXPORT ValidPixels {
 public:
  /// @param bands  of the raster; every count begins at 0.
  explicit ValidPixels(unsigned bands) : counts_(bands) {}

  /// Adds a tile of all bands, without borders.
  void Add(const BasicTile& tile);

  /// The counts, when all tiles are added.
  Array<std::uint64_t> Get() const;

 private:
  std::mutex mutex_;
  std::vector<std::uint64_t> counts_;  // under mutex_
};

/// The numbers of all bands of a raster, 0 to Bands() - 1, as GetSubRect takes them.
VEXG_EXPORT Array<unsigned> AllBands(const BasicRaster& raster);

}  // namespace lumo
