#pragma once

#include <atomic>

#include "foundation/array.h"
#include "foundation/progress.h"
#include "foundation/run_controls.h"
#include "foundation/thread.h"

namespace lumo {

/// A unit of work that runs once: not started, started, finished. A class derived from it does the
/// work in Execute; whoever runs it calls Start, Execute, Finish.
///
/// Failure: carried in its own error state; Finish comes all the same, so that no waiter hangs.
/// Threads: one thread runs it; any other may ask for its state, wait for it and abort it.
class VEXG_EXPORT Async : public ErrorState {
 public:
  /// Makes an abort flag and a progress report that tell `callback`.
  explicit Async(const AsyncCallbackPtr& callback = {});
  /// Uses the flag and the report of `ipc`; `callback` is told of the start and the end.
  explicit Async(const IPC& ipc, const AsyncCallbackPtr& callback = {});

  virtual bool IsValid() const { return !HasError(); }
  virtual void Start();
  virtual bool IsStarted() const { return started_; }
  /// Blocks until IsStarted.
  virtual void WaitStarted() const;
  virtual void Finish();
  virtual bool IsFinished() const { return finished_; }
  /// Blocks until IsFinished; for ever when nobody runs this work.
  virtual void WaitFinished() const;
  virtual void Abort();
  virtual bool IsAborted() const { return ipc_.abort->IsSet(); }
  virtual double GetProgress() const { return ipc_.progress->GetProgress(); }
  virtual void SetProgress(double progress) { ipc_.progress->Update(progress); }
  virtual void Execute() {}

  const IPC& GetIPC() const { return ipc_; }

  /// Blocks until this work is finished, or is aborted and will not be started.
  void WaitFinishedOrDropped() const;

  /// Called by a queue that takes an aborted item off without starting it.
  void Drop();

 private:
  void Changed();
  template <typename Done>
  void WaitUntil(Done done) const;

  AsyncCallbackPtr callback_;
  std::atomic<bool> started_{false};
  std::atomic<bool> finished_{false};
  std::atomic<unsigned> changes_{0};  // what the waiters sleep on
  IPC ipc_;
};

using AsyncPtr = Pointer<Async>;

/// Work that is complete from the start, for operations that have nothing left to do. Its callback
/// has seen the start, both progress values and the end.
class VEXG_EXPORT DoneAsync : public Async {
 public:
  explicit DoneAsync(const AsyncCallbackPtr& callback = {});
};

class AggragateAsync;

/// What a child of a group tells its start, end, abort and progress to.
class VEXG_EXPORT AggragateAsyncCallback : public AsyncCallback {
 public:
  AggragateAsyncCallback(AggragateAsync* group, const AbortFlagPtr& abort,
                         const ProgressReportPtr& progress);
  void OnStart() override;
  void OnFinish() override;
  void OnAbort(const bool& abort) override;
  void OnProgress(double progress) override;

 private:
  AbortFlagPtr abort_;
  ProgressReportPtr progress_;
  AggragateAsync* group_;
};

using AggragateAsyncCallbackPtr = Pointer<AggragateAsyncCallback>;

/// A group of pieces of work that starts, ends, aborts and reports as one. Its progress is the mean
/// over the children; its observer sees the first start and the last end.
///
/// A child is made with GetSharedAbort() and GetChildProgress(i) as its IPC and GetChildCallback(i)
/// as its callback, so that an abort of one is an abort of all.
/// Threads: the children may run on different threads. They live no longer than the group.
class VEXG_EXPORT AggragateAsync : public Async {
 public:
  AggragateAsync(unsigned children, const AsyncCallbackPtr& callback = {});

  void SetChild(unsigned index, const AsyncPtr& child) { children_[index] = child; }
  AsyncCallbackPtr GetChildCallback(unsigned index) const { return childCallbacks_[index]; }
  ProgressReportPtr GetChildProgress(unsigned index) { return progress_.GetSlot(index); }
  AbortFlagPtr GetSharedAbort() const { return sharedAbort_; }

  bool IsValid() const override;
  void Start() override;
  /// True when a child has started; false without children.
  bool IsStarted() const override;
  void WaitStarted() const override;
  void Finish() override;
  /// True when all children have finished; true without children.
  bool IsFinished() const override;
  /// Passes over a child that is aborted and has not started.
  void WaitFinished() const override;
  void Abort() override;
  /// True when a child is aborted.
  bool IsAborted() const override;
  void Execute() override;

 private:
  friend class AggragateAsyncCallback;
  void ChildStarted();
  void ChildFinished();

  Array<AsyncPtr> children_;
  Array<AggragateAsyncCallbackPtr> childCallbacks_;
  AbortFlagPtr sharedAbort_;
  AsyncCallbackPtr outerCallback_;
  ConcurrentProgressReport progress_;
  Lockable mutex_;
  unsigned startedCount_ = 0;
  unsigned finishedCount_ = 0;
};

/// The background queue, which one thread serves: one item at a time, in the order of the queue.
/// There is one for the process, whatever `name` says. An item that is aborted when its turn comes
/// is dropped without being started.
VEXG_EXPORT MTQueue<AsyncPtr>& GetAsyncQueue(const String& name);

/// Puts `work` at the end of GetAsyncQueue(name). True.
VEXG_EXPORT bool EnqueueAsync(const AsyncPtr& work, const String& name);

/// Runs `work`: on this thread, or in the background on a thread of its own.
/// @return in the background, whether a thread could be had (when not, `work` is finished with
///         AsyncErrorExecuteFailed stored); else whether `work` is there and valid afterwards.
VEXG_EXPORT bool SubmitAsync(const AsyncPtr& work, bool background);

}  // namespace lumo
