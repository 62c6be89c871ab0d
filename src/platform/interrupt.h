#pragma once

#include <functional>
#include <memory>

#include "platform/export.h"

namespace lumo::platform {

/// Calls a function when the user or the system asks the program to end (SIGINT, SIGTERM). The
/// second such request ends the process at once, as it would without this. A program whose output
/// is all that it is there for has the function called too when nobody reads that any more.
///
/// It is made before the program starts its first thread, and once.
/// Threads: the function runs on a thread of its own.
class VEXG_EXPORT InterruptWatch {
 public:
  /// Throws std::system_error where the system has no descriptors or no thread for it.
  /// @param watchOutput  call the function too when the pipe at standard output is closed.
  explicit InterruptWatch(std::function<void()> onInterrupt, bool watchOutput = false);
  /// After this the function is not running and will not be called.
  ~InterruptWatch();
  InterruptWatch(const InterruptWatch&) = delete;
  InterruptWatch& operator=(const InterruptWatch&) = delete;

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

/// True once the function of an InterruptWatch was called.
VEXG_EXPORT bool WasInterrupted();

/// Has the process take no notice of such requests any more, as it is about to end by itself.
VEXG_EXPORT void IgnoreInterrupts();

}  // namespace lumo::platform
