#include "pyramid/shared_levels_body.h"

namespace lumo {

VEXG_INSTANCES(TWELVE, SharedLevels);

}  // namespace lumo
