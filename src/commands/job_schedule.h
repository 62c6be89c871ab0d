#pragma once

#include <functional>
#include <queue>
#include <vector>

#include "commands/job.h"

namespace lumo {

/// Chooses the command of a job that may start next: one whose dependencies have all retired, the
/// first in the document first. Each step costs as much as the dependencies that it resolves, so
/// that a run is linear in the job. Threads: used under one lock.
class JobSchedule {
 public:
  /// Numbers the commands of `job`, none of which has begun.
  explicit JobSchedule(Job& job);

  /// The next command that may start, its state set to started; null when none may now.
  CommandDescriptor* TakeReady();

  /// Notes that a command of the job has retired.
  void Retire(const CommandDescriptor& descriptor);

  /// True when a command may start now.
  bool HasReady() const { return !ready_.empty(); }
  /// True when every command was handed out.
  bool AllStarted() const { return started_ == steps_.size(); }
  /// True when every command has retired: the run is at its end.
  bool AllRetired() const { return retired_ == steps_.size(); }

 private:
  struct Step {
    CommandDescriptor* descriptor = nullptr;
    unsigned waitsFor = 0;  ///< commands, or first parts of the job, to retire
    bool isRetired = false;
    std::vector<unsigned> holdsUp;     ///< positions of the steps that wait for this one
    std::vector<unsigned> holdsUpAll;  ///< of those that wait for all up to this one
  };

  void Release(const std::vector<unsigned>& positions);

  std::vector<Step> steps_;
  std::priority_queue<unsigned, std::vector<unsigned>, std::greater<>> ready_;  // positions
  std::size_t started_ = 0;
  std::size_t retired_ = 0;
  std::size_t front_ = 0;  // steps before it have all retired
};

}  // namespace lumo
