#pragma once

#include <string_view>

#include "platform/export.h"

namespace lumo::platform {

/// Writes `text` to standard error as it stands, in one piece where the system can.
VEXG_EXPORT void DebugOutput(std::string_view text);

}  // namespace lumo::platform
