#pragma once

#include <string>

#include "platform/export.h"

namespace lumo::platform {

/// Has the user's browser open an address, and does not wait for it. The program that does it on
/// the desktop is xdg-open, or the one that $BROWSER names.
/// @return false where there is no such program, or no desktop.
VEXG_EXPORT bool OpenInBrowser(const std::string& address);

}  // namespace lumo::platform
