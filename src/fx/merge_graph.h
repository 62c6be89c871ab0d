#pragma once

#include <cmath>
#include <cstddef>
#include <cstdint>
#include <new>
#include <unordered_map>
#include <utility>
#include <vector>

#include "fx/label_pairs.h"
#include "fx/merge_cost.h"
#include "platform/huge_pages.h"

namespace lumo {

/// Holds segments and their pairs of neighbours in lists that merging changes: each segment has a
/// list of its pairs, and each pair stands in the lists of both of its segments.
///
/// Threads: one at a time; the arrays are kept from image to image.
class VEXG_EXPORT MergeGraph {
 public:
  /// Stands for no pair.
  static constexpr std::uint32_t kNone = 0xFFFFFFFF;

  /// A segment; the means of its bands follow it in memory, as they are read with it.
  struct Region {
    std::uint32_t pixels = 0;       ///< see AreaOf
    std::uint32_t minimum = kNone;  ///< pair
    std::uint32_t first = kNone;    ///< of its pairs
    std::uint32_t rank : 31 = 0;    ///< of one that is gone: see Forget
    std::uint32_t isHub : 1 = 0;    ///< see MergeHubs
  };

  /// Slot i of the links belongs to ids[i]. A pair that was merged, or joined to another, has no
  /// length any more, and leaves a list when somebody goes through it next.
  struct Pair {
    std::uint32_t ids[2] = {};
    std::uint32_t next[2] = {};
    double cost = 0;  ///< of a pair that isn't plain out of date
    std::uint32_t length = 0;
    bool isChosen = false;
    bool isQueued = false;
    std::uint8_t watch = kPlain;  ///< see MergeHubs
    std::uint8_t stamp = 0;

    unsigned SlotOf(std::uint32_t region) const { return ids[0] == region ? 0 : 1; }
    std::uint32_t Other(std::uint32_t region) const { return ids[0] == region ? ids[1] : ids[0]; }
    bool IsPlain() const { return watch == kPlain; }
  };
  static constexpr std::uint8_t kPlain = 0xFF;
  static_assert(sizeof(Region) == 16 && sizeof(Pair) == 32);

  /// Forgets everything, and makes room for regions below `count`, of `bands` bands. The rank of
  /// each is its number.
  void Begin(std::uint32_t count, std::uint32_t bands);
  void Limit(const GrowthLimits& limits) { limits_ = limits; }
  const GrowthLimits& Limits() const { return limits_; }

  std::uint32_t Count() const { return count_; }
  std::uint32_t Bands() const { return bands_; }
  static constexpr std::size_t BytesOfRegion(std::uint32_t bands) {
    return sizeof(Region) + bands * sizeof(double);
  }

  Region& RegionOf(std::uint32_t region) {
    return *std::launder(reinterpret_cast<Region*>(regions_.data() + region * stride_));
  }
  const Region& RegionOf(std::uint32_t region) const {
    return *std::launder(reinterpret_cast<const Region*>(regions_.data() + region * stride_));
  }
  double* MeansOf(std::uint32_t region) {
    return std::launder(
        reinterpret_cast<double*>(regions_.data() + region * stride_ + sizeof(Region)));
  }
  const double* MeansOf(std::uint32_t region) const {
    return std::launder(
        reinterpret_cast<const double*>(regions_.data() + region * stride_ + sizeof(Region)));
  }
  /// The pixels of a region: any number of them.
  double AreaOf(std::uint32_t region) const {
    const std::uint32_t pixels = RegionOf(region).pixels;
    return pixels != kMany ? pixels : many_.at(region);
  }
  void SetArea(std::uint32_t region, double area) {
    const bool isMany = !(area < kMany);
    if (isMany) many_[region] = area;
    RegionOf(region).pixels = isMany ? kMany : static_cast<std::uint32_t>(area);
  }
  void AddPixel(std::uint32_t region) {
    std::uint32_t& pixels = RegionOf(region).pixels;
    if (pixels < kMany - 1) {
      ++pixels;
    } else {
      SetArea(region, AreaOf(region) + 1);
    }
  }
  /// Makes a region one of no pixels, which is gone. @param label  takes the place of its rank.
  void Forget(std::uint32_t region, std::uint32_t label) {
    SetArea(region, 0);
    RegionOf(region).rank = label & 0x7FFFFFFF;
  }
  std::uint32_t RankOf(std::uint32_t region) const { return RegionOf(region).rank; }
  bool IsHub(std::uint32_t region) const { return RegionOf(region).isHub != 0; }

  void ReservePairs(std::size_t count) { pairs_.reserve(count); }
  /// Adds a pair, and puts it into the lists of its regions.
  void AddPair(const LabelPair& pair);
  std::size_t PairCount() const { return pairs_.size(); }
  Pair& PairOf(std::uint32_t pair) { return pairs_[pair]; }
  const Pair& PairOf(std::uint32_t pair) const { return pairs_[pair]; }
  std::uint32_t NumberOf(const Pair& pair) const {
    return static_cast<std::uint32_t>(&pair - pairs_.data());
  }

  /// Puts a pair into the list of one of its regions.
  void Link(std::uint32_t pair, std::uint32_t region);
  /// Calls `visit(pair)` for the pairs of a region, and takes those out that are none any more.
  template <typename Visit>
  void ForEachPair(std::uint32_t region, Visit&& visit) {
    std::uint32_t* link = &RegionOf(region).first;
    while (*link != kNone) {
      Pair& at = pairs_[*link];
      const unsigned slot = at.SlotOf(region);
      if (at.length == 0) {
        *link = at.next[slot];
        continue;
      }
      link = &at.next[slot];
      visit(NumberOf(at));
    }
  }
  /// Calls `visit(pair)` for the pairs of a region, which may leave its list meanwhile.
  template <typename Visit>
  void TakePairs(std::uint32_t region, Visit&& visit) {
    for (std::uint32_t pair = std::exchange(RegionOf(region).first, kNone); pair != kNone;) {
      const Pair& taken = pairs_[pair];
      const std::uint32_t next = taken.next[taken.SlotOf(region)];
      if (taken.length != 0) visit(pair);
      pair = next;
    }
  }
  /// Finds the pair of two regions by the list of the first; kNone where they are none.
  std::uint32_t FindPair(std::uint32_t region, std::uint32_t other) const;

  /// See MergeCost.
  double CostOf(const Pair& pair) const {
    return MergeCost({AreaOf(pair.ids[0]), MeansOf(pair.ids[0])},
                     {AreaOf(pair.ids[1]), MeansOf(pair.ids[1])}, bands_, pair.length, limits_);
  }
  /// How far the means of two regions are apart.
  double DistanceOf(std::uint32_t one, std::uint32_t other) const {
    return MeanDistance(MeansOf(one), MeansOf(other), bands_);
  }

  /// Finds the least of some pairs of a region: of equal costs that of the lowest rank.
  class Least {
   public:
    Least(const MergeGraph& graph, std::uint32_t region) : graph_(graph), region_(region) {}
    /// Looks at a pair whose cost is up to date. One that is no number is never the least.
    void Look(std::uint32_t pair) {
      const double cost = graph_.pairs_[pair].cost;
      if (!(cost <= cost_)) return;
      if (cost == cost_ && (pair_ == kNone || RankBeside(pair) > RankBeside(pair_))) return;
      pair_ = pair;
      cost_ = cost;
    }
    std::uint32_t Found() const { return pair_; }
    double Cost() const { return cost_; }

   private:
    std::uint32_t RankBeside(std::uint32_t pair) const {
      return graph_.RankOf(graph_.pairs_[pair].Other(region_));
    }
    const MergeGraph& graph_;
    std::uint32_t region_;
    std::uint32_t pair_ = kNone;
    double cost_ = kMergeCostLimit;
  };

 private:
  static double MeanDistance(const double* one, const double* other, std::uint32_t bands) {
    double sum = 0;
    for (std::uint32_t band = 0; band < bands; ++band) {
      sum += (one[band] - other[band]) * (one[band] - other[band]);
    }
    return std::sqrt(sum);
  }

  static constexpr std::uint32_t kMany = 0xFFFFFFFF;  // pixels, or more

  GrowthLimits limits_;
  std::uint32_t bands_ = 0;
  std::uint32_t count_ = 0;
  std::size_t stride_ = sizeof(Region);
  std::vector<std::byte, platform::HugePageAllocator<std::byte>> regions_;  // by number
  std::unordered_map<std::uint32_t, double> many_;                          // by region: its pixels
  std::vector<Pair, platform::HugePageAllocator<Pair>> pairs_;
};

}  // namespace lumo
