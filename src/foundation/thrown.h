#pragma once

#include <string>

#include "platform/export.h"

namespace lumo {

/// Describes the exception that a catch block has caught, in one line. One that tells of a shortage
/// of memory is noted (platform/memory_shortage.h) and reads "out of memory".
VEXG_EXPORT std::string DescribeException();

}  // namespace lumo
