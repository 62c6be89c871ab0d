#include "fx/segment_process_body.h"

namespace lumo {

VEXG_INSTANCES(EIGHT, RasterTileWatershedSegmentFLSEstimateProcess);
VEXG_INSTANCES(EIGHT, RasterTileWatershedSegmentFLSMergeProcess);
VEXG_INSTANCES(EIGHT, RasterTileWatershedSegmentLambdaMergeProcess);
VEXG_INSTANCES(EIGHT, RasterSegmentHistogramProcess);
VEXG_INSTANCES(EIGHT, RasterSegmentLimitsProcess);

}  // namespace lumo
