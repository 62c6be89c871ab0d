#pragma once

#include <cstdint>
#include <vector>

#include "raster/raster.h"
#include "raster/tile.h"

namespace lumo {

/// Counts the valid pixels of each band, tile by tile.
class VEXG_EXPORT ValidPixels {
 public:
  explicit ValidPixels(unsigned bands) : counts_(bands) {}

  /// Adds a tile of all bands, without borders.
  void Add(const BasicTile& tile);

  Array<std::uint64_t> Get() const;

 private:
  std::vector<std::uint64_t> counts_;
};

/// The numbers of all bands of a raster.
VEXG_EXPORT Array<unsigned> AllBands(const BasicRaster& raster);

}  // namespace lumo
