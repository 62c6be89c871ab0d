#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <new>
#include <queue>
#include <vector>

#include "fx/label_pairs.h"
#include "fx/merge_cost.h"
#include "platform/huge_pages.h"

namespace lumo {

/// Neighbouring segments of a label image, and the cost of joining them (MergeCost). Merges the
/// cheapest pair of mutually nearest segments, one after the other, with costs brought up to date
/// after each.
///
/// Ties: a segment's nearest neighbour is the one of the lowest label among equal costs when all
/// are searched, and the pair that was found first when a cost has changed; of equal costs the pair
/// that was found first in the image is merged first.
///
/// Cost: a merge looks at the neighbours of the two segments, and at those of neighbours whose
/// nearest was one of the two.
/// Threads: one at a time; the arrays are kept from image to image.
///
///     schedule.Begin(labelCount + 1, bands);
///     for (std::size_t i = 0; i < pixels; ++i) schedule.AddPixel(labels[i], values + i, pixels);
///     schedule.Build(pairs.Pairs());
///     LambdaSchedule::Merge merge;
///     while (schedule.Step(merge) && merge.lambda < most) parent[merge.higher] = merge.lower;
class VEXG_EXPORT LambdaSchedule {
 public:
  /// A merge of `higher` into `lower`.
  struct Merge {
    double lambda = 0;  ///< the cost
    std::uint32_t lower = 0;
    std::uint32_t higher = 0;
    std::uint32_t border = 0;  ///< length of the common boundary, in pixel edges
  };

  /// Forgets everything, and makes room for labels below `labelCount`, of `bands` bands.
  void Begin(std::uint32_t labelCount, std::uint32_t bands);

  /// Takes numbers by which labels are compared, where not by their own: the lower of a pair is the
  /// one with the lower number. Behind Begin. @param ranks  by label, all different.
  void CompareBy(std::vector<std::uint32_t>&& ranks);

  /// Limits how segments grow; see GrowthLimits. Behind Begin.
  void Limit(const GrowthLimits& limits) { limits_ = limits; }

  /// Adds a pixel to its segment.
  /// @param label   not 0.
  /// @param values  one for each band.
  template <typename T>
  void AddPixel(std::uint32_t label, const T* values, std::size_t bandStride) {
    double* const sums = MeansOf(label);
    for (std::uint32_t band = 0; band < bands_; ++band) {
      sums[band] += static_cast<double>(values[band * bandStride]);
    }
    RegionOf(label).area += 1.0;
  }

  /// Makes room for pairs of neighbours.
  void ReservePairs(std::size_t count) { pairs_.reserve(count); }
  /// Adds a pair of neighbours, behind those that were found before. None has the label 0.
  void AddPair(const LabelPair& pair);
  /// Adds to the common boundary of a pair. @param pair  by the order in which pairs were added.
  void Lengthen(std::size_t pair, std::uint32_t length) { pairs_[pair].length += length; }

  /// Computes means and costs, and finds the nearest neighbours. Behind all pixels and pairs. All
  /// threads work on many pairs.
  void Build();
  /// Adds pairs first.
  void Build(const std::vector<LabelPair>& pairs);

  /// The pixels of a segment, and the mean of one of its bands. Behind Build.
  double AreaOf(std::uint32_t label) const { return RegionOf(label).area; }
  double MeanOf(std::uint32_t label, std::uint32_t band) const { return MeansOf(label)[band]; }

  /// The bytes that a segment and a pair of neighbours take, less what stands in the queue.
  static constexpr std::size_t BytesOfSegment(std::uint32_t bands) {
    return sizeof(Region) + bands * sizeof(double);
  }
  static constexpr std::size_t BytesOfPair() { return sizeof(Pair); }
  /// The bytes that the queue takes for each segment at most.
  static constexpr std::size_t BytesInQueue() { return sizeof(Queued); }

  /// Merges the next pair. @return false when there is none.
  bool Step(Merge& merge);

  /// Joins the segments of fewer than `least` pixels to the neighbour that costs least, one with
  /// the lowest label among equal costs: the smallest segment first, the lowest label among equal
  /// sizes, with sizes and costs brought up to date after each, until none has a neighbour any
  /// more. No limit of sizes holds. Behind the last step. `visit(merge)` hears of each.
  template <typename Visit>
  void JoinSmall(double least, Visit&& visit);

 private:
  static constexpr std::uint32_t kNone = 0xFFFFFFFF;

  /// A segment; the means of its bands follow it in memory, as they are read with it.
  struct Region {
    double area = 0;
    std::uint32_t minimum = kNone;  // pair
    std::uint32_t first = kNone;    // of its pairs
    std::uint32_t pairTo = kNone;   // the pair with the region that is merged into
    std::uint32_t rank = 0;
  };

  /// A pair stands in the lists of both of its regions; slot i of the links belongs to ids[i]. One
  /// that was merged, or joined to another, has no length any more, and leaves a list when somebody
  /// goes through it next.
  struct Pair {
    std::uint32_t ids[2] = {};
    std::uint32_t next[2] = {};
    double cost = 0;
    std::uint32_t length = 0;
    bool isChosen = false;
    bool isQueued = false;

    unsigned SlotOf(std::uint32_t region) const { return ids[0] == region ? 0 : 1; }
    std::uint32_t Other(std::uint32_t region) const { return ids[0] == region ? ids[1] : ids[0]; }
  };
  static_assert(sizeof(Region) == 24 && sizeof(Pair) == 32);

  /// A pair in the queue. It is out of date when the pair has left the queue since, or has come
  /// back at another cost.
  struct Queued {
    double cost;
    std::uint32_t pair;
    bool operator<(const Queued& other) const {  // the cheapest on top
      return cost != other.cost ? cost > other.cost : pair > other.pair;
    }
  };

  bool IsCurrent(const Queued& entry) const {
    const Pair& pair = pairs_[entry.pair];
    return pair.isQueued && pair.cost == entry.cost;
  }
  Region& RegionOf(std::uint32_t label) {
    return *std::launder(reinterpret_cast<Region*>(regions_.data() + label * stride_));
  }
  const Region& RegionOf(std::uint32_t label) const {
    return *std::launder(reinterpret_cast<const Region*>(regions_.data() + label * stride_));
  }
  double* MeansOf(std::uint32_t label) {
    return std::launder(
        reinterpret_cast<double*>(regions_.data() + label * stride_ + sizeof(Region)));
  }
  const double* MeansOf(std::uint32_t label) const {
    return std::launder(
        reinterpret_cast<const double*>(regions_.data() + label * stride_ + sizeof(Region)));
  }
  std::uint32_t RankOf(std::uint32_t label) const { return RegionOf(label).rank; }
  template <typename Visit>
  void ForEachPair(std::uint32_t region, Visit&& visit);
  void Link(std::uint32_t pair, std::uint32_t region);
  double CostOf(const Pair& pair) const;
  void Join(std::uint32_t pair, Merge& merge);
  bool FindCheapest(std::uint32_t region, std::uint32_t& pair, double& cost) const;
  void Choose(std::uint32_t region, std::uint32_t pair);
  std::uint32_t NearestOf(std::uint32_t region);
  void FindNearest(std::uint32_t region);
  void Push(const Queued& entry);
  void FetchNext() const;
  void JoinMeans(std::uint32_t lower, std::uint32_t higher);
  void TakeOverPairs(std::uint32_t lower, std::uint32_t higher);
  void UpdateNearest(std::uint32_t neighbour, std::uint32_t pair, std::uint32_t lower,
                     std::uint32_t higher);

  /// A segment that is too small; the smallest is on top.
  struct Small {
    double area;
    std::uint32_t rank;
    std::uint32_t region;
    bool operator<(const Small& other) const {
      return area != other.area ? area > other.area : rank > other.rank;
    }
  };

  GrowthLimits limits_;
  std::uint32_t bands_ = 0;
  std::uint32_t count_ = 0;  // of regions
  std::size_t stride_ = sizeof(Region);
  std::vector<std::byte, platform::HugePageAllocator<std::byte>> regions_;  // by label
  std::vector<Pair, platform::HugePageAllocator<Pair>> pairs_;
  std::vector<Queued> queue_;  // a heap
};

template <typename Visit>
void LambdaSchedule::JoinSmall(double least, Visit&& visit) {
  limits_.mostPixels = std::numeric_limits<double>::infinity();
  std::priority_queue<Small> small;
  const auto note = [&](std::uint32_t region) {
    const double area = RegionOf(region).area;
    if (area > 0 && area < least) small.push({area, RankOf(region), region});
  };
  for (std::uint32_t region = 1; region < count_; ++region) note(region);
  while (!small.empty()) {
    const Small top = small.top();
    small.pop();
    if (RegionOf(top.region).area != top.area) continue;  // it has joined another, or grown
    Merge merge;
    std::uint32_t pair = kNone;
    if (!FindCheapest(top.region, pair, merge.lambda)) continue;
    Join(pair, merge);
    RegionOf(merge.higher).area = 0;
    note(merge.lower);
    visit(merge);
  }
}

}  // namespace lumo
