#pragma once

#include <functional>

#include "platform/export.h"

namespace lumo::platform {

/// Calls a function when another process of this machine ends; not for the calling process itself.
///
/// Threads: the function runs on a thread that all watches share, or on the calling thread when the
///          process has ended already, and is expected to be short.
class VEXG_EXPORT ProcessWatch {
 public:
  /// @param process  its number in the system.
  /// @param onEnd    is called once at most.
  ProcessWatch(int process, std::function<void()> onEnd);
  /// After this the function is not running and will not be called.
  ~ProcessWatch();
  ProcessWatch(const ProcessWatch&) = delete;
  ProcessWatch& operator=(const ProcessWatch&) = delete;

 private:
  unsigned long number_ = 0;  // 0: nothing is watched
};

}  // namespace lumo::platform
