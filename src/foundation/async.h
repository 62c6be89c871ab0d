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
///
///     struct Sum final : Async {
///       using Async::Async;
///       void Execute() override {
///         for (unsigned i = 0; i < values.size() && !IsAborted(); ++i) total += values[i];
///       }
///       std::vector<double> values;
///       double total = 0;
///     };
///     const Pointer<Sum> sum(new Sum(ipc));
///     SubmitAsync(sum, true);   // on a thread of its own
///     sum->WaitFinished();      // sum->total may be read from here on
class VEXG_EXPORT Async : public ErrorState {
 public:
  /// Makes an abort flag and a progress report that `callback` observes.
  explicit Async(const AsyncCallbackPtr& callback = {});
  /// Uses the flag and the report of `ipc`; `callback` hears of the start and the end.
  explicit Async(const IPC& ipc, const AsyncCallbackPtr& callback = {});

  /// False once an error is stored: the result is then of no use.
  virtual bool IsValid() const { return !HasError(); }
  /// Marks the work as begun: calls OnStart, sets the progress to 0 and wakes those in WaitStarted.
  virtual void Start();
  /// True from Start on, also when the work has finished.
  virtual bool IsStarted() const { return started_; }
  /// Blocks until IsStarted.
  virtual void WaitStarted() const;
  /// Marks the work as ended, well or not: calls OnFinish, sets the progress to 1 and wakes all
  /// waiters. Only after it may another thread read the results.
  virtual void Finish();
  /// True from Finish on; the work may have failed or been aborted.
  virtual bool IsFinished() const { return finished_; }
  /// Blocks until IsFinished; for ever when nobody runs this work.
  virtual void WaitFinished() const;
  /// Raises the abort flag. It only asks: Execute ends when it next looks at the flag.
  virtual void Abort();
  /// True when the abort flag is up; the results are then incomplete.
  virtual bool IsAborted() const { return ipc_.abort->IsSet(); }
  /// Fraction of the work that is done, 0 to 1.
  virtual double GetProgress() const { return ipc_.progress->GetProgress(); }
  /// Reports how far the work is, as a fraction from 0 to 1.
  virtual void SetProgress(double progress) { ipc_.progress->Update(progress); }
  /// Does the work, on the thread that runs it. The base does nothing; a derived class stores an
  /// error where it fails, and looks at IsAborted() now and then.
  virtual void Execute() {}

  /// The abort flag and the progress report of this work, to be handed to what it calls.
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

/// Hands the start, end, abort and progress of a child on to its group.
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
///
///     AggragateAsync group(2);
///     for (unsigned i = 0; i < 2; ++i) {
///       const IPC ipc(group.GetSharedAbort(), group.GetChildProgress(i));
///       group.SetChild(i, AsyncPtr(new Part(ipc, group.GetChildCallback(i))));
///     }
class VEXG_EXPORT AggragateAsync : public Async {
 public:
  /// @param children  how many there are; each has its place from 0.
  /// @param callback  hears the first start, the last end, and the mean progress; may be empty.
  AggragateAsync(unsigned children, const AsyncCallbackPtr& callback = {});

  /// Puts a child in its place; `index` is below the number of children.
  void SetChild(unsigned index, const AsyncPtr& child) { children_[index] = child; }
  /// The observer that child `index` is made with, by which the group hears of it.
  AsyncCallbackPtr GetChildCallback(unsigned index) const { return childCallbacks_[index]; }
  /// The report that child `index` is made with. It belongs to the group, so it goes no longer than
  /// that.
  ProgressReportPtr GetChildProgress(unsigned index) { return progress_.GetSlot(index); }
  /// The one flag of all children.
  AbortFlagPtr GetSharedAbort() const { return sharedAbort_; }

  /// False when the group has an error of its own; those of the children stay with them.
  bool IsValid() const override;
  /// Calls Start of each child, in order.
  void Start() override;
  /// True when a child has started; false without children.
  bool IsStarted() const override;
  /// Blocks until every child has started.
  void WaitStarted() const override;
  /// Calls Finish of each child, in order.
  void Finish() override;
  /// True when all children have finished; true without children.
  bool IsFinished() const override;
  /// Passes over a child that is aborted and has not started.
  void WaitFinished() const override;
  /// Aborts each child.
  void Abort() override;
  /// True when a child is aborted.
  bool IsAborted() const override;
  /// Runs the children one after the other on this thread.
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

/// Puts `work` at the end of GetAsyncQueue(name), which runs it when all before it has ended.
/// @return true.
VEXG_EXPORT bool EnqueueAsync(const AsyncPtr& work, const String& name);

/// Runs `work`: on this thread, or in the background on a thread of its own.
/// @return in the background, whether a thread could be had (when not, `work` is finished with
///         AsyncErrorExecuteFailed stored); else whether `work` is there and valid afterwards.
VEXG_EXPORT bool SubmitAsync(const AsyncPtr& work, bool background);

}  // namespace lumo
