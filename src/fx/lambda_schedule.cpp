#include "fx/lambda_schedule.h"

#include <algorithm>
#include <memory>

#include "tasks/parallel.h"

namespace lumo {
void LambdaSchedule::Begin(std::uint32_t labelCount, std::uint32_t bands) {
  bands_ = bands;
  count_ = labelCount;
  stride_ = BytesOfSegment(bands);
  regions_.resize(labelCount * stride_);
  for (std::uint32_t label = 0; label < labelCount; ++label) {
    std::byte* const at = regions_.data() + label * stride_;
    (new (at) Region)->rank = label;
    std::uninitialized_fill_n(reinterpret_cast<double*>(at + sizeof(Region)), bands, 0.0);
  }
  limits_ = {};
  pairs_.clear();
  queue_.clear();
}

void LambdaSchedule::CompareBy(std::vector<std::uint32_t>&& ranks) {
  for (std::uint32_t label = 0; label < count_; ++label) RegionOf(label).rank = ranks[label];
  ranks = {};
}

void LambdaSchedule::AddPair(const LabelPair& pair) {
  Pair& added = pairs_.emplace_back();
  added.ids[0] = pair.low;
  added.ids[1] = pair.high;
  added.length = pair.length;
}

void LambdaSchedule::Link(std::uint32_t pair, std::uint32_t region) {
  Pair& linked = pairs_[pair];
  Region& owner = RegionOf(region);
  linked.next[linked.SlotOf(region)] = owner.first;
  owner.first = pair;
}

/// Calls `visit(pair)` for the pairs of a region, and takes those out that are none any more.
template <typename Visit>
void LambdaSchedule::ForEachPair(std::uint32_t region, Visit&& visit) {
  std::uint32_t* link = &RegionOf(region).first;
  while (*link != kNone) {
    Pair& at = pairs_[*link];
    const unsigned slot = at.SlotOf(region);
    if (at.length == 0) {
      *link = at.next[slot];
      continue;
    }
    link = &at.next[slot];
    visit(static_cast<std::uint32_t>(&at - pairs_.data()));
  }
}

double LambdaSchedule::CostOf(const Pair& pair) const {
  return MergeCost({RegionOf(pair.ids[0]).area, MeansOf(pair.ids[0])},
                   {RegionOf(pair.ids[1]).area, MeansOf(pair.ids[1])}, bands_, pair.length,
                   limits_);
}

/// Makes a pair the nearest of a region, and queues it when it is that of both of its regions.
void LambdaSchedule::Choose(std::uint32_t region, std::uint32_t pair) {
  Pair& chosen = pairs_[pair];
  RegionOf(region).minimum = pair;
  if (chosen.isChosen) {
    chosen.isQueued = true;
    Push({chosen.cost, pair});
  } else {
    chosen.isChosen = true;
  }
}

/// Puts a pair into the queue, which holds fewer pairs that count than there are segments.
void LambdaSchedule::Push(const Queued& entry) {
  if (queue_.size() == queue_.capacity() && queue_.size() >= count_) {
    std::erase_if(queue_, [this](const Queued& queued) { return !IsCurrent(queued); });
    std::make_heap(queue_.begin(), queue_.end());
  }
  queue_.push_back(entry);
  std::push_heap(queue_.begin(), queue_.end());
}

/// The pair of a region that costs least; of equal costs the one with the lowest neighbour.
std::uint32_t LambdaSchedule::NearestOf(std::uint32_t region) {
  std::uint32_t best = kNone;
  double bestCost = kMergeCostLimit;
  ForEachPair(region, [&](std::uint32_t pair) {
    const double cost = pairs_[pair].cost;
    if (!(cost <= bestCost)) return;  // nor is a cost that is no number ever the least
    if (cost == bestCost && (best == kNone || RankOf(pairs_[pair].Other(region)) >
                                                  RankOf(pairs_[best].Other(region)))) {
      return;
    }
    best = pair;
    bestCost = cost;
  });
  return best;
}

void LambdaSchedule::FindNearest(std::uint32_t region) {
  const std::uint32_t best = NearestOf(region);
  if (best != kNone) {
    Choose(region, best);
  } else {
    RegionOf(region).minimum = kNone;
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
  for (std::uint32_t i = 0; i < pairs_.size(); ++i) {
    Link(i, pairs_[i].ids[0]);
    Link(i, pairs_[i].ids[1]);
  }
  forEach(count_, [this](std::uint32_t label) {
    const double area = RegionOf(label).area;
    if (area == 0) return;
    double* const means = MeansOf(label);
    for (std::uint32_t band = 0; band < bands_; ++band) means[band] /= area;
  });
  forEach(pairs_.size(), [this](std::uint32_t pair) { pairs_[pair].cost = CostOf(pairs_[pair]); });
  forEach(count_, [this](std::uint32_t label) {
    if (label != 0 && RegionOf(label).area > 0) RegionOf(label).minimum = NearestOf(label);
  });
  queue_.reserve(count_);
  for (std::uint32_t label = 1; label < count_; ++label) {
    const std::uint32_t nearest = RegionOf(label).minimum;
    if (nearest != kNone) Choose(label, nearest);
  }
}

void LambdaSchedule::JoinMeans(std::uint32_t lower, std::uint32_t higher) {
  const double a = RegionOf(lower).area, b = RegionOf(higher).area;
  double* const u = MeansOf(lower);
  const double* const v = MeansOf(higher);
  for (std::uint32_t band = 0; band < bands_; ++band) {
    u[band] = JoinedMean(a, u[band], b, v[band]);
  }
  RegionOf(lower).area = a + b;
}

/// Gives the pairs of `higher` to `lower`, joining those with common neighbours.
void LambdaSchedule::TakeOverPairs(std::uint32_t lower, std::uint32_t higher) {
  ForEachPair(lower,
              [&](std::uint32_t pair) { RegionOf(pairs_[pair].Other(lower)).pairTo = pair; });
  for (std::uint32_t pair = RegionOf(higher).first; pair != kNone;) {
    Pair& taken = pairs_[pair];
    const unsigned slot = taken.SlotOf(higher);
    const std::uint32_t next = taken.next[slot];
    if (taken.length != 0) {
      const std::uint32_t common = RegionOf(taken.ids[1 - slot]).pairTo;
      if (common != kNone) {
        pairs_[common].length += taken.length;
        taken.length = 0;
      } else {
        taken.ids[slot] = lower;
        Link(pair, lower);
      }
    }
    pair = next;
  }
  RegionOf(higher).first = kNone;
  ForEachPair(lower,
              [&](std::uint32_t pair) { RegionOf(pairs_[pair].Other(lower)).pairTo = kNone; });
}

/// Looks whether the nearest of a neighbour of `lower` has changed by the merge.
/// @param pair  of the neighbour and `lower`.
void LambdaSchedule::UpdateNearest(std::uint32_t neighbour, std::uint32_t pair, std::uint32_t lower,
                                   std::uint32_t higher) {
  const std::uint32_t minimum = RegionOf(neighbour).minimum;
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
  pairs_[pair].length = 0;
  JoinMeans(lower, higher);
  TakeOverPairs(lower, higher);
}

/// Finds the pair of a segment that costs least, by the segments as they are now.
bool LambdaSchedule::FindCheapest(std::uint32_t region, std::uint32_t& pair, double& cost) const {
  pair = kNone;
  std::uint32_t bestRank = 0;
  for (std::uint32_t at = RegionOf(region).first; at != kNone;) {
    const Pair& seen = pairs_[at];
    at = seen.next[seen.SlotOf(region)];
    if (seen.length == 0) continue;
    const double costs = CostOf(seen);
    const std::uint32_t rank = RankOf(seen.Other(region));
    if (pair == kNone || costs < cost || (!(costs > cost) && rank < bestRank)) {
      pair = static_cast<std::uint32_t>(&seen - pairs_.data());
      cost = costs;
      bestRank = rank;
    }
  }
  return pair != kNone;
}

/// Has the processor fetch what the next steps are likely to need, while this one goes on.
void LambdaSchedule::FetchNext() const {
  constexpr std::size_t kAhead = 7;  // the three uppermost rows of the heap
  for (std::size_t i = 1; i < std::min(kAhead, queue_.size()); ++i) {
    const Pair& pair = pairs_[queue_[i].pair];
    if (i > 2) {
      __builtin_prefetch(&pair);
      continue;
    }
    for (const std::uint32_t region : pair.ids) {
      __builtin_prefetch(&RegionOf(region));
      __builtin_prefetch(&pairs_[std::min<std::size_t>(RegionOf(region).first, pairs_.size() - 1)]);
    }
  }
}

bool LambdaSchedule::Step(Merge& merge) {
  const auto pop = [this] {
    std::pop_heap(queue_.begin(), queue_.end());
    queue_.pop_back();
  };
  while (!queue_.empty() && !IsCurrent(queue_.front())) pop();
  if (queue_.empty()) return false;
  const Queued top = queue_.front();
  pop();
  FetchNext();
  Pair& merged = pairs_[top.pair];
  merged.isQueued = false;
  merge.lambda = top.cost;
  Join(top.pair, merge);
  const std::uint32_t lower = merge.lower, higher = merge.higher;
  ForEachPair(lower, [&](std::uint32_t pair) {
    pairs_[pair].cost = CostOf(pairs_[pair]);
    const std::uint32_t nearest = RegionOf(pairs_[pair].Other(lower)).minimum;
    if (nearest != kNone) __builtin_prefetch(&pairs_[nearest]);
  });
  ForEachPair(lower, [&](std::uint32_t pair) {
    UpdateNearest(pairs_[pair].Other(lower), pair, lower, higher);
  });
  FindNearest(lower);
  return true;
}

}  // namespace lumo
