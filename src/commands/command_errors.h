#pragma once

#include "foundation/error_state.h"

namespace lumo {

// Errors of this floor; foundation/errors.h says how they are compared.

/// An input check of a command failed, or its body gave up.
struct VEXG_EXPORT CommandErrorFail : ObjectError {
  CommandErrorFail() : ObjectError(Code) {}
  static const unsigned Code;
};

/// An argument list could not grow.
struct VEXG_EXPORT ArgListError : ObjectError {
  ArgListError() : ObjectError(Code) {}
  static const unsigned Code;
};

}  // namespace lumo
