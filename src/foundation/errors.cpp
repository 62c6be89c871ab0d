#include "foundation/errors.h"

#include "foundation/type_code.h"

namespace lumo {

const unsigned ObjectErrorOutOfMemory::Code = GloballyUniqueObjectErrorCode();
const unsigned ObjectErrorNotConstructed::Code = GloballyUniqueObjectErrorCode();
const unsigned ObjectErrorIO::Code = GloballyUniqueObjectErrorCode();
const unsigned AsyncErrorExecuteFailed::Code = GloballyUniqueObjectErrorCode();
const unsigned CommandErrorFail::Code = GloballyUniqueObjectErrorCode();
const unsigned ParallelError::Code = GloballyUniqueObjectErrorCode();
const unsigned TaskError::Code = GloballyUniqueObjectErrorCode();
const unsigned TaskErrorBadArgs::Code = GloballyUniqueObjectErrorCode();
const unsigned TaskErrorBadParams::Code = GloballyUniqueObjectErrorCode();
const unsigned ArgListError::Code = GloballyUniqueObjectErrorCode();
const unsigned ArrayErrorInvalidArray::Code = GloballyUniqueObjectErrorCode();
const unsigned BufferErrorBadBuffer::Code = GloballyUniqueObjectErrorCode();
const unsigned BufferErrorBadHeader::Code = GloballyUniqueObjectErrorCode();
const unsigned BufferWarningNoHeaderData::Code = GloballyUniqueObjectErrorCode();
const unsigned BufferWarningReadOnly::Code = GloballyUniqueObjectErrorCode();
const unsigned RegionAttributeErrorBadAllocation::Code = GloballyUniqueObjectErrorCode();
const unsigned PolygonErrorBadPolygon::Code = GloballyUniqueObjectErrorCode();
const unsigned MatrixErrorSingular::Code = GloballyUniqueObjectErrorCode();
const unsigned MatirxErrorBadDims::Code = GloballyUniqueObjectErrorCode();
const unsigned DcSrvErrorNoThread::Code = GloballyUniqueObjectErrorCode();
const unsigned RasterReaderErrorInvalid::Code = GloballyUniqueObjectErrorCode();
const unsigned VectorReaderErrorInvalid::Code = GloballyUniqueObjectErrorCode();

}  // namespace lumo
