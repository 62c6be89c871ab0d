#include "fx/merge_graph.h"

#include <memory>

namespace lumo {

void MergeGraph::Begin(std::uint32_t count, std::uint32_t bands) {
  bands_ = bands;
  count_ = count;
  stride_ = BytesOfRegion(bands);
  regions_.resize(count * stride_);
  for (std::uint32_t region = 0; region < count; ++region) {
    std::byte* const at = regions_.data() + region * stride_;
    (new (at) Region)->rank = region;
    std::uninitialized_fill_n(reinterpret_cast<double*>(at + sizeof(Region)), bands, 0.0);
  }
  many_.clear();
  limits_ = {};
  pairs_.clear();
}

void MergeGraph::AddPair(const LabelPair& pair) {
  Pair& added = pairs_.emplace_back();
  added.ids[0] = pair.low;
  added.ids[1] = pair.high;
  added.length = pair.length;
  const std::uint32_t number = NumberOf(added);
  Link(number, pair.low);
  Link(number, pair.high);
}

void MergeGraph::Link(std::uint32_t pair, std::uint32_t region) {
  Pair& linked = pairs_[pair];
  Region& owner = RegionOf(region);
  linked.next[linked.SlotOf(region)] = owner.first;
  owner.first = pair;
}

std::uint32_t MergeGraph::FindPair(std::uint32_t region, std::uint32_t other) const {
  for (std::uint32_t pair = RegionOf(region).first; pair != kNone;) {
    const Pair& at = pairs_[pair];
    const unsigned slot = at.SlotOf(region);
    if (at.length != 0 && at.ids[1 - slot] == other) return pair;
    pair = at.next[slot];
  }
  return kNone;
}

}  // namespace lumo
