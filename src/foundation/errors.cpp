#include "foundation/errors.h"

#include "foundation/type_code.h"

namespace lumo {

const unsigned ObjectErrorOutOfMemory::Code = GloballyUniqueObjectErrorCode();
const unsigned ObjectErrorNotConstructed::Code = GloballyUniqueObjectErrorCode();
const unsigned ObjectErrorIO::Code = GloballyUniqueObjectErrorCode();
const unsigned AsyncErrorExecuteFailed::Code = GloballyUniqueObjectErrorCode();
const unsigned ArrayErrorInvalidArray::Code = GloballyUniqueObjectErrorCode();
const unsigned BufferErrorBadBuffer::Code = GloballyUniqueObjectErrorCode();
const unsigned BufferErrorBadHeader::Code = GloballyUniqueObjectErrorCode();
const unsigned BufferWarningNoHeaderData::Code = GloballyUniqueObjectErrorCode();
const unsigned BufferWarningReadOnly::Code = GloballyUniqueObjectErrorCode();
const unsigned MatrixErrorSingular::Code = GloballyUniqueObjectErrorCode();
const unsigned MatirxErrorBadDims::Code = GloballyUniqueObjectErrorCode();

}  // namespace lumo
