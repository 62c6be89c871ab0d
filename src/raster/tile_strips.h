#pragma once

#include <algorithm>

#include "raster/tile.h"
#include "stats/plane_walk.h"

namespace lumo {

/// How a tile is cut for a parallel loop: rows first, and rows of long tiles into pieces. The cut
/// depends on the size of the tile alone.
class TileStrips {
 public:
  /// @param leastPixels  of a strip, as far as the tile has them.
  TileStrips(const BasicTile& tile, std::size_t leastPixels)
      : width_(tile.Width()), height_(tile.Height()) {
    constexpr std::size_t kMost = 64;
    const std::size_t pixels = std::size_t{width_} * height_;
    const std::size_t wanted = std::clamp(pixels / leastPixels, std::size_t{1}, kMost);
    rows_ = static_cast<unsigned>(std::min<std::size_t>(wanted, height_));
    columns_ = static_cast<unsigned>(std::min<std::size_t>(wanted / std::max(rows_, 1U), width_));
  }

  unsigned Count() const { return rows_ * columns_; }

  TilePart Strip(unsigned index) const {
    const unsigned row = index / columns_;
    const unsigned column = index % columns_;
    return {Cut(height_, rows_, row), Cut(height_, rows_, row + 1), Cut(width_, columns_, column),
            Cut(width_, columns_, column + 1)};
  }

 private:
  static unsigned Cut(unsigned extent, unsigned parts, unsigned index) {
    return static_cast<unsigned>(std::uint64_t{extent} * index / parts);
  }

  unsigned width_;
  unsigned height_;
  unsigned rows_ = 0;
  unsigned columns_ = 0;
};

}  // namespace lumo
