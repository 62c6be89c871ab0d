#include "orva/orva_reader_body.h"

namespace lumo::orva {

VEXG_INSTANCES(TWELVE, Reader);

}  // namespace lumo::orva
