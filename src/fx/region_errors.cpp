#include "fx/region_errors.h"

#include "foundation/type_code.h"

namespace lumo {

const unsigned RegionAttributeErrorBadAllocation::Code = GloballyUniqueObjectErrorCode();

}  // namespace lumo
