#pragma once

#include "fx/segment_process.h"
#include "fx/segment_shares.h"
#include "fx/shared_graph.h"
#include "fx/strip_drains.h"
#include "fx/strip_process.h"

namespace lumo {

/// Says how a raster is cut into the shares of a segmentation.
VEXG_EXPORT ShareCut CutOf(const BasicRaster& raster, std::size_t elementBytes,
                           const SegmentRequest& request, unsigned shares);

/// Says what of the pixels merging needs.
VEXG_EXPORT GraphSums SumsOf(const BasicRaster& merge, const SegmentRequest& request);

/// Does a share of a seamless segmentation, in the round that comes next (segment_shares.h): what
/// comes out of all of them is for SeamlessSegmentation.
///
/// Memory: in the first round 6 bytes for each pixel of the share, or 2 where minima have no ranks,
///         and 5 where plateaus reach an edge; in the second one 9 for each pixel of the share, and
///         13 for the pixels of the SeamZone of all shares; in the third one 12, and the graph.
///         Threads: one process. Failure: false, with the fault set, and no file; at an abort true.
template <typename T>
class SegmentShare {
 public:
  /// @param done  the files of the rounds before.
  SegmentShare(const RasterPtr<T>& segment, const RasterPtr<T>& merge,
               const SegmentRequest& request, const SegmentShares& done, const IPC& ipc = {});

  /// Makes the file of a share.
  bool Run(unsigned share, const std::string& file);

 private:
  bool Flood(unsigned share, ShareWriter& out);
  bool Settle(unsigned share, ShareWriter& out);
  bool Gather(unsigned share, ShareWriter& out);
  bool ReadCells(unsigned round, unsigned share, std::vector<StripDrains::Cell>& cells,
                 ShareReader& from) const;
  TileSlot<T> ReadStrips(detail::StripProcess& process, const RasterPtr<T>& raster, unsigned share,
                         unsigned border) const;
  bool IsRanked() const { return request_.order != MergeOrder::kLocal; }
  bool IsAborted() const { return !ipc_.abort.IsNull() && ipc_.abort->IsSet(); }

  RasterPtr<T> segment_, merge_;
  SegmentRequest request_;
  SegmentShares done_;
  IPC ipc_;
  ShareCut cut_;
};

VEXG_EXTERN(EIGHT, SegmentShare);

}  // namespace lumo
