#include "fx/lambda_schedule.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include "tasks/parallel.h"

namespace lumo {

void LambdaSchedule::Begin(std::uint32_t labelCount, std::uint32_t bands) {
  graph_.Begin(labelCount, bands);
  queue_.Clear();
  ahead_.Clear();
  hubs_.Clear();
  hubNeighbours_ = MergeHubs::kNeighbours;
  grown_.clear();
}

void LambdaSchedule::CompareBy(std::vector<std::uint32_t>&& ranks) {
  constexpr std::uint32_t kBits = 0x7FFFFFFF;
  for (std::uint32_t label = 0; label < graph_.Count(); ++label) {
    graph_.RegionOf(label).rank = ranks[label] & kBits;
  }
  ranks = {};
}

/// Makes a pair the nearest of a region, and queues it when it is that of both of its regions.
void LambdaSchedule::Choose(std::uint32_t region, std::uint32_t pair) {
  Pair& chosen = graph_.PairOf(pair);
  graph_.RegionOf(region).minimum = pair;
  if (chosen.isChosen) {
    chosen.isQueued = true;
    Push({chosen.cost, pair});
  } else {
    chosen.isChosen = true;
  }
}

/// Makes a pair no longer the nearest of one of its regions.
void LambdaSchedule::Drop(Pair& chosen) {
  if (chosen.isQueued) {
    chosen.isQueued = false;  // that of the other one still
  } else {
    chosen.isChosen = false;
  }
}

/// Puts a pair into the queue, which holds fewer pairs that count than there are segments.
void LambdaSchedule::Push(const MergeQueue::Entry& entry) {
  if (queue_.Size() >= queue_.Room() && queue_.Size() >= graph_.Count()) {
    queue_.Clean([this](std::uint32_t pair) { return QueuedCostOf(pair); });
  }
  queue_.Push(entry);
}

/// The pair of a region that costs least; of equal costs the one with the lowest neighbour.
std::uint32_t LambdaSchedule::NearestOf(std::uint32_t region) {
  MergeGraph::Least least(graph_, region);
  graph_.ForEachPair(region, [&](std::uint32_t pair) { least.Look(pair); });
  return least.Found();
}

/// Finds the nearest neighbour of a region again.
void LambdaSchedule::FindNearest(std::uint32_t region) {
  std::uint32_t best = kNone;
  if (graph_.IsHub(region)) {
    best = hubs_.FindLeast(region);
  } else {
    std::uint32_t neighbours = 0;
    bool isWatched = false;
    MergeGraph::Least least(graph_, region);
    graph_.ForEachPair(region, [&](std::uint32_t pair) {
      Pair& at = graph_.PairOf(pair);
      if (!at.IsPlain()) {
        at.cost = graph_.CostOf(at);
        isWatched = true;
      }
      least.Look(pair);
      ++neighbours;
    });
    best = least.Found();
    if (isWatched) toExamine_.push_back(region);
    if (neighbours > hubNeighbours_) grown_.push_back(region);
  }
  if (best != kNone) {
    Choose(region, best);
  } else {
    graph_.RegionOf(region).minimum = kNone;
  }
}

void LambdaSchedule::Build(const std::vector<LabelPair>& pairs) {
  ReservePairs(pairs.size());
  for (const LabelPair& pair : pairs) AddPair(pair);
  Build();
}

void LambdaSchedule::Build() {
  constexpr unsigned kPart = 1U << 16U;
  const auto forEach = [](std::size_t count, const auto& work) {
    const auto parts = static_cast<unsigned>((count + kPart - 1) / kPart);
    ParallelFor(parts, nullptr, [&](unsigned part) {
      const std::size_t end = std::min<std::size_t>(count, std::size_t{part + 1} * kPart);
      for (std::size_t i = std::size_t{part} * kPart; i < end; ++i) {
        work(static_cast<std::uint32_t>(i));
      }
    });
  };
  const std::uint32_t count = graph_.Count();
  forEach(count, [this](std::uint32_t label) {
    const double area = graph_.AreaOf(label);
    if (area == 0) return;
    double* const means = graph_.MeansOf(label);
    for (std::uint32_t band = 0; band < graph_.Bands(); ++band) means[band] /= area;
  });
  forEach(graph_.PairCount(), [this](std::uint32_t pair) {
    graph_.PairOf(pair).cost = graph_.CostOf(graph_.PairOf(pair));
  });
  forEach(count, [this](std::uint32_t label) {
    if (label != 0 && graph_.AreaOf(label) > 0) {
      graph_.RegionOf(label).minimum = NearestOf(label);
    }
  });
  queue_.Reserve(count);
  for (std::uint32_t label = 1; label < count; ++label) {
    const std::uint32_t nearest = graph_.RegionOf(label).minimum;
    if (nearest != kNone) Choose(label, nearest);
  }
}

/// Gives the region that is kept the means and the pixels of both. @return how far its means move.
double LambdaSchedule::JoinMeans(std::uint32_t lower, std::uint32_t higher, std::uint32_t kept) {
  const double a = graph_.AreaOf(lower), b = graph_.AreaOf(higher);
  const double* const u = graph_.MeansOf(lower);
  const double* const v = graph_.MeansOf(higher);
  double* const means = graph_.MeansOf(kept);
  double sum = 0;
  for (std::uint32_t band = 0; band < graph_.Bands(); ++band) {
    const double mean = JoinedMean(a, u[band], b, v[band]), by = mean - means[band];
    means[band] = mean;
    sum += by * by;
  }
  graph_.SetArea(kept, a + b);
  return std::sqrt(sum);
}

/// Gives the pairs of the region that goes to the other one, joining those with common neighbours.
void LambdaSchedule::TakeOverPairs(const Joined& joined) {
  const auto [kept, gone] = joined;
  neighbours_.Clear();
  graph_.ForEachPair(kept, [&, kept = kept](std::uint32_t pair) {
    neighbours_.Add(graph_.PairOf(pair).Other(kept), pair);
  });
  graph_.TakePairs(gone, [&, kept = kept, gone = gone](std::uint32_t pair) {
    Pair& taken = graph_.PairOf(pair);
    const unsigned slot = taken.SlotOf(gone);
    const std::uint32_t common = neighbours_.PairTo(taken.ids[1 - slot]);
    if (common != kNone) {
      graph_.PairOf(common).length += taken.length;
      taken.length = 0;
    } else {
      taken.ids[slot] = kept;
      graph_.Link(pair, kept);
    }
  });
}

/// Joins the segments of a pair, and leaves costs as they were. Of hubs that of more neighbours is
/// kept, whichever has the lower label. @param merge  [out] who they are.
LambdaSchedule::Joined LambdaSchedule::Join(std::uint32_t pair, Merge& merge) {
  Pair& merged = graph_.PairOf(pair);
  std::uint32_t lower = merged.ids[0], higher = merged.ids[1];
  if (graph_.RankOf(lower) > graph_.RankOf(higher)) std::swap(lower, higher);
  merge.lower = hubs_.LabelOf(lower);
  merge.higher = hubs_.LabelOf(higher);
  merge.border = merged.length;
  merged.length = 0;
  const bool isLowerHub = graph_.IsHub(lower), isHigherHub = graph_.IsHub(higher);
  const bool keepsHigher =
      isHigherHub && (!isLowerHub || hubs_.SizeOf(higher) > hubs_.SizeOf(lower));
  const Joined joined = keepsHigher ? Joined{higher, lower} : Joined{lower, higher};
  moved_ = JoinMeans(lower, higher, joined.kept);
  changed_.clear();
  if (!isLowerHub && !isHigherHub) {
    TakeOverPairs(joined);
  } else {
    hubs_.TakeOver(joined.kept, joined.gone, !keepsHigher, changed_);
    hubs_.SetLabel(joined.kept, merge.lower);
    graph_.RegionOf(joined.kept).rank = graph_.RankOf(lower);
  }
  graph_.Forget(joined.gone, merge.lower);
  // A hub that has its number knows its label itself.
  if (graph_.AreaOf(merge.higher) == 0) graph_.Forget(merge.higher, merge.lower);
  return joined;
}

std::uint32_t LambdaSchedule::RootOf(std::uint32_t label) {
  const auto next = [this](std::uint32_t at) {
    return graph_.AreaOf(at) == 0 ? graph_.RankOf(at) : hubs_.LabelOf(at);
  };
  std::uint32_t root = label;
  for (std::uint32_t at = next(root); at != root; at = next(root)) root = at;
  while (label != root) {
    const std::uint32_t at = std::exchange(label, next(label));
    if (graph_.AreaOf(at) == 0) graph_.Forget(at, root);
  }
  return root;
}

/// Looks whether the nearest of a neighbour of the segment of a merge has changed.
/// @param pair  of both.
void LambdaSchedule::UpdateNearest(std::uint32_t pair, const Joined& joined) {
  const Pair& changed = graph_.PairOf(pair);
  const std::uint32_t neighbour = changed.Other(joined.kept);
  const std::uint32_t minimum = graph_.RegionOf(neighbour).minimum;
  if (minimum == kNone) return FindNearest(neighbour);
  Pair& nearest = graph_.PairOf(minimum);
  const std::uint32_t far = nearest.Other(neighbour);
  const bool isOfMerged = minimum == pair || far == joined.kept || far == joined.gone;
  if (isOfMerged) {
    Drop(nearest);
    FindNearest(neighbour);
    return;
  }
  const bool isWatched = !nearest.IsPlain() && !graph_.IsHub(neighbour);
  if (isWatched) {
    nearest.cost = graph_.CostOf(nearest);
    toExamine_.push_back(neighbour);
  }
  const bool isBeaten =
      nearest.cost > changed.cost || (nearest.cost == changed.cost && pair < minimum);
  if (!isBeaten) return;
  Drop(nearest);
  Choose(neighbour, pair);
}

/// Finds the pair of a segment that costs least, by the segments as they are now.
bool LambdaSchedule::FindCheapest(std::uint32_t region, std::uint32_t& pair, double& cost) const {
  pair = kNone;
  std::uint32_t bestRank = 0;
  for (std::uint32_t at = graph_.RegionOf(region).first; at != kNone;) {
    const Pair& seen = graph_.PairOf(at);
    at = seen.next[seen.SlotOf(region)];
    if (seen.length == 0) continue;
    const double costs = graph_.CostOf(seen);
    const std::uint32_t rank = graph_.RankOf(seen.Other(region));
    if (pair == kNone || costs < cost || (!(costs > cost) && rank < bestRank)) {
      pair = graph_.NumberOf(seen);
      cost = costs;
      bestRank = rank;
    }
  }
  return pair != kNone;
}

bool LambdaSchedule::Step(Merge& merge) {
  ahead_.Go();
  MergeQueue::Entry top{};
  const bool isAny = queue_.Pop(
      top, [this](std::uint32_t pair) { return QueuedCostOf(pair); },
      [this](std::uint32_t pair) { __builtin_prefetch(&graph_.PairOf(pair)); },
      [this](std::uint32_t pair) { ahead_.Add(pair); });
  if (!isAny) return false;
  graph_.PairOf(top.pair).isQueued = false;
  merge.lambda = top.cost;
  const Joined joined = Join(top.pair, merge);
  if (graph_.IsHub(joined.kept)) {
    UpdateAroundHub(joined);
  } else {
    UpdateAround(joined);
  }
  for (const std::uint32_t region : grown_) {
    if (!graph_.IsHub(region)) hubs_.Make(region, region);
  }
  grown_.clear();
  return true;
}

/// Brings costs and nearest neighbours around a merge up to date. Those of hubs come last, since
/// they look at what the others have found.
void LambdaSchedule::UpdateAround(const Joined& joined) {
  const std::uint32_t kept = joined.kept;
  graph_.ForEachPair(kept, [&](std::uint32_t pair) {
    Pair& changed = graph_.PairOf(pair);
    changed.cost = graph_.CostOf(changed);
    const std::uint32_t nearest = graph_.RegionOf(changed.Other(kept)).minimum;
    if (nearest != kNone) __builtin_prefetch(&graph_.PairOf(nearest));
  });
  hubPairs_.clear();
  graph_.ForEachPair(kept, [&](std::uint32_t pair) {
    if (graph_.PairOf(pair).IsPlain()) {
      UpdateNearest(pair, joined);
    } else {
      hubPairs_.push_back(pair);
    }
  });
  FindNearest(kept);
  ExamineChanged();
  for (const std::uint32_t pair : hubPairs_) UpdateNearest(pair, joined);
}

/// The same around a hub, but for the pairs that need not be looked at.
void LambdaSchedule::UpdateAroundHub(const Joined& joined) {
  hubs_.Move(joined.kept, moved_, changed_);
  const auto update = [&](std::uint32_t pair) {
    Pair& changed = graph_.PairOf(pair);
    changed.cost = graph_.CostOf(changed);
    UpdateNearest(pair, joined);
  };
  for (const std::uint32_t pair : changed_) {
    const std::uint32_t neighbour = graph_.PairOf(pair).Other(joined.kept);
    if (graph_.IsHub(neighbour)) continue;
    update(pair);
    toExamine_.push_back(neighbour);
  }
  ExamineChanged();
  hubs_.ForEachPeer(joined.kept, update);
  FindNearest(joined.kept);
}

/// Has the watched pairs looked at of regions whose nearest neighbour has changed.
void LambdaSchedule::ExamineChanged() {
  std::sort(toExamine_.begin(), toExamine_.end());
  toExamine_.erase(std::unique(toExamine_.begin(), toExamine_.end()), toExamine_.end());
  for (const std::uint32_t region : toExamine_) hubs_.Examine(region);
  toExamine_.clear();
}

}  // namespace lumo
