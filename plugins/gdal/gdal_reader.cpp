#include "gdal_reader_body.h"

namespace lumo::gdal {

VEXG_INSTANCES(TWELVE, Reader);

}  // namespace lumo::gdal
