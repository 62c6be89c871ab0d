#include "views/computed_raster_body.h"

namespace lumo {

VEXG_INSTANCES(TWELVE, ComputedRaster);

}  // namespace lumo
