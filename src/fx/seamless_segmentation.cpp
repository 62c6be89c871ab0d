#include "fx/seamless_segmentation_body.h"

namespace lumo {

VEXG_INSTANCES(EIGHT, SeamlessSegmentation);

}  // namespace lumo
