#include "pyramid_reader_body.h"

namespace lumo::pyramid {

VEXG_INSTANCES(TWELVE, Reader);

}  // namespace lumo::pyramid
