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
  /// The work begins.
  virtual void OnStart() {}
  /// The work has ended, whether well or not. Those who wait for it see it finished only after
  /// this.
  virtual void OnFinish() {}
  /// The abort flag was set to the value, which need not be another one than before.
  virtual void OnAbort(const bool&) {}
  /// @param progress  fraction done, 0 to 1.
  virtual void OnProgress(double /*progress*/) {}
};

using AsyncCallbackPtr = Pointer<AsyncCallback>;

/// The request to abort a long operation. The root keeps nothing and only hands the request to its
/// observer; StandardAbortFlag is the one to use.
///
/// The operation looks at the flag now and then, a loop at each part and a process at each token,
/// so an abort takes effect a little later and leaves an incomplete result. It is no failure: who
/// needs to know asks IsSet() after the call.
class VEXG_EXPORT AbortFlag {
 public:
  using PointerRoot = AbortFlag;

  explicit AbortFlag(const AsyncCallbackPtr& callback = {}) : callback_(callback) {}

  /// Raises the flag, or takes the request back. May be called on any thread.
  virtual void Set(const bool& abort) {
    if (!callback_.IsNull()) callback_->OnAbort(abort);
  }
  /// True while the operation is to end.
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

/// Takes the reports of a long operation on how far it has come, as a fraction from 0 to 1. The
/// root keeps nothing and only hands them to its observer; StandardProgressReport is the one to
/// use.
class VEXG_EXPORT ProgressReport {
 public:
  using PointerRoot = ProgressReport;

  explicit ProgressReport(const AsyncCallbackPtr& callback = {}) : callback_(callback) {}

  /// Reports a fraction from 0 to 1. Nothing makes a later one larger than an earlier one.
  virtual void Update(double progress) { Tell(progress); }
  /// The fraction that was reported last; 0 before the first.
  virtual double GetProgress() const { return 0.0; }
  virtual ~ProgressReport() = default;

 protected:
  /// Hands a fraction to the observer, when there is one.
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

/// Pairs the flag that aborts a long operation with the report of its progress. A copy shares both.
/// The default has a flag and a report of its own, without observers.
///
///     const IPC ipc;
///     const AsyncPtr stats = raster->StatsBuild(ipc);
///     …                                     // meanwhile, on any thread:
///     std::cout << ipc.progress->GetProgress();
///     ipc.abort->Set(true);
///
/// Functions that take one look at neither pointer for null: both have to be there.
class VEXG_EXPORT IPC {
 public:
  using PointerRoot = IPC;

  IPC() : abort(new StandardAbortFlag), progress(new StandardProgressReport) {}
  /// Pairs a flag and a report of others, neither of them empty.
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
