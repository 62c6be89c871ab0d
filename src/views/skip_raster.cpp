#include "views/skip_raster_body.h"

namespace lumo {

VEXG_INSTANCES(EIGHT, SkipRaster);

}  // namespace lumo
