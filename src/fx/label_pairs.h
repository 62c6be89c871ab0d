#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// Two labels whose pixels share edges.
struct LabelPair {
  std::uint32_t low = 0;     ///< the smaller label
  std::uint32_t high = 0;    ///< the larger one
  std::uint32_t length = 0;  ///< of their common boundary, in pixel edges
};

/// Gathers the pairs of neighbouring labels of an image, in the order in which they come first.
///
/// Cost: a look into a hash table for each edge that is not of the pair of the edge before.
/// Threads: one at a time; the memory is kept from image to image.
///
///     pairs.Begin(labelCount);
///     ForEachEdge({width, height, width, height}, labels, nullptr,
///                 [&](std::uint32_t a, std::uint32_t b) { pairs.AddEdge(a, b); });
class VEXG_EXPORT LabelPairs {
 public:
  /// Forgets all pairs. @param labelCount  about how many labels there are.
  void Begin(std::size_t labelCount);

  /// Counts an edge between two labels that differ, in any order.
  void AddEdge(std::uint32_t a, std::uint32_t b) {
    const std::uint64_t key = a < b ? KeyOf(a, b) : KeyOf(b, a);
    if (key != lastKey_) {
      lastPair_ = FindOrAdd(key);
      lastKey_ = key;
    }
    ++pairs_[lastPair_].length;
  }

  /// The number of a pair of two labels that differ, which is added where it isn't there yet.
  std::uint32_t NumberOf(std::uint32_t a, std::uint32_t b) {
    return FindOrAdd(a < b ? KeyOf(a, b) : KeyOf(b, a));
  }

  /// The pairs so far; the reference is good until the next edge.
  const std::vector<LabelPair>& Pairs() const { return pairs_; }

 private:
  static std::uint64_t KeyOf(std::uint32_t low, std::uint32_t high) {
    return (std::uint64_t{low} << 32) | high;
  }
  static std::uint64_t KeyOf(const LabelPair& pair) { return KeyOf(pair.low, pair.high); }
  std::uint32_t FindOrAdd(std::uint64_t key);
  std::size_t PlaceOf(std::uint64_t key) const;
  void Grow();

  std::vector<LabelPair> pairs_;
  std::vector<std::uint32_t> table_;  // open addressing: the number of a pair and 1; 0 is free
  std::uint64_t lastKey_ = 0;
  std::uint32_t lastPair_ = 0;
};

/// Says where the edges of a label image are counted: between pixels of the first `columns` columns
/// and `rows` rows and their neighbours on the right and below.
struct EdgeScan {
  std::uint32_t width = 0;    ///< of the image
  std::uint32_t height = 0;   ///< of the image
  std::uint32_t columns = 0;  ///< at most the width
  std::uint32_t rows = 0;     ///< at most the height
};

/// Calls `visit(label, other)` for each edge between included pixels of different labels: row by
/// row, for each pixel first the edge to the right, then the one below.
/// @param excluded  not 0 for a pixel that takes no part; null when all do.
template <typename Visit>
void ForEachEdge(const EdgeScan& scan, const std::int32_t* labels, const std::uint8_t* excluded,
                 Visit&& visit) {
  const auto visitTo = [&](std::size_t at, std::size_t neighbour) {
    if (labels[neighbour] == labels[at]) return;
    if (excluded != nullptr && (excluded[neighbour] | excluded[at]) != 0) return;
    visit(static_cast<std::uint32_t>(labels[at]), static_cast<std::uint32_t>(labels[neighbour]));
  };
  for (std::uint32_t y = 0; y < scan.rows; ++y) {
    std::size_t at = std::size_t{y} * scan.width;
    for (std::uint32_t x = 0; x < scan.columns; ++x, ++at) {
      if (x + 1 < scan.width) visitTo(at, at + 1);
      if (y + 1 < scan.height) visitTo(at, at + scan.width);
    }
  }
}

}  // namespace lumo
