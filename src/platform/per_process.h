#pragma once

#include <atomic>

#include "platform/process.h"

namespace lumo::platform {

/// Holds the one object of a process, made when it is first asked for and never destroyed. A
/// process that was forked gets one of its own: the threads that the parent's knows of aren't
/// there, and its locks may never be let go.
template <typename T>
class PerProcess {
 public:
  T& Get() {
    const int process = ProcessNumber();
    Held* known = held_;
    while (known == nullptr || known->process != process) {
      auto* const fresh = new Held{process, {}};
      if (held_.compare_exchange_strong(known, fresh)) return fresh->object;
      delete fresh;
    }
    return known->object;
  }

 private:
  struct Held {
    const int process;
    T object;
  };
  std::atomic<Held*> held_{nullptr};
};

}  // namespace lumo::platform
