#pragma once

#include <cstdint>

#include "platform/export.h"

namespace lumo::platform {

/// Says how many bytes of memory the machine has, or the largest number where it doesn't say.
VEXG_EXPORT std::uint64_t GetMemoryOfMachine();

}  // namespace lumo::platform
