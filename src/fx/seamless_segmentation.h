#pragma once

#include "fx/label_forest.h"
#include "fx/label_pairs.h"
#include "fx/seamless_watershed.h"
#include "fx/segment_process.h"
#include "fx/segment_tree.h"
#include "fx/shared_basins.h"
#include "fx/shared_graph.h"

namespace lumo {

/// Segments a raster of any size as if it were one tile. The segments are those of the processes of
/// segment_process.h with a tile as large as the raster; they are numbered from 1 in raster order
/// of their first pixels, without gaps. The result has the same bits for any height of the strips
/// in which the raster is read, and any number of threads.
///
/// The levels go into a SeamlessWatershed; areas, band sums and borders of its basins are added up
/// in raster order; all basins are merged in one graph; and labels are written once, in one pass.
/// With a tree, merging goes on until no pair is left, and the labels are a cut of the tree.
///
/// Merging in rounds needs no whole graph; see LocalMerge. It does for joining small segments at
/// its end, of the segments that rounds leave; and a tree of it keeps all its merges.
///
/// Where shares have found the basins and their neighbours (SegmentShare), only merging is left,
/// and the result is the same to the bit.
///
/// Memory: MemoryOfMerging for the graph, and some 100 bytes a pixel of a strip for each
///         thread. Failure: false, with the fault set, and nothing written unless the writing
///         itself failed; at an abort true.
template <typename T>
class SeamlessSegmentation {
 public:
  /// @param segment  what gradients are computed from.
  /// @param merge    what drives merging; may be the same.
  /// @param labels   one band, of the size of the others.
  /// @param request  whose tileBytes are those of a strip, which has whole lines, at least one.
  /// @param shares   with the files of all rounds, which then take the place of the pixels of
  ///                 `segment`; null for none. The rigorous merge has to be of exact sums.
  SeamlessSegmentation(const RasterPtr<T>& segment, const RasterPtr<T>& merge,
                       const RasterPtr<std::int32_t>& labels, const SegmentRequest& request,
                       const IPC& ipc = {}, const SegmentShares* shares = nullptr);
  SeamlessSegmentation(const SeamlessSegmentation&) = delete;
  SeamlessSegmentation& operator=(const SeamlessSegmentation&) = delete;

  bool Run();

 private:
  bool FindBasins();
  bool Merge();
  template <typename Graph, typename Pairs>
  bool Gather(Graph& graph, Pairs& pairs);
  bool OpenShares();
  template <typename Use>
  bool ForEachGraph(const Use& use);
  template <typename Graph, typename Pairs>
  bool GatherShares(Graph& graph, Pairs& pairs);
  bool MergeShares(LocalMerge& merge);
  void AddSharedSquares(const SharedGraph<T>& shared);
  bool KeepAllLines();
  bool MergeBySchedule();
  bool DoSteps(LambdaSchedule& schedule);
  bool BeginTree();
  bool KeepLines(const std::vector<std::int32_t>& labels);
  template <typename V>
  void AddSquares(std::uint32_t label, const V* values, unsigned bands);
  void BeginBasins();
  void CenterSquares(const LambdaSchedule& schedule);
  template <typename PixelsOf>
  bool KeepBasins(const PixelsOf& pixelsOf);
  bool CutOwnTree();
  bool MergeRigorously();
  bool MergeLocally();
  bool MergeInRounds(const LocalMerge::Rules& rules, LocalMerge::Listener* listener);
  bool KeepRounds(const LocalMerge::Rules& rules);
  bool JoinSmallSegments();
  bool Write();
  IPC NextPass() const;
  TileDimensions Strips(unsigned border) const;
  bool IsAborted() const { return !ipc_.abort.IsNull() && ipc_.abort->IsSet(); }

  RasterPtr<T> segment_, merge_;
  RasterPtr<std::int32_t> labels_;
  SegmentRequest request_;
  IPC ipc_;
  unsigned stripLines_ = 1;
  const SegmentShares* shares_;
  SeamlessWatershed flood_;           // of one that makes its basins itself
  SharedBasins shared_;               // of one that has shares
  BasinLabels& watershed_;            // the one of both that there is
  std::vector<std::uint32_t> roots_;  // by basin: one that stands for its segment; empty for itself
  LabelForest forest_;                // what basins have become
  std::optional<LabelForest> joined_;  // what segments of rounds have become that were small
  std::optional<SegmentTreeWriter> tree_;
  // With a tree, by basin: its number in raster order of first pixels, and the squares of its
  // values.
  std::vector<std::uint32_t> order_;
  std::vector<double> squares_;
  std::uint32_t ordered_ = 0;  // basins that have a number
};

/// The bytes that merging so many basins takes at most, their neighbours included.
VEXG_EXPORT std::uint64_t MemoryOfMerging(std::uint64_t basins, unsigned bands,
                                          const SegmentRequest& request);

/// Says that merging would take more memory than it may.
VEXG_EXPORT String MemoryFault(std::uint64_t basins, std::uint64_t needed, std::uint64_t allowed);

/// A budget for strips: 4 MiB, or 32 lines where they are more, up to 256 MiB. Several strips are
/// in memory at once, beside the graph.
VEXG_EXPORT unsigned SeamlessStripBytes(const BasicRaster& raster, std::size_t elementBytes);

/// The lines of the strips that fill a budget: at least one, and at most what a strip may have.
VEXG_EXPORT unsigned SeamlessStripLines(const BasicRaster& raster, std::size_t elementBytes,
                                        unsigned stripBytes);

VEXG_EXTERN(EIGHT, SeamlessSegmentation);

}  // namespace lumo
