#pragma once

#include <span>
#include <vector>

#include "data/packed_levels.h"
#include "pyramid/level_shape.h"

namespace lumo {

/// Describes tiles of a level that lie side by side in one row, one after the other from left to
/// right, each a block of its own, pixel-interleaved.
struct PlainTiles {
  LevelShape shape;
  unsigned row;
  unsigned column;      ///< of the first one
  unsigned columns;     ///< tiles
  unsigned bands;       ///< in a tile
  unsigned valueBytes;  ///< of a pixel in a band
  const unsigned char* pixels;
  const unsigned char* states;  ///< one for each value

  /// Values of the tile at a place from the first one on.
  std::uint64_t ValuesOf(unsigned index) const {
    return std::uint64_t{shape.ColumnWidth(column + index)} * shape.RowHeight(row) * bands;
  }
};

/// Holds a tile as it is to be stored: what was packed, else where the plain bytes lie.
struct TileToStore {
  std::span<const unsigned char> pixels;
  std::span<const unsigned char> states;  ///< none for a tile without any
  StoredTile entry;
  RawBytes packedPixels{};
  RawBytes packedStates{};
  RawBytes maskStates{};  ///< as they were given, less the bit of no data
};

/// Packs tiles on all threads. Of states, those stay that say more than that there is no data.
/// The result refers to `tiles`.
VEXG_EXPORT std::vector<TileToStore> PackTiles(const PlainTiles& tiles, Packing packing);

}  // namespace lumo
