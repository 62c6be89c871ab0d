#include "pyramid_tile_cache.h"

#include <list>
#include <map>
#include <mutex>

namespace lumo::pyramid {
namespace {

std::size_t BytesOf(const Tile& tile) {
  return tile.pixels.Count() + tile.states.Count();
}

/// The tiles of all files.
class Store {
 public:
  using Key = std::pair<const TileCache*, TilePlace>;

  static Store& Get() {
    static auto* const store = new Store;
    return *store;
  }

  std::shared_ptr<const Tile> Find(const Key& key) {
    const std::lock_guard lock(lock_);
    const auto at = places_.find(key);
    if (at == places_.end()) return nullptr;
    entries_.splice(entries_.begin(), entries_, at->second);
    return at->second->tile;
  }

  void Keep(const Key& key, const std::shared_ptr<const Tile>& tile) {
    const std::lock_guard lock(lock_);
    if (places_.contains(key)) return;
    entries_.push_front({key, tile});
    places_[key] = entries_.begin();
    bytes_ += BytesOf(*tile);
    while (bytes_ > kMostBytes) Drop(std::prev(entries_.end()));
  }

  void DropOf(const TileCache* owner) {
    const std::lock_guard lock(lock_);
    for (auto at = entries_.begin(); at != entries_.end();) {
      const auto entry = at++;
      if (entry->key.first == owner) Drop(entry);
    }
  }

 private:
  static constexpr std::size_t kMostBytes = 128U << 20;

  struct Entry {
    Key key;
    std::shared_ptr<const Tile> tile;
  };

  void Drop(std::list<Entry>::iterator entry) {
    bytes_ -= BytesOf(*entry->tile);
    places_.erase(entry->key);
    entries_.erase(entry);
  }

  std::mutex lock_;
  std::list<Entry> entries_;  // the last used one in front
  std::map<Key, std::list<Entry>::iterator> places_;
  std::size_t bytes_ = 0;
};

}  // namespace

std::shared_ptr<const Tile> TileCache::Find(const TilePlace& place) const {
  return Store::Get().Find({this, place});
}

void TileCache::Keep(const TilePlace& place, const std::shared_ptr<const Tile>& tile) {
  Store::Get().Keep({this, place}, tile);
}

void TileCache::Clear() {
  Store::Get().DropOf(this);
}

}  // namespace lumo::pyramid
