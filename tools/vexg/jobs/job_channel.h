#pragma once

#include <memory>

#include "commands/xml.h"
#include "foundation/run_controls.h"
#include "platform/shared_memory.h"

namespace lumo::host {

/// The channel through which a job that runs in another process is watched and aborted.
class JobChannel {
 public:
  /// One in memory of this program's own. When the system gives none, the job runs unwatched.
  JobChannel();
  /// The one that an element of a document names.
  explicit JobChannel(const XMLElement& element);

  /// Names a channel of this program's own in a job; nothing when there is none.
  void AddTo(XMLElement& job) const;

  void Abort();
  /// True once somebody, at either end, has raised the abort flag.
  bool IsAborted() const { return !watched_.IsNull() && watched_->abort->IsSet(); }
  ProgressReportPtr GetProgress() const;

 private:
  std::string name_;
  std::unique_ptr<platform::SharedMemoryBlock> block_;
  IPCPtr watched_;
};

}  // namespace lumo::host
