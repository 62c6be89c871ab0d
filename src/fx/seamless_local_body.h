#pragma once

#include <fmt/format.h>

#include "fx/local_tree.h"
#include "fx/seamless_segmentation_body.h"
#include "fx/strip_basins.h"

// The parts of SeamlessSegmentation that merge in rounds.

namespace lumo {
namespace detail {

/// The basins of a strip, and the labels of its pixels where they are wanted.
struct StripOfBasins {
  StripBasins basins;
  std::vector<std::int32_t> labels;
};

}  // namespace detail

template <typename T>
bool SeamlessSegmentation<T>::MergeLocally() {
  LocalMerge::Rules rules{request_.mergeValue, request_.rounds, request_.growth, request_.memory};
  if (tree_) return KeepRounds(rules);
  if (!MergeInRounds(rules, nullptr)) return false;
  return IsAborted() || !(request_.leastPixels > 1) || JoinSmallSegments();
}

template <typename T>
bool SeamlessSegmentation<T>::MergeInRounds(const LocalMerge::Rules& rules,
                                            LocalMerge::Listener* listener) {
  LocalMerge merge;
  merge.Begin(merge_->Bands(), rules, forest_, listener);
  if (shares_ != nullptr) return MergeShares(merge);
  const RasterIteratorPtr<T> strips(new RasterIterator<T>(merge_, Strips(0)));
  detail::StripProcess process("SeamlessRounds", NextPass());
  const auto tiles = process.Read(strips);
  const auto found = process.template TakeSlot<ValueSlot<detail::StripOfBasins>>();
  ScratchPool<LabelPairs> pairs;
  process.Add("Basins", StageOrder::kSeveralAtOnce, [&](ArgList& token, const AbortFlag*) {
    const TilePtr<T> tile = tiles.In(token);
    if (!tile || !tile->IsValid()) return false;
    const unsigned strip = tile->Index().second;
    std::vector<std::int32_t> labels(std::size_t{watershed_.Width()} * watershed_.LinesOf(strip));
    std::vector<std::int32_t> below;
    if (!watershed_.Label(strip, labels.data()) || !watershed_.ReadLabelsBelow(strip, below)) {
      return false;
    }
    detail::StripOfBasins made;
    if (tree_) made.labels = labels;
    const SeamlessWatershed::Labels own = flood_.LabelsOf(strip);
    made.basins.Find({labels.data(), labels.size(), watershed_.Width(),
                      below.empty() ? nullptr : below.data(), strip > 0},
                     {own.first, own.count}, *pairs.Borrow());
    made.basins.AddUp(labels.data(), labels.size(), tile->PixelArray().GetData(), tile->Bands());
    return found.Put(token, std::move(made));
  });
  process.Add("Rounds", StageOrder::kOneByOne, [&](ArgList& token, const AbortFlag* abort) {
    const detail::StripOfBasins* const made = found.In(token);
    if (made == nullptr) return false;
    const T* const values = tiles.In(token)->PixelArray().GetData();
    if (tree_) {
      const unsigned bands = merge_->Bands();
      for (std::size_t i = 0; i < made->labels.size(); ++i) {
        const auto label = static_cast<std::uint32_t>(made->labels[i]);
        if (label != 0) AddSquares(label, values + i * bands, bands);
      }
      if (!KeepLines(made->labels)) return false;
    }
    return merge.AddStrip(made->basins, values, abort);
  });
  process.Close();
  if (!process.RunProcess(process.kHere)) return false;
  return IsAborted() || merge.Finish(ipc_.abort.Get());
}

/// Merges as long as there are rounds, whatever it costs, keeps all that in the tree, and finds the
/// segments as a cut of it.
template <typename T>
bool SeamlessSegmentation<T>::KeepRounds(const LocalMerge::Rules& rules) {
  const std::uint32_t count = watershed_.Count();
  const std::uint64_t needed = std::uint64_t{count} * LocalTree::BytesOfBasin();
  if (needed > request_.memory) {
    SetFault(String(fmt::format("a tree of {} basins needs {} bytes of memory, and may take {}",
                                count, needed, request_.memory)));
    return false;
  }
  BeginBasins();
  LocalTree kept(count, merge_->Bands(), squares_);
  LocalMerge::Rules all = rules;
  all.threshold = kMergeCostLimit;
  all.memory -= needed;
  if (!MergeInRounds(all, &kept)) return false;
  if (IsAborted()) return true;
  const auto pixelsOf = [&](std::uint32_t label) { return kept.PixelsOf(label); };
  if (!KeepBasins(pixelsOf) || !kept.Put(order_, *tree_)) return false;
  forest_.Begin(std::uint64_t{count} + 1);  // what basins become is told by the tree
  return CutOwnTree();
}

/// Joins the small ones of the segments that rounds have left, by the means of their pixels, to
/// their cheapest neighbours: those of the whole raster in one graph, as LambdaSchedule does.
template <typename T>
bool SeamlessSegmentation<T>::JoinSmallSegments() {
  const auto count = static_cast<std::uint32_t>(watershed_.Count() - forest_.Joins());
  // Pairs are found by a table, and taken over behind the last.
  constexpr std::uint64_t kOfPairs = 3 * (sizeof(LabelPair) + 4 * sizeof(std::uint32_t));
  const std::uint64_t needed = MemoryOfMerging(count, merge_->Bands(), request_) + count * kOfPairs;
  if (needed > request_.memory) {
    SetFault(MemoryFault(count, needed, request_.memory));
    return false;
  }
  LambdaSchedule schedule;
  schedule.Begin(count + 1, merge_->Bands());
  schedule.Limit(request_.growth);
  LabelPairs pairs;
  pairs.Begin(count);
  const RasterIteratorPtr<T> strips(new RasterIterator<T>(merge_, Strips(0)));
  detail::StripProcess process("SeamlessSmall", NextPass());
  const auto tiles = process.Read(strips);
  const auto found = process.template TakeSlot<ValueSlot<std::vector<std::int32_t>>>();
  process.Add("Labels", StageOrder::kSeveralAtOnce, [&](ArgList& token, const AbortFlag*) {
    const unsigned strip = tiles.In(token)->Index().second;
    const std::uint32_t width = watershed_.Width();
    std::vector<std::int32_t> labels(std::size_t{width} * watershed_.LinesOf(strip));
    std::vector<std::int32_t> below;
    if (!watershed_.Label(strip, labels.data()) || !watershed_.ReadLabelsBelow(strip, below)) {
      return false;
    }
    labels.insert(labels.end(), below.begin(), below.end());
    return found.Put(token, std::move(labels));
  });
  process.Add("Sums", StageOrder::kOneByOne, [&](ArgList& token, const AbortFlag*) {
    const TilePtr<T> tile = tiles.In(token);
    if (!tile || !tile->IsValid() || found.In(token) == nullptr) return false;
    std::vector<std::int32_t> labels = *found.In(token);
    for (std::int32_t& label : labels) {
      label = static_cast<std::int32_t>(forest_.NumberOf(static_cast<std::uint32_t>(label)));
    }
    const std::uint32_t width = watershed_.Width();
    const std::size_t pixels = std::size_t{width} * watershed_.LinesOf(tile->Index().second);
    const T* values = tile->PixelArray().GetData();
    for (std::size_t i = 0; i < pixels; ++i, values += tile->Bands()) {
      if (labels[i] != 0) schedule.AddPixel(static_cast<std::uint32_t>(labels[i]), values, 1);
    }
    ForEachStripEdge(labels.data(), pixels, width,
                     labels.size() > pixels ? labels.data() + pixels : nullptr,
                     [&](std::uint32_t a, std::uint32_t b) { pairs.AddEdge(a, b); });
    return forest_.IsWell();
  });
  process.Close();
  if (!process.RunProcess(process.kHere)) return false;
  if (IsAborted()) return true;
  schedule.Build(pairs.Pairs());
  joined_.emplace().Begin(std::uint64_t{count} + 1);
  schedule.JoinSmall(request_.leastPixels,
                     [this](const auto& join) { joined_->Join(join.higher, join.lower); });
  return joined_->IsWell();
}

}  // namespace lumo
