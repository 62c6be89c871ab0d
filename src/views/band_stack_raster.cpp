#include "views/band_stack_raster_body.h"

namespace lumo {

VEXG_INSTANCES(EIGHT, BandStackRaster);

}  // namespace lumo
