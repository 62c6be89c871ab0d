#pragma once

#include <functional>
#include <memory>

#include "platform/export.h"

namespace lumo::platform {

/// Calls a function when the user or the system asks the program to end (SIGINT, SIGTERM). The
/// second such request ends the process at once, as it would without this.
///
/// It is made before the program starts its first thread, and once.
/// Threads: the function runs on a thread of its own.
class VEXG_EXPORT InterruptWatch {
 public:
  explicit InterruptWatch(std::function<void()> onInterrupt);
  /// After this the function is not running and will not be called.
  ~InterruptWatch();
  InterruptWatch(const InterruptWatch&) = delete;
  InterruptWatch& operator=(const InterruptWatch&) = delete;

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

}  // namespace lumo::platform
