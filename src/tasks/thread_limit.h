#pragma once

#include <memory>

#include "platform/export.h"

namespace lumo {

/// Bounds the threads of the task engine while it lives: pipelines and parallel loops of the whole
/// process use at most so many, the calling thread included. Of several limits, and of what
/// LUMO_THREADS_HINT says, the lowest holds.
class VEXG_EXPORT ThreadLimit {
 public:
  /// @param threads  1 or more.
  explicit ThreadLimit(unsigned threads);
  ~ThreadLimit();
  ThreadLimit(const ThreadLimit&) = delete;
  ThreadLimit& operator=(const ThreadLimit&) = delete;

  /// How many threads the engine uses at most at this moment.
  static unsigned GetCurrent();

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

}  // namespace lumo
