#pragma once

#include "foundation/run_controls.h"

namespace lumo {

/// The progress of one step of a longer work, from 0 to 1, that goes into a report with its share.
/// Unlike a ScaledProgressReport it tells its own value, so that steps of steps can be made of it.
class StepProgress final : public StandardProgressReport {
 public:
  /// @param whole  continues from where it stands.
  /// @param share  of the whole, 0 to 1.
  StepProgress(const ProgressReportPtr& whole, double share)
      : whole_(whole), base_(whole->GetProgress()), share_(share) {}

  void Update(double progress) override {
    StandardProgressReport::Update(progress);
    whole_->Update(base_ + share_ * progress);
  }

 private:
  ProgressReportPtr whole_;
  const double base_;
  const double share_;
};

/// The run controls of a step: the same abort flag, and a StepProgress.
inline IPC StepOf(const IPC& ipc, double share) {
  return {ipc.abort, ProgressReportPtr(new StepProgress(ipc.progress, share))};
}

}  // namespace lumo
