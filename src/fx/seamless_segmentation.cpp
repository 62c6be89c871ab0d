#include "fx/seamless_local_body.h"
#include "fx/seamless_segmentation_body.h"
#include "fx/seamless_shares_body.h"

namespace lumo {

VEXG_INSTANCES(EIGHT, SeamlessSegmentation);

}  // namespace lumo
