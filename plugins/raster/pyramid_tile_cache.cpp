#include "pyramid_tile_cache.h"

namespace lumo::pyramid {
namespace {

std::size_t BytesOf(const Tile& tile) {
  return tile.pixels.Count() + tile.states.Count();
}

}  // namespace

std::shared_ptr<const Tile> TileCache::Find(const TilePlace& place) {
  const std::lock_guard lock(lock_);
  const auto at = places_.find(place);
  if (at == places_.end()) return nullptr;
  entries_.splice(entries_.begin(), entries_, at->second);
  return at->second->tile;
}

void TileCache::Keep(const TilePlace& place, const std::shared_ptr<const Tile>& tile) {
  const std::lock_guard lock(lock_);
  if (places_.contains(place)) return;
  entries_.push_front({place, tile});
  places_[place] = entries_.begin();
  bytes_ += BytesOf(*tile);
  while (bytes_ > kMostBytes) {
    const Entry& oldest = entries_.back();
    bytes_ -= BytesOf(*oldest.tile);
    places_.erase(oldest.place);
    entries_.pop_back();
  }
}

void TileCache::Clear() {
  const std::lock_guard lock(lock_);
  entries_.clear();
  places_.clear();
  bytes_ = 0;
}

}  // namespace lumo::pyramid
