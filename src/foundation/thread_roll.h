#pragma once

#include <condition_variable>
#include <mutex>
#include <set>
#include <thread>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// Keeps the threads that nobody holds any more until they can be joined, so that a program can
/// wait for the very last of each before its static data go.
class ThreadRoll {
 public:
  /// The one of the process.
  static ThreadRoll& Get();

  /// Takes over a thread, which calls Leave as its last act. Joins those that have left.
  void Keep(std::thread thread);

  /// Called on a thread by itself that serves as long as the process lives: nobody waits for it.
  void Stay();

  /// Called on a thread by itself, with nothing of the library to be touched after it.
  void Leave();

  /// See JoinThreads.
  bool Join(double seconds);

  /// Joins the threads that have left, without waiting for others.
  void JoinLeft();

 private:
  std::vector<std::thread> TakeLeft();
  bool AllStay() const;

  std::mutex mutex_;
  std::condition_variable changed_;
  std::vector<std::thread> kept_;
  std::set<std::thread::id> left_;
  std::set<std::thread::id> staying_;
};

/// Waits until the threads that the library has started, and lets run by themselves, have ended: of
/// clients, commands, sources that were closed and work in the background. For the end of a
/// program.
/// @return false when one of them still runs after `seconds`.
VEXG_EXPORT bool JoinThreads(double seconds);

}  // namespace lumo
