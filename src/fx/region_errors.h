#pragma once

#include "foundation/error_state.h"

namespace lumo {

// Errors of this floor; foundation/errors.h says how they are compared.

/// A region attribute record could not be laid out.
struct VEXG_EXPORT RegionAttributeErrorBadAllocation : ObjectError {
  RegionAttributeErrorBadAllocation() : ObjectError(Code) {}
  static const unsigned Code;
};

}  // namespace lumo
