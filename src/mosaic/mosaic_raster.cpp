#include "mosaic/mosaic_raster_body.h"

namespace lumo {

VEXG_INSTANCES(EIGHT, MosaicRaster);

}  // namespace lumo
