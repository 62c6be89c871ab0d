#pragma once

#include <cstddef>
#include <string>
#include <string_view>

#include "platform/export.h"

namespace lumo::platform {

// Names of what a process makes for itself alone, in a folder or in the system. The name holds a
// mark of the process, which separates the remains of a killed one from the work of a running one.

/// A name that nobody else uses: "beginning.mark".
VEXG_EXPORT std::string OwnedName(const std::string& beginning);

/// True when a name has the mark of a process of this machine that has ended, at its first dot.
VEXG_EXPORT bool IsAbandoned(std::string_view name);

/// True when a name has the mark of this process, at its first dot.
VEXG_EXPORT bool IsOwned(std::string_view name);

/// Length of the mark at the front of `text`, with its dot; 0 when there is none.
VEXG_EXPORT std::size_t OwnerMarkLength(std::string_view text);

}  // namespace lumo::platform
