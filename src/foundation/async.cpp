#include "foundation/async.h"

#include <functional>
#include <utility>

#include "foundation/thread_roll.h"
#include "foundation/thrown.h"

namespace lumo {
namespace {

void RunAsync(const AsyncPtr& work) {
  try {
    work->Start();
    work->Execute();
  } catch (...) {
    NoteException();
    work->SetErrorState(AsyncErrorExecuteFailed());
  }
  work->Finish();
}

/// An abort flag that wakes those who wait for work that it keeps from being started.
class WakingAbortFlag final : public StandardAbortFlag {
 public:
  explicit WakingAbortFlag(std::function<void()> wake) : wake_(std::move(wake)) {}

  void Set(const bool& abort) override {
    StandardAbortFlag::Set(abort);
    wake_();  // once the flag can be seen
  }

 private:
  std::function<void()> wake_;
};

/// The queue of the process with the thread that serves it.
class QueueExecutor {
 public:
  QueueExecutor() : thread_(new QueueThread(queue_)) { StartThread(thread_); }

  MTQueue<AsyncPtr>& Queue() { return queue_; }

  /// Drops all that waits, and lets the thread end after the item that it is at.
  void Close() {
    thread_->RequestStop();
    AsyncPtr dropped;
    while (queue_.TryPop(dropped)) {
    }
  }

 private:
  class QueueThread : public SimpleThread {
   public:
    explicit QueueThread(MTQueue<AsyncPtr>& queue) : queue_(queue) {}

    void Run() override {
      SetRunning();
      ThreadRoll::Get().Stay();
      while (!StopRequested()) {
        AsyncPtr work;
        queue_.Pop(work);
        if (work.IsNull()) continue;
        try {
          if (work->IsAborted()) {
            work->Drop();
          } else {
            RunAsync(work);
          }
        } catch (...) {
          // Of an observer's; the next item is not to suffer from it.
        }
      }
    }

   private:
    MTQueue<AsyncPtr>& queue_;
  };

  MTQueue<AsyncPtr> queue_;
  SimpleThreadPtr thread_;
};

/// Closes the queue when the process ends. The executor itself stays, as its thread may still be
/// in the middle of an item by then.
struct QueueCloser {
  QueueExecutor& executor;
  ~QueueCloser() { executor.Close(); }
};

}  // namespace

Async::Async(const AsyncCallbackPtr& callback)
    : callback_(callback),
      ipc_(AbortFlagPtr(new StandardAbortFlag(callback)),
           ProgressReportPtr(new StandardProgressReport(callback))) {}

Async::Async(const IPC& ipc, const AsyncCallbackPtr& callback) : callback_(callback), ipc_(ipc) {}

void Async::Changed() {
  ++changes_;
  changes_.notify_all();
}

template <typename Done>
void Async::WaitUntil(Done done) const {
  while (true) {
    const unsigned seen = changes_;
    if (done()) return;
    changes_.wait(seen);
  }
}

void Async::Start() {
  if (!callback_.IsNull()) callback_->OnStart();
  SetProgress(0.0);
  started_ = true;
  Changed();
}

void Async::WaitStarted() const {
  WaitUntil([this] { return IsStarted(); });
}

void Async::Finish() {
  if (!callback_.IsNull()) callback_->OnFinish();
  SetProgress(1.0);
  finished_ = true;
  Changed();
}

void Async::WaitFinished() const {
  WaitUntil([this] { return IsFinished(); });
}

void Async::WaitFinishedOrDropped() const {
  WaitUntil([this] { return IsFinished() || (IsAborted() && !IsStarted()); });
}

void Async::Abort() {
  ipc_.abort->Set(true);
  Changed();
}

void Async::Drop() {
  Changed();
}

DoneAsync::DoneAsync(const AsyncCallbackPtr& callback) : Async(callback) {
  Async::Start();
  Async::Finish();
}

AggragateAsyncCallback::AggragateAsyncCallback(AggragateAsync* group, const AbortFlagPtr& abort,
                                               const ProgressReportPtr& progress)
    : abort_(abort), progress_(progress), group_(group) {}

void AggragateAsyncCallback::OnStart() {
  group_->ChildStarted();
}

void AggragateAsyncCallback::OnFinish() {
  group_->ChildFinished();
}

void AggragateAsyncCallback::OnAbort(const bool& abort) {
  abort_->Set(abort);
}

void AggragateAsyncCallback::OnProgress(double progress) {
  progress_->Update(progress);
}

AggragateAsync::AggragateAsync(unsigned children, const AsyncCallbackPtr& callback)
    : children_(ArrayDims(children)),
      childCallbacks_(ArrayDims(children)),
      sharedAbort_(new WakingAbortFlag([this] {
        for (const AsyncPtr& child : children_) {
          if (!child.IsNull()) child->Drop();
        }
      })),
      outerCallback_(callback),
      progress_(GetIPC().progress, callback, children) {
  for (unsigned i = 0; i < childCallbacks_.GetCount(); ++i) {
    childCallbacks_[i] = AggragateAsyncCallbackPtr(
        new AggragateAsyncCallback(this, sharedAbort_, progress_.GetSlot(i)));
  }
}

bool AggragateAsync::IsValid() const {
  return children_.IsValid() && !HasError();
}

void AggragateAsync::Start() {
  for (const AsyncPtr& child : children_) {
    if (!child.IsNull()) child->Start();
  }
}

bool AggragateAsync::IsStarted() const {
  for (const AsyncPtr& child : children_) {
    if (!child.IsNull() && child->IsStarted()) return true;
  }
  return false;
}

void AggragateAsync::WaitStarted() const {
  for (const AsyncPtr& child : children_) {
    if (!child.IsNull()) child->WaitStarted();
  }
}

void AggragateAsync::Finish() {
  for (const AsyncPtr& child : children_) {
    if (!child.IsNull()) child->Finish();
  }
}

bool AggragateAsync::IsFinished() const {
  for (const AsyncPtr& child : children_) {
    if (!child.IsNull() && !child->IsFinished()) return false;
  }
  return true;
}

void AggragateAsync::WaitFinished() const {
  for (const AsyncPtr& child : children_) {
    if (!child.IsNull()) child->WaitFinishedOrDropped();
  }
}

void AggragateAsync::Abort() {
  for (const AsyncPtr& child : children_) {
    if (!child.IsNull()) child->Abort();
  }
}

bool AggragateAsync::IsAborted() const {
  for (const AsyncPtr& child : children_) {
    if (!child.IsNull() && child->IsAborted()) return true;
  }
  return false;
}

void AggragateAsync::Execute() {
  for (const AsyncPtr& child : children_) {
    if (!child.IsNull()) child->Execute();
  }
}

void AggragateAsync::ChildStarted() {
  const MutexLock lock = mutex_.Lock();
  if (startedCount_++ == 0 && !outerCallback_.IsNull()) outerCallback_->OnStart();
}

void AggragateAsync::ChildFinished() {
  const MutexLock lock = mutex_.Lock();
  if (++finishedCount_ == children_.GetCount() && !outerCallback_.IsNull()) {
    outerCallback_->OnFinish();
  }
}

MTQueue<AsyncPtr>& GetAsyncQueue(const String& /*name*/) {
  static auto& executor = *new QueueExecutor;
  static const QueueCloser closer{executor};
  return executor.Queue();
}

bool EnqueueAsync(const AsyncPtr& work, const String& name) {
  GetAsyncQueue(name).Push(work);
  return true;
}

bool SubmitAsync(const AsyncPtr& work, bool background) {
  if (!background) {
    if (work.IsNull()) return false;
    RunAsync(work);
    return work->IsValid();
  }
  if (work.IsNull()) return true;
  if (Thread().Start([work] { RunAsync(work); })) return true;
  work->SetErrorState(AsyncErrorExecuteFailed());
  work->Start();
  work->Finish();
  return false;
}

}  // namespace lumo
