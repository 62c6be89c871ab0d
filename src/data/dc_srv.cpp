#include "data/dc_srv.h"

#include "data/data_errors.h"
#include "data/data_manager.h"
#include "foundation/abandonment.h"
#include "foundation/brief_wait.h"
#include "foundation/fault.h"
#include "foundation/thrown.h"
#include "foundation/warnings.h"

namespace lumo {
namespace {

class DcSrvCmdExit final : public DcSrvCmd {
 public:
  DcSrvCmdExit() : DcSrvCmd(0, "DcSrvCmdExit") {}
  void Execute(DcSrvContext& context) override { context.exit = true; }
};

/// Holds the data manager of the thread.
struct LocalManagerScope {
  LocalManagerScope() noexcept {
    try {
      GetLocalDataManager();
    } catch (...) {
      NoteException();
    }
  }
  ~LocalManagerScope() { FreeLocalDataManager(); }
};

}  // namespace

/// True in a process that was forked after the source was made: its thread isn't there, and its
/// locks may be held by threads that aren't either.
bool DcSrv::IsElsewhere() const {
  return process_ != platform::ProcessNumber();
}

bool DcSrv::Start() {
  if (IsElsewhere()) return true;  // each call says why it fails
  const std::lock_guard lock(mutex_);
  if (thread_ != nullptr) return true;
  thread_ = std::make_unique<Thread>();
  if (thread_->Start([this] { Serve(*queue_); })) return true;
  thread_.reset();
  SetErrorState(DcSrvErrorNoThread());
  return false;
}

bool DcSrv::Stop() {
  if (IsElsewhere()) {
    // Nobody is left to be waited for, not even by the end of a condition.
    static_cast<void>(thread_.release());
    static_cast<void>(queue_.release());
    return false;
  }
  const std::lock_guard lock(mutex_);
  if (thread_ == nullptr) return false;
  DcSrvCmdExit exit;
  Execute(exit);
  thread_.reset();
  return true;
}

void DcSrv::Execute(DcSrvCmd& cmd) {
  if (IsElsewhere()) {
    SetFault(std::string(cmd.name_) +
             ": the source was opened before this process was forked; it has to be opened anew");
    return;
  }
  cmd.abandons_ = IsAbandoning();
  const bool isAlone = callers_++ == 0;
  queue_->Push(&cmd);
  // One of many waits for the turns of others, which is long.
  if (isAlone) WaitBriefly([&] { return cmd.done_.load(std::memory_order_relaxed); });
  {
    std::unique_lock lock(cmd.mutex_);  // the thread has let go of the command when this is had
    cmd.replied_.wait(lock, [&] { return cmd.done_.load(); });
  }
  --callers_;
  if (cmd.fault_.GetLength() != 0) SetFault(cmd.fault_);
  for (const std::string& warning : cmd.warnings_) AddWarning(warning);
}

void DcSrv::Serve(MTQueue<DcSrvCmd*>& queue) {
  DcSrvCmd* last = nullptr;
  {
    // Made by the first command that needs one where memory is short now.
    const LocalManagerScope manager;
    DcSrvContext context;
    while (!context.exit) {
      if (!WaitBriefly([&] { return queue.TryPop(last); })) queue.Pop(last);
      Run(*last, context);
      if (!context.exit) Reply(*last);
    }
  }
  Reply(*last);  // nothing of the source is touched after this
}

void DcSrv::Run(DcSrvCmd& cmd, DcSrvContext& context) {
  TakeFault();
  TakeWarnings();
  const AbandonScope abandonment(cmd.abandons_);
  try {
    try {
      cmd.Execute(context);
    } catch (...) {
      SetFault(std::string(cmd.name_) + ": " + DescribeException());
    }
    cmd.fault_ = TakeFault();
    cmd.warnings_ = TakeWarnings();
  } catch (...) {
    NoteException();  // there is no memory for words either; the caller is answered all the same
  }
}

void DcSrv::Reply(DcSrvCmd& cmd) {
  // Notified under the lock: the caller may destroy the command as soon as it is let in.
  const std::lock_guard lock(cmd.mutex_);
  cmd.done_ = true;
  cmd.replied_.notify_one();
}

}  // namespace lumo
