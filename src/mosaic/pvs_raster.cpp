#include "mosaic/pvs_raster_body.h"

namespace lumo {

VEXG_INSTANCES(EIGHT, PVSRaster);

}  // namespace lumo
