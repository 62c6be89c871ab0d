#include "fx/merge_ahead.h"

#include <algorithm>

namespace lumo {
namespace {

constexpr std::uint16_t kMostPlaces = 32;  // in a list

}  // namespace

void MergeAhead::Clear() {
  merged_.clear();
  walks_.clear();
  neighbours_.clear();
}

void MergeAhead::Add(std::uint32_t pair) {
  for (const std::uint32_t region : graph_.PairOf(pair).ids) {
    FetchRegion(region);
    merged_.push_back(region);
  }
}

void MergeAhead::FetchRegion(std::uint32_t region) const {
  constexpr std::size_t kLine = 64;
  const auto* const begin = reinterpret_cast<const char*>(&graph_.RegionOf(region));
  const std::size_t bytes = MergeGraph::BytesOfRegion(graph_.Bands());
  __builtin_prefetch(begin);
  // Few bands take a line or two; the processor goes on by itself with more.
  if (bytes > sizeof(MergeGraph::Region)) __builtin_prefetch(begin + std::min(bytes - 1, kLine));
}

/// Goes from pair to pair in all lists.
void MergeAhead::GoOn() {
  std::size_t kept = 0;
  for (Walk& walk : walks_) {
    const MergeGraph::Pair& pair = graph_.PairOf(walk.pair);
    if (walk.isMerged && pair.length != 0) {
      const std::uint32_t other = pair.Other(walk.region);
      FetchRegion(other);
      neighbours_.push_back({other, walk.pair});
    }
    const std::uint32_t next = pair.next[pair.SlotOf(walk.region)];
    if (next == MergeGraph::kNone || walk.left == 0) continue;
    __builtin_prefetch(&graph_.PairOf(next));
    walks_[kept++] = {walk.region, next, static_cast<std::uint16_t>(walk.left - 1), walk.isMerged};
  }
  walks_.resize(kept);
}

/// Fetches the nearest pairs of neighbours, and the lists where these are about to change.
void MergeAhead::LookAtNeighbours(std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) {
    const Neighbour& neighbour = neighbours_[i];
    const std::uint32_t minimum = graph_.RegionOf(neighbour.region).minimum;
    if (minimum == neighbour.pair) {
      BeginList(neighbour.region, false);
    } else if (minimum != MergeGraph::kNone) {
      __builtin_prefetch(&graph_.PairOf(minimum));
    }
  }
  neighbours_.erase(neighbours_.begin(), neighbours_.begin() + static_cast<std::ptrdiff_t>(count));
}

void MergeAhead::BeginList(std::uint32_t region, bool isMerged) {
  const std::uint32_t first = graph_.RegionOf(region).first;
  if (first == MergeGraph::kNone || graph_.IsHub(region)) return;
  __builtin_prefetch(&graph_.PairOf(first));
  walks_.push_back({region, first, kMostPlaces, isMerged});
}

void MergeAhead::Go() {
  const std::size_t fetched = neighbours_.size();
  GoOn();
  LookAtNeighbours(fetched);
  for (const std::uint32_t region : merged_) BeginList(region, true);
  merged_.clear();
}

}  // namespace lumo
