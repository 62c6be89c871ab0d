#include "stats/dynamic_raster_stats_body.h"

namespace lumo {

VEXG_INSTANCES(TEN, DynamicRasterStats);

}  // namespace lumo
