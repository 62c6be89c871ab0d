#pragma once

#include "fx/seamless_segmentation_body.h"
#include "fx/segment_share.h"

// The parts of SeamlessSegmentation that take basins and neighbours out of the files of shares.

namespace lumo {

template <typename T>
bool SeamlessSegmentation<T>::OpenShares() {
  const bool isLocal = request_.order == MergeOrder::kLocal;
  const ShareCut cut = CutOf(*segment_, sizeof(T), request_, shares_->Count());
  return shared_.Open(*shares_, cut, stripLines_, !isLocal);
}

/// Reads the graphs of all shares, one after the other. `use(graph)` gives false, with the fault
/// set, to end.
template <typename T>
template <typename Use>
bool SeamlessSegmentation<T>::ForEachGraph(const Use& use) {
  const ShareCut& cut = shared_.Cut();
  const IPC pass = NextPass();
  for (unsigned share = 0; share < cut.Shares() && !IsAborted(); ++share) {
    ShareReader from;
    SharedGraph<T> graph;
    if (!shares_->Open(2, share, SectionsOfLabels(cut.width, cut.LinesOf(share)), from)) {
      return false;
    }
    const bool isSound = graph.Get(from, SumsOf(*merge_, request_)) && from.IsAtEnd() &&
                         graph.HasLabelsBelow(watershed_.Count());
    if (!isSound) return shares_->Refuse(2, share);
    if (!use(graph)) return false;
    pass.progress->Update((share + 1.0) / cut.Shares());
  }
  return true;
}

/// Adds the sums of all shares to a graph, and finds the neighbours.
template <typename T>
template <typename Graph, typename Pairs>
bool SeamlessSegmentation<T>::GatherShares(Graph& graph, Pairs& pairs) {
  std::vector<bool> atSeams;
  if (!watershed_.MarkSeamBasins(atSeams)) return false;
  detail::PairJoin<Pairs> join(pairs, std::move(atSeams));
  const unsigned bands = merge_->Bands();
  const bool isRead = ForEachGraph([&](const SharedGraph<T>& shared) {
    const StripBasins& found = shared.basins;
    for (std::size_t number = 1; number < found.basins.size(); ++number) {
      const StripBasins::Basin& basin = found.basins[number];
      if (basin.continues || basin.label == 0) continue;
      graph.AddSums(basin.label, found.pixels[number], found.sums.data() + number * bands);
    }
    for (const StripBasins::Run& run : found.runs) {
      const T* values = shared.values.data() + run.first * bands;
      for (std::uint32_t i = 0; i < run.pixels; ++i, values += bands) {
        graph.AddPixel(found.basins[run.basin].label, values, 1);
      }
    }
    if (tree_) AddSharedSquares(shared);
    for (const LabelPair& pair : found.pairs) {
      const std::uint32_t a = found.basins[pair.low].label, b = found.basins[pair.high].label;
      join.Add({std::min(a, b), std::max(a, b), pair.length});
    }
    return true;
  });
  return isRead && (IsAborted() || !tree_ || KeepAllLines());
}

/// Merges the basins of all shares in rounds.
template <typename T>
bool SeamlessSegmentation<T>::MergeShares(LocalMerge& merge) {
  const bool isRead = ForEachGraph([&](const SharedGraph<T>& shared) {
    if (tree_) AddSharedSquares(shared);
    return merge.AddStrip(shared.basins, shared.values.data(), ipc_.abort.Get());
  });
  if (!isRead || IsAborted()) return isRead;
  if (!merge.Finish(ipc_.abort.Get())) return false;
  return IsAborted() || !tree_ || KeepAllLines();
}

/// Adds the squares of the values of a share's pixels to those of their basins.
template <typename T>
void SeamlessSegmentation<T>::AddSharedSquares(const SharedGraph<T>& shared) {
  const StripBasins& found = shared.basins;
  for (std::size_t number = 1; number < found.basins.size(); ++number) {
    if (!found.basins[number].continues) {
      squares_[found.basins[number].label] += shared.squares[number];
    }
  }
  const unsigned bands = merge_->Bands();
  for (const StripBasins::Run& run : found.runs) {
    const T* values = shared.values.data() + run.first * bands;
    for (std::uint32_t i = 0; i < run.pixels; ++i, values += bands) {
      AddSquares(found.basins[run.basin].label, values, bands);
    }
  }
}

/// Gives the basins of all strips their numbers in raster order.
template <typename T>
bool SeamlessSegmentation<T>::KeepAllLines() {
  std::vector<std::int32_t> labels;
  for (unsigned strip = 0; strip < watershed_.Strips() && !IsAborted(); ++strip) {
    labels.resize(std::size_t{watershed_.Width()} * watershed_.LinesOf(strip));
    if (!watershed_.Label(strip, labels.data()) || !KeepLines(labels)) return false;
  }
  return true;
}

}  // namespace lumo
