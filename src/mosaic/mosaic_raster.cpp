#include "mosaic/mosaic_pixels_body.h"

namespace lumo {

VEXG_INSTANCES(EIGHT, MosaicRaster);

}  // namespace lumo
