#pragma once

#include "platform/export.h"

namespace lumo::platform {

/// True when standard error is a terminal that somebody may be watching.
VEXG_EXPORT bool ErrorOutputIsTerminal();

/// Columns of the terminal at standard error; 80 when it does not tell.
VEXG_EXPORT unsigned TerminalColumns();

/// Lets the process open as many files as the system allows it at most; for a program that serves
/// many clients.
VEXG_EXPORT void RaiseDescriptorLimit();

/// Number of this process in the system.
VEXG_EXPORT int ProcessNumber();

}  // namespace lumo::platform
