#pragma once

#include <chrono>
#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>
#include <utility>

#include "foundation/fault.h"
#include "foundation/run_controls.h"
#include "foundation/thread.h"
#include "foundation/thrown.h"

namespace lumo {

/// Runs a call that may block for ever, as the opening of a file does, so that an abort ends the
/// wait for it: the call runs on a thread of its own, and whoever asked goes on without it when the
/// flag is raised. A result that comes after that is dropped on the call's thread, whenever that
/// is.
///
/// The flag may lie in memory of another process, which can't wake anybody, so it is looked at
/// every 20 ms. Where no thread can be had the call runs on this one, and can't be given up.
///
///     std::string text;
///     const bool read = RunAbortable<std::string>(
///         *ipc.abort, [path] { return ReadAll(path); }, text);  // `path` is copied into the call
///
/// @param call    holds copies of all that it uses. An exception of it gives no result.
/// @param result  [out] the call's result, or a default one after an exception; unchanged when the
///             wait was given up. The call's fault text becomes this thread's.
/// @return false when the wait was given up.
template <typename Result>
bool RunAbortable(const AbortFlag& abort, std::function<Result()> call, Result& result) {
  struct Shared {
    std::mutex mutex;
    std::condition_variable ended;
    bool done = false;
    Result result{};
    String fault;
  };
  const auto shared = std::make_shared<Shared>();
  const auto run = [shared, call = std::move(call)] {
    Result made{};
    String fault;
    try {
      TakeFault();
      made = call();
    } catch (...) {
      NoteException();  // the caller sees that there is no result
    }
    fault = TakeFault();
    const std::lock_guard lock(shared->mutex);
    std::swap(shared->result, made);  // what the caller takes is the caller's alone
    shared->fault = std::move(fault);
    shared->done = true;
    shared->ended.notify_all();
  };
  if (!Thread().Start(run)) run();  // then it can't be given up

  constexpr auto kLook = std::chrono::milliseconds(20);
  std::unique_lock lock(shared->mutex);
  while (!shared->ended.wait_for(lock, kLook, [&] { return shared->done; })) {
    if (abort.IsSet()) return false;
  }
  result = std::exchange(shared->result, Result{});  // the thread may let go of its share later
  if (shared->fault.GetLength() != 0) SetFault(shared->fault);
  return true;
}

}  // namespace lumo
