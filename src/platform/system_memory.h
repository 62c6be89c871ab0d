#pragma once

#include <cstddef>
#include <cstdint>

#include "platform/export.h"

namespace lumo::platform {

/// Says how many bytes of memory the machine has, or the largest number where it doesn't say.
VEXG_EXPORT std::uint64_t GetMemoryOfMachine();

/// Gives memory back to the system that was freed but is kept for later, where the C library can.
/// It takes a moment: between the passes of long work, not inside them.
VEXG_EXPORT void ReturnFreeMemory();

/// Makes room in the heap of this thread for what it is about to allocate in small pieces: the C
/// library would ask the system for each page of it. Memory that isn't used after all goes back.
/// @param bytes  no more than 8 MiB. Where there is less memory nothing is lost.
VEXG_EXPORT void GrowHeap(std::size_t bytes);

}  // namespace lumo::platform
