#pragma once

#include <algorithm>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "platform/export.h"
#include "platform/huge_pages.h"

namespace lumo {

/// Orders pairs of segments by what they cost, of equal costs by their numbers.
///
/// Most pairs wait for long, in a heap of 8 bytes for each: a cost as a float, rounded down, and a
/// number. Only a few that come next are told apart by their costs to the bit. An entry may be out
/// of date: who takes it says whether it counts.
///
/// Costs are not below 0, and finite as floats. Threads: one at a time.
class VEXG_EXPORT MergeQueue {
 public:
  struct Entry {
    double cost;
    std::uint32_t pair;
    bool operator<(const Entry& other) const {  // the cheapest on top of a heap
      return cost != other.cost ? cost > other.cost : pair > other.pair;
    }
  };

  void Clear();
  void Reserve(std::size_t count) { later_.reserve(kFront + count); }
  /// How many entries there are, and how many there is room for.
  std::size_t Size() const { return later_.size() - kFront + coming_.size() + next_.size(); }
  std::size_t Room() const { return later_.capacity() - kFront; }

  void Push(const Entry& entry);

  /// Takes the first entry that counts. @return false where there is none.
  /// @param costOf    called with a pair: what it costs, or a number below 0 where it isn't queued.
  /// @param onComing  called with a pair that costOf is going to be asked for.
  /// @param onNext    called with a pair that comes soon: behind some others, if there are any.
  template <typename CostOf, typename OnComing, typename OnNext>
  bool Pop(Entry& first, const CostOf& costOf, const OnComing& onComing, const OnNext& onNext) {
    for (;;) {
      if (next_.size() < kFewNext) Refill(costOf, onComing, onNext);
      if (next_.empty()) return false;
      first = TakeNext();
      if (costOf(first.pair) == first.cost) return true;
    }
  }

  /// Forgets the entries that don't count.
  template <typename CostOf>
  void Clean(const CostOf& costOf) {
    const auto isOld = [&](Key key) { return !IsCurrent(key, costOf); };
    const auto begin = later_.begin() + kFront;
    later_.erase(std::remove_if(begin, later_.end(), isOld), later_.end());
    std::erase_if(coming_, isOld);
    std::erase_if(next_, [&](const Entry& entry) { return costOf(entry.pair) != entry.cost; });
    later_.insert(later_.end(), coming_.begin(), coming_.end());
    coming_.clear();
    Order();
  }

 private:
  // From the highest bit on: a float without its sign, whether the cost is above it, the pair.
  using Key = std::uint64_t;
  static constexpr unsigned kPairBits = 32;
  static constexpr Key kAbove = Key{1} << kPairBits, kPairs = kAbove - 1;
  static constexpr std::size_t kFewNext = 20, kComing = 20;
  // The heap has 8 branches; the entries in front of it put those of a branch on one cache line.
  static constexpr std::size_t kBranches = 8, kFront = kBranches - 1;

  static Key KeyOf(const Entry& entry) {
    const auto rounded = static_cast<float>(entry.cost);
    std::uint32_t bits = std::bit_cast<std::uint32_t>(rounded);
    if (static_cast<double>(rounded) > entry.cost) --bits;
    const bool isAbove = static_cast<double>(rounded) != entry.cost;
    return Key{bits} << (kPairBits + 1) | (isAbove ? kAbove : 0) | entry.pair;
  }
  template <typename CostOf>
  static bool IsCurrent(Key key, const CostOf& costOf) {
    const auto pair = static_cast<std::uint32_t>(key & kPairs);
    const double cost = costOf(pair);
    return cost >= 0 && KeyOf({cost, pair}) == key;
  }

  /// Finds out about the entries that come next, all together whose costs are the same float.
  template <typename CostOf, typename OnComing, typename OnNext>
  void Refill(const CostOf& costOf, const OnComing& onComing, const OnNext& onNext) {
    do {
      const auto move = [&](Key key) {
        bound_ = std::max(bound_, (key & kAbove) != 0 ? key | kPairs : key);
        if (!IsCurrent(key, costOf)) return;
        const auto pair = static_cast<std::uint32_t>(key & kPairs);
        onNext(pair);
        PushNext({costOf(pair), pair});
      };
      for (const Key key : coming_) move(key);
      coming_.clear();
      // Those that have come in between, or cost the same.
      while (later_.size() > kFront && later_[kFront] <= bound_) move(TakeLater());
      while (later_.size() > kFront && coming_.size() < kComing) {
        coming_.push_back(TakeLater());
        onComing(static_cast<std::uint32_t>(coming_.back() & kPairs));
      }
    } while (next_.empty() && !coming_.empty());
  }
  void PushNext(const Entry& entry);
  Entry TakeNext();
  Key TakeLater();
  void Sink(std::size_t at, Key key);
  void Order();

  std::vector<Key, platform::HugePageAllocator<Key>> later_ =
      std::vector<Key, platform::HugePageAllocator<Key>>(kFront);
  std::vector<Key> coming_;  // taken out of the heap, in their order, to be looked at next
  std::vector<Entry> next_;  // a heap; no key is above the bound, and all others are
  Key bound_ = 0;
};

}  // namespace lumo
