#pragma once

#include <string>

#include "platform/export.h"

namespace lumo::platform {

/// Seconds of a clock that never goes back, from an unspecified origin.
VEXG_EXPORT double MonotonicSeconds();

/// Seconds of processor time that this process has used so far, on all its threads.
VEXG_EXPORT double ProcessCpuSeconds();

/// The local date and time as asctime writes it, without the line feed.
VEXG_EXPORT std::string LocalDateText();

}  // namespace lumo::platform
