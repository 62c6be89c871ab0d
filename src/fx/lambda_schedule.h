#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <queue>
#include <vector>

#include "fx/merge_ahead.h"
#include "fx/merge_graph.h"
#include "fx/merge_hubs.h"
#include "fx/merge_queue.h"
#include "fx/neighbour_table.h"

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
/// nearest was one of the two; of segments with very many neighbours only at those for whom it may
/// matter (MergeHubs).
/// Threads: one at a time; the arrays are kept from image to image.
///
///     schedule.Begin(labelCount + 1, bands);
///     for (std::size_t i = 0; i < pixels; ++i) schedule.AddPixel(labels[i], values + i, pixels);
///     schedule.Build(pairs.Pairs());
///     LambdaSchedule::Merge merge;
///     while (schedule.Step(merge) && merge.lambda < most) parent[merge.higher] = merge.lower;
class VEXG_EXPORT LambdaSchedule {
 public:
  LambdaSchedule() = default;
  LambdaSchedule(const LambdaSchedule&) = delete;
  LambdaSchedule& operator=(const LambdaSchedule&) = delete;

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
  void Limit(const GrowthLimits& limits) { graph_.Limit(limits); }
  /// Watches segments of more neighbours than this as hubs, which changes no merge. Behind Begin.
  void MakeHubsAbove(std::uint32_t neighbours) { hubNeighbours_ = neighbours; }

  /// Adds a pixel to its segment.
  /// @param label   not 0.
  /// @param values  one for each band.
  template <typename T>
  void AddPixel(std::uint32_t label, const T* values, std::size_t bandStride) {
    double* const sums = graph_.MeansOf(label);
    for (std::uint32_t band = 0; band < graph_.Bands(); ++band) {
      sums[band] += static_cast<double>(values[band * bandStride]);
    }
    graph_.AddPixel(label);
  }

  /// Adds pixels to their segment. @param sums  of their values, one for each band.
  void AddSums(std::uint32_t label, double pixels, const double* sums) {
    double* const to = graph_.MeansOf(label);
    for (std::uint32_t band = 0; band < graph_.Bands(); ++band) to[band] += sums[band];
    graph_.SetArea(label, graph_.AreaOf(label) + pixels);
  }

  /// Makes room for pairs of neighbours.
  void ReservePairs(std::size_t count) { graph_.ReservePairs(count); }
  /// Adds a pair of neighbours, behind those that were found before. None has the label 0.
  void AddPair(const LabelPair& pair) { graph_.AddPair(pair); }
  /// Adds to the common boundary of a pair. @param pair  by the order in which pairs were added.
  void Lengthen(std::size_t pair, std::uint32_t length) {
    graph_.PairOf(static_cast<std::uint32_t>(pair)).length += length;
  }

  /// Computes means and costs, and finds the nearest neighbours. Behind all pixels and pairs. All
  /// threads work on many pairs.
  void Build();
  /// Adds pairs first.
  void Build(const std::vector<LabelPair>& pairs);

  /// The pixels of a segment, and the mean of one of its bands. Behind Build, before any step.
  double AreaOf(std::uint32_t label) const { return graph_.AreaOf(label); }
  double MeanOf(std::uint32_t label, std::uint32_t band) const {
    return graph_.MeansOf(label)[band];
  }

  /// The bytes that a segment and a pair of neighbours take, less what stands in the queue.
  static constexpr std::size_t BytesOfSegment(std::uint32_t bands) {
    return MergeGraph::BytesOfRegion(bands);
  }
  static constexpr std::size_t BytesOfPair() { return sizeof(MergeGraph::Pair); }
  /// The bytes that the queue takes for each segment at most: half as many where costs differ.
  static constexpr std::size_t BytesInQueue() { return sizeof(MergeQueue::Entry); }

  /// Merges the next pair. @return false when there is none.
  bool Step(Merge& merge);

  /// Joins the segments of fewer than `least` pixels to the neighbour that costs least, one with
  /// the lowest label among equal costs: the smallest segment first, the lowest label among equal
  /// sizes, with sizes and costs brought up to date after each, until none has a neighbour any
  /// more. No limit of sizes holds. Behind the last step. `visit(merge)` hears of each.
  template <typename Visit>
  void JoinSmall(double least, Visit&& visit);

  /// The label of the segment that one has become part of by now, as merges call it. Each label
  /// has a pixel.
  std::uint32_t RootOf(std::uint32_t label);

 private:
  using Pair = MergeGraph::Pair;
  static constexpr std::uint32_t kNone = MergeGraph::kNone;

  /// Two regions of which one is left, by their numbers in the graph.
  struct Joined {
    std::uint32_t kept;
    std::uint32_t gone;
  };

  /// Gives the cost of a pair that is in the queue, which doesn't change; below 0 for another.
  double QueuedCostOf(std::uint32_t pair) const {
    const Pair& at = graph_.PairOf(pair);
    return at.isQueued ? at.cost : -1;
  }
  Joined Join(std::uint32_t pair, Merge& merge);
  double JoinMeans(std::uint32_t lower, std::uint32_t higher, std::uint32_t kept);
  void TakeOverPairs(const Joined& joined);
  bool FindCheapest(std::uint32_t region, std::uint32_t& pair, double& cost) const;
  void Choose(std::uint32_t region, std::uint32_t pair);
  static void Drop(Pair& chosen);
  std::uint32_t NearestOf(std::uint32_t region);
  void FindNearest(std::uint32_t region);
  void Push(const MergeQueue::Entry& entry);
  void UpdateNearest(std::uint32_t pair, const Joined& joined);
  void UpdateAround(const Joined& joined);
  void UpdateAroundHub(const Joined& joined);
  void ExamineChanged();

  /// A segment that is too small; the smallest is on top.
  struct Small {
    double area;
    std::uint32_t rank;
    std::uint32_t region;
    bool operator<(const Small& other) const {
      return area != other.area ? area > other.area : rank > other.rank;
    }
  };

  MergeGraph graph_;  // a region that is no hub has the number of its label
  MergeQueue queue_;
  MergeAhead ahead_{graph_};
  NeighbourTable neighbours_;  // of the segment that is kept
  MergeHubs hubs_{graph_};
  std::uint32_t hubNeighbours_ = MergeHubs::kNeighbours;
  double moved_ = 0;                      // by how much the last merge moved the means of a hub
  std::vector<std::uint32_t> changed_;    // pairs of the hub of a merge
  std::vector<std::uint32_t> hubPairs_;   // pairs of a merge with hubs
  std::vector<std::uint32_t> toExamine_;  // regions whose watched pairs have to be looked at
  std::vector<std::uint32_t> grown_;      // regions that have become hubs
};

template <typename Visit>
void LambdaSchedule::JoinSmall(double least, Visit&& visit) {
  GrowthLimits limits = graph_.Limits();
  limits.mostPixels = std::numeric_limits<double>::infinity();
  graph_.Limit(limits);
  std::priority_queue<Small> small;
  const auto note = [&](std::uint32_t region) {
    const double area = graph_.AreaOf(region);
    if (area > 0 && area < least) small.push({area, graph_.RankOf(region), region});
  };
  for (std::uint32_t region = 1; region < graph_.Count(); ++region) note(region);
  while (!small.empty()) {
    const Small top = small.top();
    small.pop();
    if (graph_.AreaOf(top.region) != top.area) continue;  // it has joined another, or grown
    Merge merge;
    std::uint32_t pair = kNone;
    if (!FindCheapest(top.region, pair, merge.lambda)) continue;
    const Joined joined = Join(pair, merge);
    note(joined.kept);
    visit(merge);
  }
}

}  // namespace lumo
