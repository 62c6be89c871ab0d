#pragma once

#include <atomic>
#include <type_traits>

#include "foundation/pointer.h"

namespace lumo {

/// Observer of a piece of work. Every operation does nothing unless it is overridden.
/// Threads: called on whichever thread does the work, one call at a time for one piece of work.
class VEXG_EXPORT AsyncCallback {
 public:
  using PointerRoot = AsyncCallback;

  virtual ~AsyncCallback() = default;
  virtual void OnStart() {}
  virtual void OnFinish() {}
  virtual void OnAbort(const bool&) {}
  /// @param progress  fraction done, 0 to 1.
  virtual void OnProgress(double /*progress*/) {}
};

using AsyncCallbackPtr = Pointer<AsyncCallback>;

/// The request to abort a long operation. The root keeps nothing and only tells its observer.
class VEXG_EXPORT AbortFlag {
 public:
  using PointerRoot = AbortFlag;

  explicit AbortFlag(const AsyncCallbackPtr& callback = {}) : callback_(callback) {}

  virtual void Set(const bool& abort) {
    if (!callback_.IsNull()) callback_->OnAbort(abort);
  }
  virtual bool IsSet() const { return false; }
  virtual ~AbortFlag() = default;

 private:
  AsyncCallbackPtr callback_;
};

using AbortFlagPtr = Pointer<AbortFlag>;

/// An abort flag in memory that somebody else owns and keeps alive: 1 is abort, every other value
/// is go on. Exists for bool and unsigned char, both one byte.
/// Threads: any number of threads, and of processes where the memory is shared.
template <typename T>
class ExternalAbortFlag : public AbortFlag {
  static_assert(sizeof(T) == 1);

 public:
  explicit ExternalAbortFlag(T* target, const AsyncCallbackPtr& callback = {})
      : AbortFlag(callback), target_(reinterpret_cast<unsigned char*>(target)) {}

  void Set(const bool& abort) override {
    AbortFlag::Set(abort);
    std::atomic_ref(*target_).store(abort ? kTrue : kFalse);
  }
  bool IsSet() const override { return std::atomic_ref(*target_).load() == kTrue; }

 private:
  static constexpr unsigned char kTrue = 1;
  static constexpr unsigned char kFalse = 0;
  // Read as a byte also where T is bool: the other side may store any value there.
  unsigned char* target_;
};

/// An abort flag with a byte of its own; starts as "go on".
class VEXG_EXPORT StandardAbortFlag : public ExternalAbortFlag<unsigned char> {
 public:
  explicit StandardAbortFlag(const AsyncCallbackPtr& callback = {})
      : ExternalAbortFlag(&flag_, callback) {}
  StandardAbortFlag(const StandardAbortFlag&) = delete;
  StandardAbortFlag& operator=(const StandardAbortFlag&) = delete;

 private:
  unsigned char flag_ = 0;
};

/// Where a long operation reports how far it has come, as a fraction from 0 to 1. The root keeps
/// nothing and only tells its observer.
class VEXG_EXPORT ProgressReport {
 public:
  using PointerRoot = ProgressReport;

  explicit ProgressReport(const AsyncCallbackPtr& callback = {}) : callback_(callback) {}

  virtual void Update(double progress) { Tell(progress); }
  virtual double GetProgress() const { return 0.0; }
  virtual ~ProgressReport() = default;

 protected:
  void Tell(double progress) {
    if (!callback_.IsNull()) callback_->OnProgress(progress);
  }

 private:
  AsyncCallbackPtr callback_;
};

using ProgressReportPtr = Pointer<ProgressReport>;

/// A progress report in memory that somebody else owns and keeps alive. Exists for float and
/// double. A value over 1 is stored as 1; one under 0 as it is.
/// Threads: any number of threads, and of processes where the memory is shared.
template <typename T>
class ExternalProgressReport : public ProgressReport {
 public:
  explicit ExternalProgressReport(T* target, const AsyncCallbackPtr& callback = {})
      : ProgressReport(callback), target_(target) {}

  void Update(double progress) override {
    if (progress > 1.0) progress = 1.0;
    Tell(progress);
    std::atomic_ref(*target_).store(static_cast<T>(progress));
  }
  double GetProgress() const override {
    return static_cast<double>(std::atomic_ref(*target_).load());
  }

 private:
  T* target_;
};

/// A progress report with a value of its own; starts at 0.
class VEXG_EXPORT StandardProgressReport : public ExternalProgressReport<double> {
 public:
  explicit StandardProgressReport(const AsyncCallbackPtr& callback = {})
      : ExternalProgressReport(&value_, callback) {}
  /// A copy takes the value over into one of its own; the observers stay with their reports.
  StandardProgressReport(const StandardProgressReport& other) : StandardProgressReport() {
    value_ = other.GetProgress();
  }
  StandardProgressReport& operator=(const StandardProgressReport& other) {
    std::atomic_ref(value_).store(other.GetProgress());
    return *this;
  }

 private:
  double value_ = 0.0;
};

/// What goes with every long operation: the flag that aborts it and the report of its progress. A
/// copy shares both. The default has a flag and a report of its own, without observers.
class VEXG_EXPORT IPC {
 public:
  using PointerRoot = IPC;

  IPC() : abort(new StandardAbortFlag), progress(new StandardProgressReport) {}
  IPC(const AbortFlagPtr& abortFlag, const ProgressReportPtr& progressReport)
      : abort(abortFlag), progress(progressReport) {}
  IPC(const IPC&) = default;
  IPC& operator=(const IPC&) = default;
  virtual ~IPC() = default;

  AbortFlagPtr abort;
  ProgressReportPtr progress;
};

using IPCPtr = Pointer<IPC>;

}  // namespace lumo
