#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "foundation/packing.h"

namespace lumo {

/// Says how a tile of a level lies in its store: its pixels as they are packed, then the states of
/// its pixels.
struct StoredTile {
  std::uint32_t pixelBytes = 0;
  std::uint32_t stateBytes = 0;  ///< 0 for a tile without states
  std::uint64_t checksum = 0;    ///< of both
};

/// Holds tiles of a level that lie side by side in one row, as their store keeps them.
struct PackedTileRow {
  unsigned level = 0;
  unsigned row = 0;
  unsigned column = 0;  ///< of the first one
  unsigned band = 0;    ///< of a raster that is stored band by band; else 0
  std::vector<StoredTile> tiles{};
  RawBytes bytes{};  ///< of all of them, one behind the other
};

/// Answers for a reader of a plug-in whose levels are given as tiles that are packed already, and
/// says how.
class VEXG_EXPORT PackedLevels {
 public:
  virtual ~PackedLevels() = default;
  /// How the tiles of a build are packed; nothing for a source that takes none.
  virtual std::optional<Packing> GetLevelPacking() = 0;
  /// Takes tiles of the build that is under way as they are. @return false, with the fault set, for
  /// tiles that can't be such ones, or can't be written.
  virtual bool WritePackedTiles(const PackedTileRow& row) = 0;
};

}  // namespace lumo
