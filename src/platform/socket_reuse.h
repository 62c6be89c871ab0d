#pragma once

#include "platform/export.h"

namespace lumo::platform {

/// Lets a socket take a port whose connections have just ended; a port on which somebody listens
/// stays taken.
/// @param socket  descriptor of one that is not bound yet.
VEXG_EXPORT void AllowPortSoon(int socket);

}  // namespace lumo::platform
