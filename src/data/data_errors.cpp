#include "data/data_errors.h"

#include "foundation/type_code.h"

namespace lumo {

const unsigned DcSrvErrorNoThread::Code = GloballyUniqueObjectErrorCode();
const unsigned RasterReaderErrorInvalid::Code = GloballyUniqueObjectErrorCode();
const unsigned VectorReaderErrorInvalid::Code = GloballyUniqueObjectErrorCode();

}  // namespace lumo
