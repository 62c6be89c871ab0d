#pragma once

#include <string>

#include "jobs/progress_view.h"

namespace lumo::host {

/// Says how a document is run once.
struct OnceRequest {
  std::string document;  ///< its file; with a manifest beside it, as `vexg plan` makes one
  ProgressStyle progress = ProgressStyle::kNone;
  bool quiet = false;
  bool isDurable = false;
};

/// Runs a document unless that is done: its result lies beside it, with the hash of the document
/// and of what it reads, and its outputs are as the result tells.
///
/// Outputs are made under names of their own, and take their places, in turn for older ones, when
/// all commands have succeeded; the result comes last. So a run that was killed leaves nothing that
/// looks done, and of two that make the same one is thrown away.
///
/// @return the exit code. Throws HostError for a document that isn't as it was planned, inputs that
///         have changed, and what it depends on that isn't done.
int RunOnce(const OnceRequest& request);

}  // namespace lumo::host
