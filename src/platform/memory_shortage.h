#pragma once

#include <string>

#include "platform/export.h"

namespace lumo::platform {

// A count is kept of memory that the process asked for and did not get. Libraries hide many such
// failures behind another reason, or go on without what they could not make, so whoever is about to
// believe a result asks here whether memory was short meanwhile.

/// The words of the failure, wherever it is reported.
inline constexpr const char* kOutOfMemory = "out of memory";

/// Notes that memory was asked for in vain. Safe anywhere, in an allocator too.
VEXG_EXPORT void NoteMemoryShortage() noexcept;

/// Number of shortages noted since the process began: by this library and its plug-ins where they
/// meet one, and by a program that watches all its allocations (program/watched_allocation.cpp).
VEXG_EXPORT unsigned long CountMemoryShortages() noexcept;

/// Watches for a shortage of memory, on any thread of the process, since it was made.
class MemoryWatch {
 public:
  MemoryWatch() noexcept : before_(CountMemoryShortages()) {}
  /// True when memory was asked for in vain since then.
  bool WasShort() const noexcept { return CountMemoryShortages() != before_; }

 private:
  unsigned long before_;
};

/// Has a program in which memory was short end with one line and exit code `code`, where a library
/// that can't do without the memory would crash it. Other crashes stay as they are.
///
/// For the program to ask for, once, as it changes the handlers of SIGSEGV and SIGABRT and the one
/// of std::terminate.
/// @param program  stands before the words of the line; outlives the process.
VEXG_EXPORT void EndInOrderWhenMemoryIsShort(const char* program, int code);

/// The text of a system's number, as errno has it. A shortage of memory is noted.
VEXG_EXPORT std::string SystemErrorText(int code);

}  // namespace lumo::platform
