#include "stats/raster_stats_process_body.h"

namespace lumo {

VEXG_INSTANCES(TEN, RasterStatsAccumulateTask, RasterStats);
VEXG_INSTANCES(TEN, RasterStatsAccumulateTask, ExtendedRasterStats);
VEXG_INSTANCES(TEN, RasterStatsProcess, RasterStats);
VEXG_INSTANCES(TEN, RasterStatsProcess, ExtendedRasterStats);

}  // namespace lumo
