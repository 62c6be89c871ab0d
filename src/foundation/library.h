#pragma once

#include <cstdint>

#include "platform/export.h"

namespace lumo {

/// Makes the process-wide registries ready: the map of open objects and the data managers. A host
/// calls it once, from one thread, before it runs the first job; a second call does nothing. What
/// it makes lives until the process ends.
VEXG_EXPORT void VEXInit();

/// Version of the library, "major.minor.patch".
VEXG_EXPORT const char* GetLibraryVersion();

/// The scheduler's own number of threads for this machine; LUMO_THREADS_HINT does not change it.
VEXG_EXPORT std::int32_t GetProcessingCores();

/// The value of the environment variable LUMO_THREADS_HINT when the library was loaded: the number
/// of threads that the scheduler may use, 1 or more; -1 for "automatic", which stands for a
/// variable that is not set, not a number, or under 1.
VEXG_EXPORT std::int32_t GetThreadsHint();

/// Wall-clock seconds since the library was loaded.
VEXG_EXPORT double WallSeconds();

/// One step of VEXInit. A floor that has something to make there defines a static one, in a source
/// file of its own; the step looks itself whether its work is done already:
///
///     const InitStep step(20, [] { GetGlobalDataMap(); });
///
/// Steps run in the order of their numbers.
class VEXG_EXPORT InitStep {
 public:
  InitStep(unsigned order, void (*run)());
};

}  // namespace lumo
