#pragma once

#include "foundation/string.h"

namespace lumo {

// The reason of a failure in words, beside operations that only give false or empty: who detects
// the failure sets it here, and who reports to a person takes it. The text belongs to the thread;
// whatever hands work to another thread and waits for it carries the text back.

/// Keeps `text`, one line that says what and where, as the reason of the failure that this thread
/// is in. A later one replaces it.
VEXG_EXPORT void SetFault(const String& text);

/// Sets the fault and gives false, for `return Refuse(...)`.
inline bool Refuse(const String& text) {
  SetFault(text);
  return false;
}

/// Takes the text off the thread; no text when none was set since the last call.
VEXG_EXPORT String TakeFault();

/// TakeFault, or `otherwise` when none was set.
VEXG_EXPORT String TakeFaultOr(const char* otherwise);

}  // namespace lumo
