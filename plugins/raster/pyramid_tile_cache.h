#pragma once

#include <memory>

#include "pyramid_file.h"

namespace lumo::pyramid {

/// Keeps the tiles of one file that were used last, unpacked. All of them share one budget of
/// memory, of which each takes what is used.
/// Threads: any.
class TileCache {
 public:
  ~TileCache() { Clear(); }

  /// The tile; null when it isn't kept.
  std::shared_ptr<const Tile> Find(const TilePlace& place) const;
  void Keep(const TilePlace& place, const std::shared_ptr<const Tile>& tile);
  void Clear();
};

}  // namespace lumo::pyramid
