#pragma once

#include <string>

#include "platform/export.h"

namespace lumo::platform {

/// Gives bytes that nobody can guess, as lower-case hexadecimal digits; for keys.
/// Throws std::system_error where the system has none.
VEXG_EXPORT std::string RandomHex(unsigned bytes);

}  // namespace lumo::platform
