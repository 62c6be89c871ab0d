#include "foundation/progress.h"

namespace lumo {

ScaledProgressReport::ScaledProgressReport(const ProgressReportPtr& parent, double divisor,
                                           double weight, const AsyncCallbackPtr& callback)
    : ProgressReport(callback),
      parent_(parent),
      base_(parent.IsNull() ? 0.0 : parent->GetProgress()),
      divisor_(divisor),
      weight_(weight) {}

void ScaledProgressReport::Update(double progress) {
  const double scaled = progress * weight_ / divisor_ + base_;
  Tell(scaled);
  if (!parent_.IsNull()) parent_->Update(scaled);
}

double ScaledProgressReport::GetProgress() const {
  return parent_.IsNull() ? 0.0 : parent_->GetProgress();
}

void ConcurrentProgressReportCallback::Update(double progress) {
  StandardProgressReport::Update(progress);
  if (owner_ != nullptr) owner_->SlotUpdated();
}

ConcurrentProgressReport::ConcurrentProgressReport(const ProgressReportPtr& target,
                                                   const AsyncCallbackPtr& callback, unsigned slots)
    : callback_(callback), target_(target), slots_(ArrayDims(slots)) {
  for (auto& slot : slots_) slot.owner_ = this;
}

ProgressReportPtr ConcurrentProgressReport::GetSlot(unsigned index) {
  return ProgressReportPtr(&slots_[index], true);
}

void ConcurrentProgressReport::SlotUpdated() {
  const MutexLock lock = mutex_.Lock();
  if (target_.IsNull()) return;
  double sum = 0.0;
  for (const auto& slot : slots_) sum += slot.GetProgress();
  const double mean = sum / slots_.GetCount();
  if (!callback_.IsNull()) callback_->OnProgress(mean);
  target_->Update(mean);
}

}  // namespace lumo
