#include "views/spatial_subset_raster_body.h"

namespace lumo {

VEXG_INSTANCES(EIGHT, SpatialSubsetRaster);

}  // namespace lumo
