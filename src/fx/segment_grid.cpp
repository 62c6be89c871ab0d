#include "fx/segment_process.h"

namespace lumo {

SegmentGrid::SegmentGrid(const BasicRaster& raster, std::size_t elementBytes, unsigned tileBytes,
                         unsigned tileBorder)
    : side(SquareTiles(&raster, elementBytes, tileBytes, 0).width) {
  columns = static_cast<unsigned>((std::uint64_t{raster.Samples()} + side - 1) / side);
  rows = static_cast<unsigned>((std::uint64_t{raster.Lines()} + side - 1) / side);
  border = IsOneTile() ? 1 : tileBorder;
}

TileDimensions SegmentGrid::Tiles(unsigned withBorder) const {
  TileDimensions tiles;
  tiles.width = tiles.height = side;
  tiles.borderLeft = tiles.borderRight = tiles.borderTop = tiles.borderBottom = withBorder;
  tiles.borderClamp = 1;
  return tiles;
}

}  // namespace lumo
