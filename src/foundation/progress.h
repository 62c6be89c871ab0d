#pragma once

#include "foundation/array.h"
#include "foundation/locks.h"
#include "foundation/run_controls.h"

namespace lumo {

/// One stage's share of a parent report: Update(v) reports v * weight / divisor above what the
/// parent had reached when this was made. For `n` equal stages, one is made at the start of each
/// stage with `n` as divisor. For example, three passes over a raster, each of which reports 0 to
/// 1:
///
///     for (const Pass& pass : passes) {
///       pass.Run(IPC(ipc.abort, ProgressReportPtr(new ScaledProgressReport(ipc.progress, 3))));
///     }
class VEXG_EXPORT ScaledProgressReport : public ProgressReport {
 public:
  /// @param parent    may be empty; then only the callback hears.
  /// @param divisor   not 0; the number of equal stages.
  /// @param weight    how many of them this report covers.
  /// @param callback  hears the parent's scale, not this stage's; may be empty.
  ScaledProgressReport(const ProgressReportPtr& parent, double divisor, double weight = 1.0,
                       const AsyncCallbackPtr& callback = {});
  /// @param progress  of this stage, 0 to 1.
  void Update(double progress) override;
  /// Progress of the parent; 0 without one.
  double GetProgress() const override;

 private:
  ProgressReportPtr parent_;
  double base_;
  double divisor_;
  double weight_;
};

class ConcurrentProgressReport;

/// One slot of a ConcurrentProgressReport: keeps its value and has the mean reported anew.
class VEXG_EXPORT ConcurrentProgressReportCallback : public StandardProgressReport {
 public:
  /// @param progress  of the piece of work that has the slot, 0 to 1.
  void Update(double progress) override;

 private:
  friend class ConcurrentProgressReport;
  ConcurrentProgressReport* owner_ = nullptr;
};

/// Divides one report over pieces of work that go on at the same time: what is reported is the mean
/// over the slots, one for each piece.
///
/// Ownership: owns its slots; a ProgressReportPtr to one must not outlive it.
/// Threads:   any number of threads may update slots. The target is updated under a lock, so that
///            the mean never goes back while no slot does. An observer that is called meanwhile
///            must not wait for another thread's update.
class VEXG_EXPORT ConcurrentProgressReport {
 public:
  /// @param target    receives the mean; may be empty.
  /// @param callback  hears the mean, before the target does; may be empty.
  /// @param slots     pieces of work, 1 or more.
  ConcurrentProgressReport(const ProgressReportPtr& target, const AsyncCallbackPtr& callback,
                           unsigned slots);
  ConcurrentProgressReport(const ConcurrentProgressReport&) = delete;
  ConcurrentProgressReport& operator=(const ConcurrentProgressReport&) = delete;

  /// The report of piece `index`, from 0, which has to be below the number of slots.
  ProgressReportPtr GetSlot(unsigned index);

 private:
  friend class ConcurrentProgressReportCallback;
  void SlotUpdated();

  Lockable mutex_;
  AsyncCallbackPtr callback_;
  ProgressReportPtr target_;
  Array<ConcurrentProgressReportCallback> slots_;
};

}  // namespace lumo
