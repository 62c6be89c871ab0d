#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "fx/merge_graph.h"

namespace lumo {

/// Finds the pairs of one segment by its neighbours: a hash table that is small where there are
/// few, as nearly always. Threads: one at a time; memory is kept.
class NeighbourTable {
 public:
  void Clear() {
    std::fill_n(slots_.begin(), used_, Slot{});
    count_ = 0;
    used_ = kLeast;
  }
  /// Adds a neighbour, which isn't there yet.
  void Add(std::uint32_t region, std::uint32_t pair) {
    if (2 * ++count_ > used_) Grow();
    slots_[PlaceOf(region)] = {region, pair};
  }
  /// The pair with a neighbour; MergeGraph::kNone where it is none.
  std::uint32_t PairTo(std::uint32_t region) const { return slots_[PlaceOf(region)].pair; }

 private:
  static constexpr std::size_t kLeast = 16;

  struct Slot {
    std::uint32_t region = 0;
    std::uint32_t pair = MergeGraph::kNone;  // for a free one
  };

  std::size_t PlaceOf(std::uint32_t region) const {
    std::size_t at = (region * std::uint64_t{0x9E3779B97F4A7C15}) >> 32U;
    for (at &= used_ - 1; slots_[at].pair != MergeGraph::kNone && slots_[at].region != region;) {
      at = (at + 1) & (used_ - 1);
    }
    return at;
  }
  void Grow() {
    std::vector<Slot> old(slots_.begin(), slots_.begin() + static_cast<std::ptrdiff_t>(used_));
    std::fill_n(slots_.begin(), used_, Slot{});
    used_ *= 2;
    slots_.resize(std::max(slots_.size(), used_));
    for (const Slot& slot : old) {
      if (slot.pair != MergeGraph::kNone) slots_[PlaceOf(slot.region)] = slot;
    }
  }

  std::vector<Slot> slots_ = std::vector<Slot>(kLeast);
  std::size_t used_ = kLeast, count_ = 0;  // slots, a power of two; neighbours
};

}  // namespace lumo
