#include "mosaic/overlap_raster_body.h"

namespace lumo {

VEXG_INSTANCES(EIGHT, OverlapRaster, std::type_identity_t);

}  // namespace lumo
