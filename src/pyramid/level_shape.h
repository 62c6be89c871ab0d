#pragma once

#include <algorithm>
#include <cstdint>

namespace lumo {

/// The size of a level of a pyramid, and the grid of square tiles that it is stored in. Its pixel
/// (x, y) is the pixel (x << level, y << level) of the raster; a rest at the right and lower edge
/// that doesn't fill a pixel is left out.
struct LevelShape {
  /// @param samples,lines  of the raster.
  /// @param side           of a tile, in pixels of the level, at least 1.
  LevelShape(unsigned samples, unsigned lines, unsigned levelNumber, unsigned side)
      : level(levelNumber),
        width(levelNumber < kBits ? samples >> levelNumber : 0),
        height(levelNumber < kBits ? lines >> levelNumber : 0),
        tileSide(side) {}

  /// True for a level without pixels, which is none.
  bool IsEmpty() const { return width == 0 || height == 0; }
  /// Tiles in a row of the grid.
  unsigned Columns() const { return TilesIn(width); }
  /// Tiles in a column of the grid.
  unsigned Rows() const { return TilesIn(height); }
  /// Width of the tiles of a column, in pixels of the level; the last may be narrower.
  unsigned ColumnWidth(unsigned column) const { return SizeOf(column, width); }
  /// Height of the tiles of a row, in pixels of the level; the last may be lower.
  unsigned RowHeight(unsigned row) const { return SizeOf(row, height); }

  /// The first pixel of the level at or behind pixel `at` of the raster, on one axis.
  unsigned FirstFrom(std::uint64_t at) const {
    const std::uint64_t step = std::uint64_t{1} << level;
    return static_cast<unsigned>((at + step - 1) >> level);
  }

  unsigned level;     ///< 0 for the raster itself
  unsigned width;     ///< pixels of a line of the level
  unsigned height;    ///< lines of the level
  unsigned tileSide;  ///< pixels

 private:
  static constexpr unsigned kBits = 32;

  unsigned TilesIn(unsigned extent) const { return extent == 0 ? 0 : (extent - 1) / tileSide + 1; }
  unsigned SizeOf(unsigned index, unsigned extent) const {
    return std::min(tileSide, extent - index * tileSide);
  }
};

/// Says how the levels of a raster are handed to their store.
struct LevelTiling {
  unsigned side;   ///< of a tile
  unsigned bands;  ///< in a tile: all bands of the raster, or one
};

/// Chooses how the levels of a raster are stored. Rasters of many bands are stored band by band: a
/// strip of all their bands would need too much memory while it is gathered.
/// @param side  wanted for the others.
inline LevelTiling TilingOf(unsigned bands, unsigned side) {
  constexpr unsigned kFewBands = 8;
  constexpr unsigned kSideOfBands = 256;
  return bands > kFewBands ? LevelTiling{kSideOfBands, 1} : LevelTiling{side, bands};
}

}  // namespace lumo
