#include "pyramid/dynamic_raster_pyramid_body.h"

namespace lumo {

VEXG_INSTANCES(TWELVE, DynamicRasterPyramid);

}  // namespace lumo
