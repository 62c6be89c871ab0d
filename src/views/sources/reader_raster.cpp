#include "views/sources/reader_raster_body.h"

namespace lumo {

VEXG_INSTANCES(TWELVE, ReaderRaster);

}  // namespace lumo
