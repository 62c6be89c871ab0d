#pragma once

#include <atomic>
#include <condition_variable>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>

#include "foundation/pointer.h"

namespace lumo {

/// A thread that nobody joins: it runs on by itself when this object goes. An exception of the body
/// ends the thread alone. JoinThreads waits for all of them at the end of a program.
///
///     if (!Thread().Start([work] { work->Execute(); })) return false;
class VEXG_EXPORT Thread {
 public:
  Thread() = default;
  ~Thread();
  Thread(const Thread&) = delete;
  Thread& operator=(const Thread&) = delete;

  /// Runs `body` on a new thread.
  /// @return false, and `body` never runs, when the system gives no thread.
  bool Start(std::function<void()> body);

 private:
  std::thread thread_;
};

/// The body of a thread that serves for long. StartThread runs it and keeps it alive meanwhile.
///
///     class Ticker final : public SimpleThread {
///       void Run() override {
///         SetRunning();
///         while (!StopRequested()) Tick();
///       }
///     };
///     const SimpleThreadPtr ticker(new Ticker);
///     if (StartThread(ticker)) ticker->WaitRunning();
///     …
///     ticker->RequestStop();
///     ticker->WaitEnded();
class VEXG_EXPORT SimpleThread {
 public:
  using PointerRoot = SimpleThread;

  virtual ~SimpleThread() = default;

  /// The work. It begins with SetRunning and looks at StopRequested where it can end.
  virtual void Run() = 0;

  /// Asks Run to end; it only goes one way.
  void RequestStop() { stopRequested_ = true; }
  /// True once RequestStop was called, on whichever thread.
  bool StopRequested() const { return stopRequested_; }

  /// True from the start of Run until it has returned.
  bool IsRunning() const { return running_; }

  /// Blocks until Run has set the running flag, or has ended without.
  void WaitRunning() const;
  /// Blocks until the thread has left Run.
  void WaitEnded() const;

 protected:
  /// Wakes those in WaitRunning: the thread is ready to serve.
  void SetRunning();

 private:
  friend VEXG_EXPORT bool StartThread(const Pointer<SimpleThread>& thread);
  void End();

  std::atomic<bool> stopRequested_{false};
  std::atomic<bool> running_{false};
  std::atomic<unsigned> phase_{0};  // 0 before Run, 1 once it is running, 2 when it has returned
};

using SimpleThreadPtr = Pointer<SimpleThread>;

/// Runs `thread->Run()` on a detached thread, which holds a Pointer to it until Run has returned.
/// @return false, with Run never called, when the system gives no thread.
VEXG_EXPORT bool StartThread(const SimpleThreadPtr& thread);

/// A queue between threads, first in, first out and without a bound. Any number of threads may put
/// items in and take them out; one waiter wakes for each item.
template <typename T>
class MTQueue {
 public:
  /// Puts a copy at the end, and wakes one that waits.
  void Push(const T& item) {
    {
      const std::lock_guard lock(mutex_);
      items_.push_back(item);
    }
    filled_.notify_one();
  }

  /// Blocks until there is an item, and takes it.
  void Pop(T& item) {
    std::unique_lock lock(mutex_);
    filled_.wait(lock, [this] { return !items_.empty(); });
    item = items_.front();
    items_.pop_front();
  }

  /// Takes an item when there is one, without waiting.
  bool TryPop(T& item) {
    const std::lock_guard lock(mutex_);
    if (items_.empty()) return false;
    item = items_.front();
    items_.pop_front();
    return true;
  }

 private:
  std::mutex mutex_;
  std::condition_variable filled_;
  std::deque<T> items_;
};

}  // namespace lumo
