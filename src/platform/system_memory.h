#pragma once

#include <cstdint>

#include "platform/export.h"

namespace lumo::platform {

/// Says how many bytes of memory the machine has, or the largest number where it doesn't say.
VEXG_EXPORT std::uint64_t GetMemoryOfMachine();

/// Gives memory back to the system that was freed but is kept for later, where the C library can.
/// It takes a moment: between the passes of long work, not inside them.
VEXG_EXPORT void ReturnFreeMemory();

}  // namespace lumo::platform
