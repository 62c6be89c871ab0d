#include "tiff/tiff_block_cache.h"

#include <algorithm>

#include "platform/system_memory.h"

namespace lumo::tiff {

BlockCache& BlockCache::Get() {
  static auto& cache = *new BlockCache;  // threads may be at it until the process ends
  return cache;
}

BlockCache::BlockCache() {
  constexpr std::uint64_t kLeast = 256ULL << 20, kMost = 4ULL << 30;
  most_ = std::clamp(platform::GetMemoryOfMachine() / 20, kLeast, kMost) / kShards;
}

BlockCache::Bytes BlockCache::Find(std::uint64_t group, std::uint64_t block) {
  const Key key{group, block};
  Shard& shard = ShardOf(key);
  const std::lock_guard lock(shard.mutex);
  const auto at = shard.places.find(key);
  if (at == shard.places.end()) return {};
  shard.blocks.splice(shard.blocks.begin(), shard.blocks, at->second);
  return at->second->bytes;
}

BlockCache::Bytes BlockCache::Take(std::uint64_t group, std::uint64_t block) {
  const Key key{group, block};
  Shard& shard = ShardOf(key);
  const std::lock_guard lock(shard.mutex);
  const auto at = shard.places.find(key);
  if (at == shard.places.end()) return {};
  Bytes taken = std::move(at->second->bytes);
  shard.bytes -= at->second->size;
  shard.blocks.erase(at->second);
  shard.places.erase(at);
  return taken;
}

void BlockCache::Keep(std::uint64_t group, std::uint64_t block, Bytes bytes, std::size_t size) {
  const Key key{group, block};
  Shard& shard = ShardOf(key);
  std::list<Kept> gone;  // freed without the lock
  const std::lock_guard lock(shard.mutex);
  if (size > most_ || shard.places.contains(key)) return;
  shard.bytes += size;
  shard.blocks.push_front({key, std::move(bytes), size});
  shard.places[key] = shard.blocks.begin();
  while (shard.bytes > most_) {
    shard.bytes -= shard.blocks.back().size;
    shard.places.erase(shard.blocks.back().key);
    gone.splice(gone.begin(), shard.blocks, std::prev(shard.blocks.end()));
  }
}

void BlockCache::Drop(std::uint64_t group) {
  for (Shard& shard : shards_) {
    std::list<Kept> gone;
    const std::lock_guard lock(shard.mutex);
    for (auto at = shard.blocks.begin(); at != shard.blocks.end();) {
      const auto here = at++;
      if (here->key.group != group) continue;
      shard.bytes -= here->size;
      shard.places.erase(here->key);
      gone.splice(gone.begin(), shard.blocks, here);
    }
  }
}

}  // namespace lumo::tiff
