#include "fx/merge_hubs.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <limits>
#include <utility>

namespace lumo {
namespace {

constexpr double kInfinity = std::numeric_limits<double>::infinity();
// Distances and costs have relative errors far below this.
constexpr double kSafe = 1e-9;
constexpr double kGrowth = 2;  // of the area of a hub, up to which its distances hold

}  // namespace

void MergeHubs::Make(std::uint32_t region, std::uint32_t label) {
  graph_.RegionOf(region).isHub = 1;
  const auto made = hubs_.emplace(region, std::make_unique<Hub>()).first;
  made->second->label = label;
  graph_.ForEachPair(region, [&](std::uint32_t pair) {
    if (graph_.IsHub(graph_.PairOf(pair).Other(region))) MakePeers(pair);
  });
  std::vector<std::uint32_t> watched;
  Renew(region, *made->second, watched);
  for (const std::uint32_t pair : watched) Examine(graph_.PairOf(pair).Other(region));
}

/// Has two hubs know their pair.
void MergeHubs::MakePeers(std::uint32_t pair) {
  Pair& made = graph_.PairOf(pair);
  made.watch = kPeer;
  for (const std::uint32_t hub : made.ids) hubs_.at(hub)->peers.push_back(pair);
}

/// Finds the pair of two hubs; kNone where they are no neighbours.
std::uint32_t MergeHubs::FindPeer(std::uint32_t one, std::uint32_t other) {
  if (hubs_.at(one)->peers.size() > hubs_.at(other)->peers.size()) std::swap(one, other);
  std::uint32_t found = kNone;
  ForEachPeer(one, [&](std::uint32_t pair) {
    if (graph_.PairOf(pair).Other(one) == other) found = pair;
  });
  return found;
}

void MergeHubs::TakeOver(std::uint32_t hub, std::uint32_t gone, bool keepsOwn,
                         std::vector<std::uint32_t>& changed) {
  const bool isHubGone = graph_.IsHub(gone);
  graph_.TakePairs(gone, [&](std::uint32_t pair) {
    Pair& taken = graph_.PairOf(pair);
    const unsigned slot = taken.SlotOf(gone);
    const std::uint32_t other = taken.ids[1 - slot];
    const bool isPeer = graph_.IsHub(other);
    const std::uint32_t common = isPeer ? FindPeer(hub, other) : graph_.FindPair(other, hub);
    if (common != kNone && keepsOwn) {
      Pair& own = graph_.PairOf(common);
      own.length += std::exchange(taken.length, 0);
      if (!isPeer) own.watch = kUnplaced;
      changed.push_back(common);
      return;
    }
    if (common != kNone) taken.length += std::exchange(graph_.PairOf(common).length, 0);
    taken.ids[slot] = hub;
    graph_.Link(pair, hub);
    ++hubs_.at(hub)->size;
    changed.push_back(pair);
    if (!isPeer) {
      taken.watch = kUnplaced;
    } else if (isHubGone) {  // the other one knows it already
      hubs_.at(hub)->peers.push_back(pair);
    } else {
      MakePeers(pair);
    }
  });
  if (!isHubGone) return;
  hubs_.erase(gone);
  graph_.RegionOf(gone).isHub = 0;
}

/// Begins anew to watch all pairs of a hub. Those without a place are listed already.
void MergeHubs::Renew(std::uint32_t region, Hub& hub, std::vector<std::uint32_t>& due) {
  for (std::vector<std::uint32_t>& rung : hub.rungs) rung.clear();
  hub.candidates.clear();
  hub.size = 0;
  double distances = 0;
  graph_.ForEachPair(region, [&](std::uint32_t pair) {
    Pair& at = graph_.PairOf(pair);
    ++hub.size;
    if (at.watch == kPeer) return;
    if (at.watch != kUnplaced) due.push_back(pair);
    at.watch = kUnplaced;
    const double distance = graph_.DistanceOf(region, at.Other(region));
    if (distance < kInfinity) distances += distance;
  });
  // A pixel of a usual neighbour moves means by a few thousand units.
  const double area = graph_.AreaOf(region);
  const double mean = distances / static_cast<double>(hub.size + 1);
  const double unit = mean / (area + 1) / 4096;
  hub.unit = unit > std::numeric_limits<double>::min() && unit < kInfinity ? unit : 1;
  hub.clock = 0;
  hub.mostArea = area * kGrowth;
  hub.entries = 0;
  hub.mostEntries = 16 * hub.size + 1024;
}

void MergeHubs::Move(std::uint32_t hub, double distance, std::vector<std::uint32_t>& due) {
  constexpr double kMostTicks = 1ULL << 32U;
  Hub& moved = *hubs_.at(hub);
  const double ticks = std::ceil(distance / moved.unit * (1 + kSafe)) + 1;
  if (!(ticks < kMostTicks) || graph_.AreaOf(hub) > moved.mostArea ||
      moved.entries > moved.mostEntries) {
    return Renew(hub, moved, due);
  }
  const std::uint64_t before = moved.clock;
  moved.clock += static_cast<std::uint64_t>(ticks);
  for (unsigned k = 0; k < kRungs && before >> k != moved.clock >> k; ++k) {
    for (const std::uint32_t pair : moved.rungs[k]) {
      Pair& at = graph_.PairOf(pair);
      if (at.length == 0 || at.watch != k) continue;
      at.watch = kUnplaced;
      due.push_back(pair);
    }
    moved.rungs[k].clear();
  }
}

void MergeHubs::Examine(std::uint32_t region) {
  // The two costs between which those of the least pair and of all others have to stay.
  const std::uint32_t least = graph_.RegionOf(region).minimum;
  double leastCost = kMergeCostLimit, nextCost = kInfinity;
  if (least != kNone) nextCost = kMergeCostLimit;
  bool isAny = false;
  graph_.ForEachPair(region, [&](std::uint32_t pair) {
    Pair& at = graph_.PairOf(pair);
    if (!at.IsPlain()) {
      at.cost = graph_.CostOf(at);
      isAny = true;
    }
    if (pair == least) {
      leastCost = at.cost;
    } else if (at.cost < nextCost) {
      nextCost = at.cost;
    }
  });
  if (!isAny) return;
  double between = leastCost;  // which stays as it is
  if (least != kNone && !graph_.PairOf(least).IsPlain()) {
    const double root = (std::sqrt(leastCost) + std::sqrt(nextCost)) / 2;
    between = root * root;
  }
  graph_.ForEachPair(region, [&](std::uint32_t pair) {
    Pair& at = graph_.PairOf(pair);
    if (at.IsPlain()) return;
    const Reach reach = ReachOf(at, region);
    const double room = pair == least
                            ? reach.DistanceAt(between, reach.mostFactor) - reach.far
                            : reach.near - reach.DistanceAt(between, reach.factor) * (1 + kSafe);
    Place(at, reach, room);
  });
}

/// Finds what bounds the costs of a watched pair while its hub moves and grows.
MergeHubs::Reach MergeHubs::ReachOf(const Pair& pair, std::uint32_t region) {
  const Hub& hub = HubOf(pair);
  const std::uint32_t other = pair.Other(region);
  const double area = graph_.AreaOf(other), size = graph_.AreaOf(region);
  const double most = graph_.Limits().mostPixels;
  Reach reach;
  reach.isForGood = std::isnan(pair.cost) || area + size > most;
  const double distance = graph_.DistanceOf(region, other);
  reach.near = distance * (1 - kSafe);
  reach.far = distance * (1 + kSafe);
  const double factor = pair.cost / distance / distance;
  reach.isKnown = factor > 0 && factor < kInfinity && hub.mostArea + size <= most;
  reach.factor = factor;
  reach.mostFactor =
      factor * (hub.mostArea * (area + size)) / (area * (hub.mostArea + size)) * (1 + kSafe);
  return reach;
}

/// Notes when a pair has to be looked at again, by its hub and otherwise.
/// @param room  how far the hub may move before it has to be for another reason.
void MergeHubs::Place(Pair& pair, const Reach& reach, double room) {
  constexpr double kLeastKey = 1e-30;
  Hub& hub = HubOf(pair);
  float key = INFINITY;
  if (reach.isForGood) {
    room = kInfinity;
  } else if (!reach.isKnown) {
    key = 0;
    room = 0;
  } else {
    // Most of the way from the cost that the hub's own least pair had.
    const double root = std::sqrt(pair.cost), leastRoot = std::sqrt(hub.leastCost);
    const double keyRoot = root > leastRoot ? leastRoot + (root - leastRoot) * 0.75 : root * 0.9;
    const double least = keyRoot * keyRoot * (1 - 1e-6);
    key = least > kLeastKey ? static_cast<float>(least) : 0;
    room = std::min(room, reach.near - reach.DistanceAt(key, reach.factor) * (1 + kSafe));
  }
  const std::uint32_t number = graph_.NumberOf(pair);
  const double ticks = std::floor(room / hub.unit * (1 - kSafe));
  constexpr auto kMost = static_cast<double>(1ULL << (kRungs - 1));
  unsigned rung = kRungs - 1;
  if (!(ticks >= 2)) {
    rung = 0;
  } else if (ticks < kMost) {
    rung = static_cast<unsigned>(std::bit_width(static_cast<std::uint64_t>(ticks))) - 1;
  }
  // On the rung below it is looked at earlier, which does no harm.
  const unsigned now = pair.watch;
  if (now >= kRungs || now > rung || now + 1 < rung) {
    pair.watch = static_cast<std::uint8_t>(rung);
    hub.rungs[rung].push_back(number);
    ++hub.entries;
  }
  hub.candidates.push_back({key, number, ++pair.stamp});
  std::push_heap(hub.candidates.begin(), hub.candidates.end());
  ++hub.entries;
}

std::uint32_t MergeHubs::FindLeast(std::uint32_t hub) {
  Hub& own = *hubs_.at(hub);
  MergeGraph::Least least(graph_, hub);
  const auto look = [&](std::uint32_t pair) {
    graph_.PairOf(pair).cost = graph_.CostOf(graph_.PairOf(pair));
    least.Look(pair);
  };
  ForEachPeer(hub, look);
  looked_.clear();
  while (!own.candidates.empty() && own.candidates.front().key <= least.Cost()) {
    std::pop_heap(own.candidates.begin(), own.candidates.end());
    const Candidate top = own.candidates.back();
    own.candidates.pop_back();
    const Pair& at = graph_.PairOf(top.pair);
    if (at.length == 0 || at.watch >= kRungs || at.stamp != top.stamp) continue;
    look(top.pair);
    looked_.push_back(top.pair);
  }
  own.leastCost = least.Cost();
  for (const std::uint32_t pair : looked_) {
    Pair& at = graph_.PairOf(pair);
    // No higher than it is, for the sake of the neighbour.
    Place(at, ReachOf(at, at.Other(hub)), own.unit * std::exp2(at.watch + 0.5));
  }
  return least.Found();
}

}  // namespace lumo
