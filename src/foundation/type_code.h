#pragma once

#include "platform/export.h"

namespace lumo {

class String;

/// The next error code: 1 at the first call, then 2, 3 and so on. Each error class takes one at
/// load. Codes identify a class within one run of the process and are never stored or sent.
/// May be called on any thread, as a plug-in that loads late takes its codes then.
VEXG_EXPORT unsigned GloballyUniqueObjectErrorCode();

/// The type code that belongs to `name`, made on first sight: 1 for the first name, then 2, 3 and
/// so on. Classes that register the same name share a code. May be called on any thread.
VEXG_EXPORT unsigned GloballyUniqueObjectTypeCode(const String& name);

}  // namespace lumo
