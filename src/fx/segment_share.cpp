#include "fx/seamless_segmentation.h"
#include "fx/segment_share_body.h"

namespace lumo {

ShareCut CutOf(const BasicRaster& raster, std::size_t elementBytes, const SegmentRequest& request,
               unsigned shares) {
  return ShareCut::Of(raster.Samples(), raster.Lines(), shares,
                      SeamlessStripLines(raster, elementBytes, request.tileBytes));
}

GraphSums SumsOf(const BasicRaster& merge, const SegmentRequest& request) {
  return {merge.Bands(), request.isRigorous, !request.tree.empty()};
}

VEXG_INSTANCES(EIGHT, SegmentShare);

}  // namespace lumo
