#include "commands/command_errors.h"

#include "foundation/type_code.h"

namespace lumo {

const unsigned CommandErrorFail::Code = GloballyUniqueObjectErrorCode();
const unsigned ArgListError::Code = GloballyUniqueObjectErrorCode();

}  // namespace lumo
