#pragma once

#include "foundation/error_state.h"

namespace lumo {

// Errors of this floor; foundation/errors.h says how they are compared.

/// A polygon can't be used.
struct VEXG_EXPORT PolygonErrorBadPolygon : ObjectError {
  PolygonErrorBadPolygon() : ObjectError(Code) {}
  static const unsigned Code;
};

}  // namespace lumo
