#include "pyramid/level_window_body.h"

namespace lumo {

VEXG_INSTANCES(TWELVE, LevelWindow);

}  // namespace lumo
