#pragma once

#include "platform/export.h"

namespace lumo::platform {

/// True when standard error is a terminal that somebody may be watching.
VEXG_EXPORT bool ErrorOutputIsTerminal();

/// True when standard output is a terminal.
VEXG_EXPORT bool OutputIsTerminal();

/// Columns of the terminal at standard error; 80 when it does not say.
VEXG_EXPORT unsigned TerminalColumns();

/// Lets the process open as many files as the system allows it at most; for a program that serves
/// many clients.
VEXG_EXPORT void RaiseDescriptorLimit();

/// Number of this process in the system.
VEXG_EXPORT int ProcessNumber();

/// Has writing to a pipe that nobody reads any more, or beyond the size that a file may have
/// (ulimit -f), fail instead of ending the process at once. For a program to ask for: the library
/// leaves the signals of its host as they are.
VEXG_EXPORT void SurviveFailedWrites();

/// True when standard output is a pipe that nobody reads any more.
VEXG_EXPORT bool OutputIsClosed();

/// Ends the process the way writing to a closed pipe does by itself.
[[noreturn]] VEXG_EXPORT void EndOfClosedPipe();

/// Ends the process at once, whatever its threads are doing; what the standard streams still hold
/// is written before.
[[noreturn]] VEXG_EXPORT void EndProcess(int code);

/// The same, without what the standard streams still hold: no thread that is in the middle of
/// writing it is waited for.
[[noreturn]] VEXG_EXPORT void DropProcess(int code);

}  // namespace lumo::platform
