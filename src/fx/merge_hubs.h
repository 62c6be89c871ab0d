#pragma once

#include <array>
#include <cmath>
#include <cstdint>
#include <memory>
#include <unordered_map>
#include <vector>

#include "fx/merge_graph.h"

namespace lumo {

/// Watches the pairs of hubs: regions of so many neighbours that a merge must not look at all of
/// them. Each merge of a hub changes what all its pairs cost, but hardly: its means move by little.
/// So costs of its pairs are found when they are needed, and a pair is looked at again not before
/// the means have moved so far that
///
/// - it could become, or be no longer, the one of least cost of the neighbour, or
/// - its cost could fall below a bound by which the hub finds its own least pair.
///
/// How far that is follows from the triangle inequality: where the means of both are D apart and
/// those of the hub have moved by s, they are D - s to D + s apart. Nothing is estimated: the least
/// pairs are those that looking at all pairs after each merge would give, to the bit.
///
/// A pair of a hub and another region is watched by the hub; one of two hubs, a pair of peers, is
/// looked at each time. A hub stays one until it becomes part of another.
///
/// Threads: one at a time.
class VEXG_EXPORT MergeHubs {
 public:
  /// A region of more neighbours is better off as a hub.
  static constexpr std::uint32_t kNeighbours = 256;

  explicit MergeHubs(MergeGraph& graph) : graph_(graph) {}

  void Clear() { hubs_.clear(); }

  /// Makes a region a hub, and watches its pairs. @param label  by which it is called.
  void Make(std::uint32_t region, std::uint32_t label);

  /// The label by which a region is called: a hub keeps its number when it becomes part of another
  /// region, and takes its label.
  std::uint32_t LabelOf(std::uint32_t region) const {
    return graph_.IsHub(region) ? hubs_.at(region)->label : region;
  }
  void SetLabel(std::uint32_t hub, std::uint32_t label) { hubs_.at(hub)->label = label; }
  /// How many neighbours a hub has had at most.
  std::size_t SizeOf(std::uint32_t hub) const { return hubs_.at(hub)->size; }

  /// Gives the pairs of a region to a hub, joining those with common neighbours.
  /// @param keepsOwn  of two pairs with one neighbour the hub's own is left, else the other one.
  /// @param changed   [out] the pairs of the hub that have changed by that.
  void TakeOver(std::uint32_t hub, std::uint32_t gone, bool keepsOwn,
                std::vector<std::uint32_t>& changed);

  /// Lists the pairs of a hub that have to be looked at behind a merge of it.
  /// @param distance  by which its means have moved.
  /// @param due       [out] they are added; pairs of peers aren't.
  void Move(std::uint32_t hub, double distance, std::vector<std::uint32_t>& due);

  /// Looks at the watched pairs of a region that is no hub, and whose least pair is known. Needed
  /// when the least pair of a region becomes another one, and for watched pairs that have changed.
  void Examine(std::uint32_t region);

  /// Finds the least pair of a hub; kNone where there is none.
  std::uint32_t FindLeast(std::uint32_t hub);

  /// Calls `visit(pair)` for the pairs of a hub with others.
  template <typename Visit>
  void ForEachPeer(std::uint32_t hub, const Visit& visit) {
    std::vector<std::uint32_t>& peers = hubs_.at(hub)->peers;
    std::erase_if(peers, [this](std::uint32_t pair) { return graph_.PairOf(pair).length == 0; });
    for (const std::uint32_t pair : peers) visit(pair);
  }

 private:
  using Pair = MergeGraph::Pair;
  static constexpr std::uint32_t kNone = MergeGraph::kNone;
  static constexpr unsigned kRungs = 48;
  // How a pair is watched, if not by one of the rungs.
  static constexpr std::uint8_t kPeer = 0xFE, kUnplaced = 0xFD;

  /// A watched pair whose cost is not below a key. It counts when the stamp is that of the pair.
  struct Candidate {
    float key;
    std::uint32_t pair;
    std::uint8_t stamp;
    bool operator<(const Candidate& other) const { return key > other.key; }  // the least on top
  };

  struct Hub {
    std::uint32_t label = 0;
    std::size_t size = 0;
    double mostArea = 0;      // up to which distances hold
    double unit = 1;          // of the clock
    std::uint64_t clock = 0;  // how far means have moved, rounded up
    double leastCost = kMergeCostLimit;
    // Rung k has the pairs to look at when the clock passes the next multiple of 2^k.
    std::array<std::vector<std::uint32_t>, kRungs> rungs;
    std::vector<Candidate> candidates;  // a heap
    std::vector<std::uint32_t> peers;
    std::size_t entries = 0, mostEntries = 0;  // put into both since all were looked at
  };

  /// How the cost of a watched pair may change: it is a factor, which grows with the area of the
  /// hub, times the square of the distance of the means.
  struct Reach {
    bool isForGood = false;  // it is the least of none, and stays so
    bool isKnown = true;
    double near = 0, far = 0;  // the distance, less and more what rounding may make of it
    double factor = 0;
    double mostFactor = 0;  // of the largest area of the hub

    static double DistanceAt(double cost, double factor) { return std::sqrt(cost / factor); }
  };

  Hub& HubOf(const Pair& pair) {
    return *hubs_.at(graph_.IsHub(pair.ids[0]) ? pair.ids[0] : pair.ids[1]);
  }
  void Renew(std::uint32_t region, Hub& hub, std::vector<std::uint32_t>& due);
  void MakePeers(std::uint32_t pair);
  std::uint32_t FindPeer(std::uint32_t one, std::uint32_t other);
  Reach ReachOf(const Pair& pair, std::uint32_t region);
  void Place(Pair& pair, const Reach& reach, double room);

  MergeGraph& graph_;
  std::unordered_map<std::uint32_t, std::unique_ptr<Hub>> hubs_;  // by region
  std::vector<std::uint32_t> looked_;
};

}  // namespace lumo
