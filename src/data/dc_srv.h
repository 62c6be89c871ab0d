#pragma once

#include <atomic>
#include <condition_variable>
#include <mutex>
#include <string>
#include <vector>

#include "data/data_connection.h"
#include "foundation/thread.h"
#include "platform/process.h"

namespace lumo {

/// Holds what lives on the thread of a source: the one connection of the plug-in.
struct DcSrvContext {
  bool exit = false;       ///< the thread is to end
  DataConnectionPtr conn;  ///< empty while nothing is open
};

/// A call into a source, handed to the source's thread and waited for. It lives on the stack of the
/// caller.
class VEXG_EXPORT DcSrvCmd {
 public:
  /// @param name  outlives the command.
  DcSrvCmd(std::int32_t code, const char* name) : code_(code), name_(name) {}
  virtual ~DcSrvCmd() = default;

  /// The call; runs on the source's thread.
  virtual void Execute(DcSrvContext& context) = 0;

  /// The number of the operation, for logs.
  std::int32_t Code() const { return code_; }
  /// The name of the operation, for people.
  const char* Name() const { return name_; }

 private:
  friend class DcSrv;

  const std::int32_t code_;
  const char* const name_;
  std::mutex mutex_;
  std::condition_variable replied_;
  std::atomic<bool> done_{false};  // the reply
  bool abandons_ = false;          // as the thread that it works for
  String fault_;                   // the fault text that was set while the thread ran this
  std::vector<std::string> warnings_;
};

/// The thread of one open source, and the queue by which calls reach it. All calls into a plug-in's
/// connection run here, one at a time and in the order of the queue.
///
/// Threads: any number of threads may Execute. A plug-in that is being called must not wait for its
///          own source: that call would queue behind the running one for ever. A process that was
///          forked afterwards doesn't have the thread: there each call fails with a fault.
/// Cost: a call is two changes of threads. CallServer and CallConnection wrap it.
class VEXG_EXPORT DcSrv : public ErrorState {
 public:
  /// Starts the thread unless it runs. False, with DcSrvErrorNoThread stored, when the system gives
  /// none.
  bool Start();

  /// Ends the thread: its connection and its data manager are gone when this returns. False when
  /// there is no thread, or when this process was forked after its start.
  bool Stop();

  /// Runs `cmd` on the thread and waits for it. An exception out of the plug-in ends there. The
  /// fault text and the warnings of the call become this thread's. Where this process was forked
  /// after Start, `cmd` isn't run and the fault text says so. Start must have succeeded.
  void Execute(DcSrvCmd& cmd);

 private:
  bool IsElsewhere() const;
  static void Serve(MTQueue<DcSrvCmd*>& queue);
  static void Run(DcSrvCmd& cmd, DcSrvContext& context);
  static void Reply(DcSrvCmd& cmd);

  std::unique_ptr<MTQueue<DcSrvCmd*>> queue_ = std::make_unique<MTQueue<DcSrvCmd*>>();
  std::unique_ptr<Thread> thread_;
  std::atomic<unsigned> callers_{0};         // in Execute
  int process_ = platform::ProcessNumber();  // the one that the thread runs in
  std::mutex mutex_;                         // guards the start and the stop
};

}  // namespace lumo
