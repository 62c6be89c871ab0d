#pragma once

#include <string>

#include "platform/export.h"

namespace lumo {

/// Describes the exception that a catch block has caught, in one line. One that stands for a
/// shortage of memory is noted (platform/memory_shortage.h) and reads "out of memory".
VEXG_EXPORT std::string DescribeException();

/// Notes the shortage of memory that the exception caught by a catch block stands for, if it is
/// one; for places that have nobody to report to. It throws nothing and takes no memory.
VEXG_EXPORT void NoteException() noexcept;

}  // namespace lumo
