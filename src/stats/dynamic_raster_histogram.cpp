#include "stats/dynamic_raster_histogram_body.h"

namespace lumo {

VEXG_INSTANCES(TEN, DynamicRasterHistogram);

}  // namespace lumo
