#pragma once

#include <cstddef>
#include <cstdint>
#include <utility>
#include <vector>

#include "fx/label_pairs.h"

namespace lumo::detail {

/// The pairs of neighbours of a merge that takes all of them at once.
struct PairList {
  std::vector<LabelPair> pairs;

  void AddPair(const LabelPair& pair) { pairs.push_back(pair); }
  void Lengthen(std::size_t pair, std::uint32_t length) { pairs[pair].length += length; }
};

/// Joins the pairs of strips to those of the whole. Only a pair of two basins at seams may be found
/// in several strips.
template <typename Pairs>
class PairJoin {
 public:
  PairJoin(Pairs& pairs, std::vector<bool>&& atSeams)
      : pairs_(pairs), atSeams_(std::move(atSeams)) {
    found_.Begin(0);
  }

  void Add(const LabelPair& pair) {
    if (atSeams_[pair.low] && atSeams_[pair.high]) {
      const std::uint32_t number = found_.NumberOf(pair.low, pair.high);
      if (number < places_.size()) return pairs_.Lengthen(places_[number], pair.length);
      places_.push_back(count_);
    }
    pairs_.AddPair(pair);
    ++count_;
  }

 private:
  Pairs& pairs_;
  std::vector<bool> atSeams_;
  LabelPairs found_;
  std::vector<std::size_t> places_;  // by number among the pairs found: that among all
  std::size_t count_ = 0;
};

}  // namespace lumo::detail
