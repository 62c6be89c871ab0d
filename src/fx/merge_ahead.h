#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "fx/merge_graph.h"

namespace lumo {

/// Has the processor fetch what merges that come soon are going to look at: the lists of both
/// segments, their neighbours, and the lists of neighbours that will look for another nearest one.
/// Each of these says where the next lies, and waiting for them one by one is most of the time of a
/// merge. So many lists are walked at once, each by one place between two merges.
///
/// It only reads, and nothing depends on it but time. Threads: one at a time.
class VEXG_EXPORT MergeAhead {
 public:
  explicit MergeAhead(const MergeGraph& graph) : graph_(graph) {}

  void Clear();
  /// Begins to fetch for a pair that is going to be merged some merges later.
  void Add(std::uint32_t pair);
  /// Goes a place further everywhere.
  void Go();

 private:
  /// A way through the list of a region.
  struct Walk {
    std::uint32_t region;
    std::uint32_t pair;
    std::uint16_t left;  // places to go at most
    bool isMerged;
  };
  struct Neighbour {
    std::uint32_t region;
    std::uint32_t pair;  // by which it is one
  };

  void FetchRegion(std::uint32_t region) const;
  void BeginList(std::uint32_t region, bool isMerged);
  void GoOn();
  void LookAtNeighbours(std::size_t count);

  const MergeGraph& graph_;
  // They were fetched at the step before.
  std::vector<std::uint32_t> merged_;  // regions that will be
  std::vector<Walk> walks_;
  std::vector<Neighbour> neighbours_;
};

}  // namespace lumo
