#include "tiff/tiff_reader_body.h"

namespace lumo::tiff {

VEXG_INSTANCES(TWELVE, Reader);

}  // namespace lumo::tiff
