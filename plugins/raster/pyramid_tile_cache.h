#pragma once

#include <list>
#include <map>
#include <memory>
#include <mutex>

#include "pyramid_file.h"

namespace lumo::pyramid {

/// Keeps the tiles that were used last, unpacked, up to a number of bytes.
/// Threads: any.
class TileCache {
 public:
  /// The tile; null when it isn't kept.
  std::shared_ptr<const Tile> Find(const TilePlace& place);
  void Keep(const TilePlace& place, const std::shared_ptr<const Tile>& tile);
  void Clear();

 private:
  static constexpr std::size_t kMostBytes = 32U << 20;

  struct Entry {
    TilePlace place;
    std::shared_ptr<const Tile> tile;
  };

  std::mutex lock_;
  std::list<Entry> entries_;  // the last used one in front
  std::map<TilePlace, std::list<Entry>::iterator> places_;
  std::size_t bytes_ = 0;
};

}  // namespace lumo::pyramid
