#include "stats/raster_histogram_process_body.h"

namespace lumo {

VEXG_INSTANCES(TEN, RasterHistogramAccumulateTask);
VEXG_INSTANCES(TEN, RasterHistogramProcess);
VEXG_INSTANCES(TEN, HistogramCallback);
VEXG_INSTANCES(TEN, RasterHistogramCallbackProcess);

}  // namespace lumo
