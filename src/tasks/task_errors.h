#pragma once

#include "foundation/error_state.h"

namespace lumo {

// Errors of this floor; foundation/errors.h says how they are compared.

/// A parallel body found its data unusable.
struct VEXG_EXPORT ParallelError : ObjectError {
  ParallelError() : ObjectError(Code) {}
  static const unsigned Code;
};

/// A read, a write or a parallel loop of a pipeline stage failed.
struct VEXG_EXPORT TaskError : ObjectError {
  TaskError() : ObjectError(Code) {}
  static const unsigned Code;
};

/// A task got arguments of the wrong number or type.
struct VEXG_EXPORT TaskErrorBadArgs : ObjectError {
  TaskErrorBadArgs() : ObjectError(Code) {}
  static const unsigned Code;
};

/// A task got parameters that it could not use.
struct VEXG_EXPORT TaskErrorBadParams : ObjectError {
  TaskErrorBadParams() : ObjectError(Code) {}
  static const unsigned Code;
};

}  // namespace lumo
