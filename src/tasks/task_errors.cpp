#include "tasks/task_errors.h"

#include "foundation/type_code.h"

namespace lumo {

const unsigned ParallelError::Code = GloballyUniqueObjectErrorCode();
const unsigned TaskError::Code = GloballyUniqueObjectErrorCode();
const unsigned TaskErrorBadArgs::Code = GloballyUniqueObjectErrorCode();
const unsigned TaskErrorBadParams::Code = GloballyUniqueObjectErrorCode();

}  // namespace lumo
