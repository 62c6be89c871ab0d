#include "views/pyramid_raster_impl_body.h"

namespace lumo {

VEXG_INSTANCES(TWELVE, PyramidRasterImpl);

}  // namespace lumo
