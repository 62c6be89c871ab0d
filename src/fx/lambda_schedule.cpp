#include "fx/lambda_schedule.h"

#include <algorithm>
#include <cmath>

namespace lumo {
namespace {

constexpr double kCostLimit = 2147483647.0;  // a pair of this cost or more is never merged

}  // namespace

void LambdaSchedule::Begin(std::uint32_t labelCount, std::uint32_t bands) {
  bands_ = bands;
  regions_.assign(labelCount, {});
  means_.assign(std::size_t{labelCount} * bands, 0.0);
  limits_ = {};
  ranks_.clear();
  pairs_.clear();
  queue_ = {};
  pairTo_.assign(labelCount, kNone);
}

void LambdaSchedule::Link(std::uint32_t pair, std::uint32_t region) {
  Pair& linked = pairs_[pair];
  const unsigned slot = linked.SlotOf(region);
  const std::uint32_t first = regions_[region].first;
  linked.next[slot] = first;
  linked.previous[slot] = kNone;
  if (first != kNone) pairs_[first].previous[pairs_[first].SlotOf(region)] = pair;
  regions_[region].first = pair;
}

void LambdaSchedule::Unlink(std::uint32_t pair, std::uint32_t region) {
  const Pair& linked = pairs_[pair];
  const unsigned slot = linked.SlotOf(region);
  const std::uint32_t next = linked.next[slot], previous = linked.previous[slot];
  if (next != kNone) pairs_[next].previous[pairs_[next].SlotOf(region)] = previous;
  if (previous != kNone) {
    pairs_[previous].next[pairs_[previous].SlotOf(region)] = next;
  } else {
    regions_[region].first = next;
  }
}

template <typename Visit>
void LambdaSchedule::ForEachPair(std::uint32_t region, Visit&& visit) {
  for (std::uint32_t pair = regions_[region].first; pair != kNone;) {
    const std::uint32_t next = pairs_[pair].next[pairs_[pair].SlotOf(region)];
    visit(pair);
    pair = next;
  }
}

double LambdaSchedule::CostOf(const Pair& pair) const {
  const double a = regions_[pair.ids[0]].area, b = regions_[pair.ids[1]].area;
  if (a == 0 || b == 0 || pair.length == 0) return 0;
  if (a + b > limits_.mostPixels) return std::numeric_limits<double>::infinity();
  const double* const u = means_.data() + std::size_t{pair.ids[0]} * bands_;
  const double* const v = means_.data() + std::size_t{pair.ids[1]} * bands_;
  double sum = 0;
  for (std::uint32_t band = 0; band < bands_; ++band) {
    const double difference = u[band] - v[band];
    sum += difference * difference;
  }
  const double cost = a * b / (a + b) * sum / pair.length;
  return limits_.compactness == 0 ? cost : cost / std::pow(pair.length, limits_.compactness);
}

/// Makes a pair the nearest of a region, and queues it when it is that of both of its regions.
void LambdaSchedule::Choose(std::uint32_t region, std::uint32_t pair) {
  Pair& chosen = pairs_[pair];
  regions_[region].minimum = pair;
  if (chosen.isChosen) {
    chosen.isQueued = true;
    queue_.push({chosen.cost, pair});
  } else {
    chosen.isChosen = true;
  }
}

void LambdaSchedule::FindNearest(std::uint32_t region) {
  std::uint32_t best = kNone, bestRank = 0;
  double bestCost = kCostLimit;
  ForEachPair(region, [&](std::uint32_t pair) {
    const double cost = pairs_[pair].cost;
    if (!(cost <= bestCost)) return;  // nor is a cost that is no number ever the least
    const std::uint32_t rank = RankOf(pairs_[pair].Other(region));
    if (cost == bestCost && (best == kNone || rank > bestRank)) return;
    best = pair;
    bestRank = rank;
    bestCost = cost;
  });
  if (best != kNone) {
    Choose(region, best);
  } else {
    regions_[region].minimum = kNone;
  }
}

void LambdaSchedule::Build(const std::vector<LabelPair>& pairs) {
  pairs_.resize(pairs.size());
  for (std::uint32_t i = 0; i < pairs_.size(); ++i) {
    pairs_[i] = {};
    pairs_[i].ids[0] = pairs[i].low;
    pairs_[i].ids[1] = pairs[i].high;
    pairs_[i].length = pairs[i].length;
    Link(i, pairs[i].low);
    Link(i, pairs[i].high);
  }
  for (std::size_t label = 0; label < regions_.size(); ++label) {
    const double area = regions_[label].area;
    if (area == 0) continue;
    for (std::uint32_t band = 0; band < bands_; ++band) means_[label * bands_ + band] /= area;
  }
  for (Pair& pair : pairs_) pair.cost = CostOf(pair);
  for (std::uint32_t label = 1; label < regions_.size(); ++label) {
    if (regions_[label].area > 0) FindNearest(label);
  }
}

void LambdaSchedule::JoinMeans(std::uint32_t lower, std::uint32_t higher) {
  const double a = regions_[lower].area, b = regions_[higher].area;
  double* const u = means_.data() + std::size_t{lower} * bands_;
  const double* const v = means_.data() + std::size_t{higher} * bands_;
  for (std::uint32_t band = 0; band < bands_; ++band) {
    u[band] = a + b != 0 ? b / (a + b) * v[band] + a / (a + b) * u[band] : 0;
  }
  regions_[lower].area = a + b;
}

/// Gives the pairs of `higher` to `lower`, joining those with common neighbours.
void LambdaSchedule::TakeOverPairs(std::uint32_t lower, std::uint32_t higher) {
  ForEachPair(lower, [&](std::uint32_t pair) { pairTo_[pairs_[pair].Other(lower)] = pair; });
  ForEachPair(higher, [&](std::uint32_t pair) {
    const std::uint32_t neighbour = pairs_[pair].Other(higher);
    const std::uint32_t common = pairTo_[neighbour];
    if (common != kNone) {
      pairs_[common].length += pairs_[pair].length;
      Unlink(pair, neighbour);
    } else {
      Relabel(pair, higher, lower);
    }
  });
  regions_[higher].first = kNone;
  ForEachPair(lower, [&](std::uint32_t pair) { pairTo_[pairs_[pair].Other(lower)] = kNone; });
}

/// Gives a pair of a region to another one; its place in the list of the first is forgotten.
void LambdaSchedule::Relabel(std::uint32_t pair, std::uint32_t from, std::uint32_t to) {
  Pair& moved = pairs_[pair];
  moved.ids[moved.SlotOf(from)] = to;
  Link(pair, to);
}

/// Looks whether the nearest of a neighbour of `lower` has changed by the merge.
/// @param pair  of the neighbour and `lower`.
void LambdaSchedule::UpdateNearest(std::uint32_t neighbour, std::uint32_t pair, std::uint32_t lower,
                                   std::uint32_t higher) {
  const std::uint32_t minimum = regions_[neighbour].minimum;
  if (minimum == kNone) return FindNearest(neighbour);
  Pair& nearest = pairs_[minimum];
  const Pair& changed = pairs_[pair];
  const std::uint32_t far = nearest.Other(neighbour);
  const bool isOfMerged = minimum == pair || far == lower || far == higher;
  if (isOfMerged) {
    nearest.isChosen = false;
    FindNearest(neighbour);
    return;
  }
  const bool isBeaten =
      nearest.cost > changed.cost || (nearest.cost == changed.cost && pair < minimum);
  if (!isBeaten) return;
  if (nearest.isQueued) {
    nearest.isQueued = false;
  } else {
    nearest.isChosen = false;
  }
  Choose(neighbour, pair);
}

/// Joins the segments of a pair, and leaves costs as they were. @param merge  [out] who they are.
void LambdaSchedule::Join(std::uint32_t pair, Merge& merge) {
  std::uint32_t lower = pairs_[pair].ids[0], higher = pairs_[pair].ids[1];
  if (RankOf(lower) > RankOf(higher)) std::swap(lower, higher);
  merge.lower = lower;
  merge.higher = higher;
  merge.border = pairs_[pair].length;
  Unlink(pair, lower);
  Unlink(pair, higher);
  JoinMeans(lower, higher);
  TakeOverPairs(lower, higher);
}

/// Finds the pair of a segment that costs least, by the segments as they are now.
bool LambdaSchedule::FindCheapest(std::uint32_t region, std::uint32_t& pair, double& cost) const {
  pair = kNone;
  std::uint32_t bestRank = 0;
  for (std::uint32_t at = regions_[region].first; at != kNone;) {
    const Pair& seen = pairs_[at];
    const double costs = CostOf(seen);
    const std::uint32_t rank = RankOf(seen.Other(region));
    if (pair == kNone || costs < cost || (!(costs > cost) && rank < bestRank)) {
      pair = at;
      cost = costs;
      bestRank = rank;
    }
    at = seen.next[seen.SlotOf(region)];
  }
  return pair != kNone;
}

bool LambdaSchedule::Step(Merge& merge) {
  while (!queue_.empty() && !IsCurrent(queue_.top())) queue_.pop();
  if (queue_.empty()) return false;
  const Queued top = queue_.top();
  queue_.pop();
  Pair& merged = pairs_[top.pair];
  merged.isQueued = false;
  merge.lambda = top.cost;
  Join(top.pair, merge);
  const std::uint32_t lower = merge.lower, higher = merge.higher;
  ForEachPair(lower, [&](std::uint32_t pair) { pairs_[pair].cost = CostOf(pairs_[pair]); });
  ForEachPair(lower, [&](std::uint32_t pair) {
    UpdateNearest(pairs_[pair].Other(lower), pair, lower, higher);
  });
  FindNearest(lower);
  return true;
}

}  // namespace lumo
