#pragma once

#include "foundation/error_state.h"

namespace lumo {

// Errors of this floor; foundation/errors.h says how they are compared.

/// The data connection server has no thread for a call.
struct VEXG_EXPORT DcSrvErrorNoThread : ObjectError {
  DcSrvErrorNoThread() : ObjectError(Code) {}
  static const unsigned Code;
};

/// A raster reader dispatch has no valid reader.
struct VEXG_EXPORT RasterReaderErrorInvalid : ObjectError {
  RasterReaderErrorInvalid() : ObjectError(Code) {}
  static const unsigned Code;
};

/// A vector reader dispatch has no valid reader.
struct VEXG_EXPORT VectorReaderErrorInvalid : ObjectError {
  VectorReaderErrorInvalid() : ObjectError(Code) {}
  static const unsigned Code;
};

}  // namespace lumo
