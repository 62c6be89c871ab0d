#include "commands/job_progress.h"

#include <algorithm>
#include <cmath>
#include <numeric>

namespace lumo {

JobProgress::JobProgress(const ProgressReportPtr& target, unsigned commands)
    : target_(target),
      slots_(commands),
      blockSize_(static_cast<std::size_t>(std::ceil(std::sqrt(commands)))) {
  for (Slot& slot : slots_) slot.owner = this;
  if (blockSize_ != 0) sums_.resize((slots_.size() + blockSize_ - 1) / blockSize_);
}

ProgressReportPtr JobProgress::GetSlot(unsigned index) {
  return ProgressReportPtr(&slots_[index], true);
}

void JobProgress::Slot::Update(double progress) {
  StandardProgressReport::Update(progress);
  owner->SlotUpdated(*this);
}

double JobProgress::SumOfBlock(std::size_t block) const {
  const std::size_t first = block * blockSize_;
  const std::size_t end = std::min(first + blockSize_, slots_.size());
  double sum = 0.0;
  for (std::size_t i = first; i < end; ++i) sum += slots_[i].GetProgress();
  return sum;
}

void JobProgress::SlotUpdated(const Slot& slot) {
  const std::lock_guard lock(mutex_);
  if (target_.IsNull()) return;
  const std::size_t block = static_cast<std::size_t>(&slot - slots_.data()) / blockSize_;
  sums_[block] = SumOfBlock(block);
  const double sum = std::accumulate(sums_.begin(), sums_.end(), 0.0);
  target_->Update(sum / static_cast<double>(slots_.size()));
}

}  // namespace lumo
