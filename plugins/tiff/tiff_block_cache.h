#pragma once

#include <array>
#include <atomic>
#include <cstdint>
#include <list>
#include <memory>
#include <mutex>
#include <unordered_map>

namespace lumo::tiff {

/// Keeps decoded blocks of all open files, as many as fit into a twentieth of the machine's memory;
/// at least 256 MiB. The ones that nobody has asked for longest go first.
///
/// Threads: any number. Each part of the blocks has a lock of its own, held for a look-up.
class BlockCache {
 public:
  using Bytes = std::shared_ptr<const unsigned char[]>;

  static BlockCache& Get();

  /// A number for a group of blocks that are let go together.
  std::uint64_t NewGroup() { return nextGroup_++; }
  /// The block; empty when it isn't kept, or not any more.
  Bytes Find(std::uint64_t group, std::uint64_t block);
  /// The block, which is kept no longer.
  Bytes Take(std::uint64_t group, std::uint64_t block);
  /// Keeps a block. One that is larger than a share of the room is not kept.
  void Keep(std::uint64_t group, std::uint64_t block, Bytes bytes, std::size_t size);
  /// Lets all blocks of a group go.
  void Drop(std::uint64_t group);

 private:
  struct Key {
    std::uint64_t group, block;
    bool operator==(const Key&) const = default;
  };
  struct Hash {
    std::size_t operator()(const Key& key) const {
      return (key.group * 0x9E3779B97F4A7C15ULL) ^ (key.block * 0xC2B2AE3D27D4EB4FULL);
    }
  };
  struct Kept {
    Key key;
    Bytes bytes;
    std::size_t size;
  };
  /// A part of the blocks.
  struct Shard {
    std::mutex mutex;
    std::list<Kept> blocks;  // the latest first
    std::unordered_map<Key, std::list<Kept>::iterator, Hash> places;
    std::size_t bytes = 0;
  };
  static constexpr std::size_t kShards = 16;

  BlockCache();
  Shard& ShardOf(const Key& key) { return shards_[Hash()(key) / 64 % kShards]; }

  std::array<Shard, kShards> shards_;
  std::size_t most_ = 0;  // bytes of a shard
  std::atomic<std::uint64_t> nextGroup_{0};
};

}  // namespace lumo::tiff
