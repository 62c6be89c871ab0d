#pragma once

#include "foundation/array.h"
#include "foundation/locks.h"
#include "foundation/run_controls.h"

namespace lumo {

/// One stage's share of a parent report: Update(v) reports v * weight / divisor above what the
/// parent had reached when this was made. For `n` equal stages, one is made at the start of each
/// stage with `n` as divisor.
class VEXG_EXPORT ScaledProgressReport : public ProgressReport {
 public:
  ScaledProgressReport(const ProgressReportPtr& parent, double divisor, double weight = 1.0,
                       const AsyncCallbackPtr& callback = {});
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
  /// @param callback  is told the mean; may be empty.
  ConcurrentProgressReport(const ProgressReportPtr& target, const AsyncCallbackPtr& callback,
                           unsigned slots);
  ConcurrentProgressReport(const ConcurrentProgressReport&) = delete;
  ConcurrentProgressReport& operator=(const ConcurrentProgressReport&) = delete;

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
