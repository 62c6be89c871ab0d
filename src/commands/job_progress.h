#pragma once

#include <mutex>
#include <vector>

#include "foundation/run_controls.h"

namespace lumo {

/// Divides the report of a job over its commands, and reports their mean. A report costs the same
/// for a job of any size but for its square root, where ConcurrentProgressReport adds up all slots
/// each time.
///
/// Ownership: owns its slots; a ProgressReportPtr to one must not outlive it.
/// Threads:   any number of threads may update slots. The target is updated under a lock, so that
///            the mean never goes back while no slot does.
class JobProgress {
 public:
  /// @param target  receives the mean; may be empty.
  JobProgress(const ProgressReportPtr& target, unsigned commands);
  JobProgress(const JobProgress&) = delete;
  JobProgress& operator=(const JobProgress&) = delete;

  /// The report of command `index`, from 0.
  ProgressReportPtr GetSlot(unsigned index);

 private:
  class Slot final : public StandardProgressReport {
   public:
    void Update(double progress) override;

    JobProgress* owner = nullptr;
  };

  void SlotUpdated(const Slot& slot);
  double SumOfBlock(std::size_t block) const;

  std::mutex mutex_;
  ProgressReportPtr target_;
  std::vector<Slot> slots_;
  std::size_t blockSize_;
  std::vector<double> sums_;  // of the slots of each block
};

}  // namespace lumo
