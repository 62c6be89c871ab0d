#pragma once

#include <cstddef>

#include "platform/export.h"

namespace lumo::platform {

/// The bytes from which on memory that is written from end to end has left the caches by the time
/// when it is read again.
inline constexpr std::size_t kFarBytes = std::size_t{32} << 20;

/// Copies bytes into a part of a block that has kFarBytes or more. They go past the caches where
/// the processor can do so: a cache line isn't fetched to be overwritten, and what the caches hold
/// stays there. The parts do not overlap.
VEXG_EXPORT void CopyFar(void* to, const void* from, std::size_t bytes);

}  // namespace lumo::platform
