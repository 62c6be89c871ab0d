#pragma once

#include <functional>

#include "platform/export.h"

namespace lumo {

/// Runs `work` on this thread, where the task engine has as many threads to help as
/// LUMO_THREADS_HINT asks for: by itself the scheduler gives a piece of work no more of them than
/// the machine has cores. It returns when `work` has; an exception of `work` comes out here.
VEXG_EXPORT void RunInEngine(const std::function<void()>& work);

}  // namespace lumo
