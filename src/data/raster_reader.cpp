#include "data/raster_reader_body.h"

namespace lumo {

VEXG_INSTANCES(TWELVE, RasterReader);

}  // namespace lumo
