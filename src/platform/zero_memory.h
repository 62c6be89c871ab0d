#pragma once

#include <cstddef>

#include "platform/export.h"

namespace lumo::platform {

/// Gives `bytes` bytes of 0 that can be read only: one place for the whole process, which stays. It
/// costs address space and no memory, however many bytes are read.
/// @return null where there is no address space.
/// Threads: any number.
VEXG_EXPORT const unsigned char* GetZeros(std::size_t bytes);

/// True for what GetZeros has given: who finds it needs to look at no byte.
VEXG_EXPORT bool AreZeros(const unsigned char* bytes);

}  // namespace lumo::platform
