#include "raster/raster_tasks_body.h"

namespace lumo {

VEXG_INSTANCES(TWELVE, TilePool);
VEXG_INSTANCES(TWELVE, RasterReadTask);
VEXG_INSTANCES(TWELVE, RasterWriteTask);

}  // namespace lumo
