#pragma once

#include <functional>

#include "platform/export.h"

namespace lumo {

/// Calls `body(0)` to `body(count - 1)`, on this thread and on others of the process, and returns
/// when all have run. An exception of a call comes out of here once, when the others are done.
///
/// It is for the threads of sources, which decode blocks while the engine's threads (parallel.h)
/// are busy with what was read before: these would have to be called over for each request. There
/// are as many helpers in the process as the engine has threads, less one. They are made when they
/// are first needed, sleep in between, and end after some seconds without work. A forked process
/// makes its own.
///
/// Threads: any number may call it at once; a body that calls it again has its own thread at least.
/// The bodies run in any order, so they must not wait for each other.
VEXG_EXPORT void RunByCrew(unsigned count, const std::function<void(unsigned)>& body);

/// How many threads RunByCrew may use for one call, this one among them.
VEXG_EXPORT unsigned CrewSize();

}  // namespace lumo
