#pragma once

#include "foundation/error_state.h"

namespace lumo {

// The error classes of the library. Each has a static `Code`, taken at load, by which a caller that
// wants the reason of a failure compares: object.GetErrorState().code == ObjectErrorIO::Code.

/// An allocation of a container or an array failed.
struct VEXG_EXPORT ObjectErrorOutOfMemory : ObjectError {
  ObjectErrorOutOfMemory() : ObjectError(Code) {}
  static const unsigned Code;
};

/// An object is used whose constructor could not complete, or whose arguments were missing.
struct VEXG_EXPORT ObjectErrorNotConstructed : ObjectError {
  ObjectErrorNotConstructed() : ObjectError(Code) {}
  static const unsigned Code;
};

/// Reading or writing a file, an XML document or a buffer failed; the fault text says which and
/// why.
struct VEXG_EXPORT ObjectErrorIO : ObjectError {
  ObjectErrorIO() : ObjectError(Code) {}
  static const unsigned Code;
};

/// A piece of asynchronous work threw, failed, or got no thread to run on.
struct VEXG_EXPORT AsyncErrorExecuteFailed : ObjectError {
  AsyncErrorExecuteFailed() : ObjectError(Code) {}
  static const unsigned Code;
};

/// An array operation met an array that is not valid, or a text that is no array.
struct VEXG_EXPORT ArrayErrorInvalidArray : ObjectError {
  ArrayErrorInvalidArray() : ObjectError(Code) {}
  static const unsigned Code;
};

/// The window of a file-backed buffer can't be allocated.
struct VEXG_EXPORT BufferErrorBadBuffer : ObjectError {
  BufferErrorBadBuffer() : ObjectError(Code) {}
  static const unsigned Code;
};

/// The header block of a file-backed buffer can't be allocated.
struct VEXG_EXPORT BufferErrorBadHeader : ObjectError {
  BufferErrorBadHeader() : ObjectError(Code) {}
  static const unsigned Code;
};

/// The file of a buffer holds no full header, or it could not be written.
struct VEXG_EXPORT BufferWarningNoHeaderData : ObjectWarning {
  BufferWarningNoHeaderData() : ObjectWarning(Code) {}
  static const unsigned Code;
};

/// A write was tried on a read-only buffer.
struct VEXG_EXPORT BufferWarningReadOnly : ObjectWarning {
  BufferWarningReadOnly() : ObjectWarning(Code) {}
  static const unsigned Code;
};

/// A matrix to invert is singular.
struct VEXG_EXPORT MatrixErrorSingular : ObjectError {
  MatrixErrorSingular() : ObjectError(Code) {}
  static const unsigned Code;
};

/// The dimensions of matrices do not fit.
struct VEXG_EXPORT MatirxErrorBadDims : ObjectError {
  MatirxErrorBadDims() : ObjectError(Code) {}
  static const unsigned Code;
};

}  // namespace lumo
