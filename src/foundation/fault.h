#pragma once

#include "foundation/string.h"

namespace lumo {

// Why an operation failed, in words, for layers whose operations only give false or empty: who
// detects a failure tells it here, and who reports it to a person takes it. The text belongs to the
// thread; whatever hands work to another thread and waits for it carries the text back.

/// Keeps `text`, one line that says what and where, as the reason of the failure that this thread
/// is in. A later one replaces it.
VEXG_EXPORT void SetFault(const String& text);

/// Takes the text off the thread; no text when nothing was told since the last call.
VEXG_EXPORT String TakeFault();

/// TakeFault, or `otherwise` when nothing was told.
VEXG_EXPORT String TakeFaultOr(const char* otherwise);

}  // namespace lumo
