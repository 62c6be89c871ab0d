#pragma once

#include <mutex>

#include "foundation/run_controls.h"

namespace lumo {

/// An abort flag in memory that a caller lends for the length of a call. Work in the background may
/// hold the flag longer: once the memory is returned the flag keeps the value that it had.
/// Threads: any.
class LentAbortFlag final : public AbortFlag {
 public:
  /// @param memory  1 is abort; null for a flag that is never raised from outside.
  explicit LentAbortFlag(unsigned char* memory) : memory_(memory) {}

  void Set(const bool& abort) override {
    AbortFlag::Set(abort);
    const std::lock_guard lock(mutex_);
    last_ = abort;
    if (memory_ != nullptr) std::atomic_ref(*memory_).store(abort ? 1 : 0);
  }
  bool IsSet() const override {
    const std::lock_guard lock(mutex_);
    return Look();
  }

  /// Lets go of the memory.
  void Return() {
    const std::lock_guard lock(mutex_);
    last_ = Look();
    memory_ = nullptr;
  }

 private:
  bool Look() const { return memory_ != nullptr ? std::atomic_ref(*memory_).load() == 1 : last_; }

  mutable std::mutex mutex_;
  unsigned char* memory_;
  bool last_ = false;
};

/// A progress report in memory that a caller lends, likewise.
class LentProgressReport final : public ProgressReport {
 public:
  /// @param memory  gets fractions from 0 to 1; null for a report to nobody.
  explicit LentProgressReport(double* memory) : memory_(memory) {}

  void Update(double progress) override {
    Tell(progress);
    const std::lock_guard lock(mutex_);
    last_ = progress < 1 ? progress : 1;
    if (memory_ != nullptr) std::atomic_ref(*memory_).store(last_);
  }
  double GetProgress() const override {
    const std::lock_guard lock(mutex_);
    return last_;
  }

  /// Lets go of the memory.
  void Return() {
    const std::lock_guard lock(mutex_);
    memory_ = nullptr;
  }

 private:
  mutable std::mutex mutex_;
  double* memory_;
  double last_ = 0;
};

}  // namespace lumo
