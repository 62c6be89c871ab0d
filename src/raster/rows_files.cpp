#include "raster/rows_files.h"

#include "foundation/fault.h"

namespace lumo {

RowsWatch::Scope::Scope(const std::shared_ptr<RowsWatch>& watch, const IPC& ipc) : watch_(watch) {
  if (watch_ == nullptr) return;
  const std::lock_guard lock(watch_->lock_);
  watch_->ipc_ = &ipc;
}

RowsWatch::Scope::~Scope() {
  if (watch_ == nullptr) return;
  const std::lock_guard lock(watch_->lock_);
  watch_->ipc_ = nullptr;
}

bool RowsWatch::Report(double done) {
  const std::lock_guard lock(lock_);
  if (ipc_ == nullptr) return true;
  ipc_->progress->Update(done);
  if (!ipc_->abort->IsSet()) return true;
  SetFault("the taking of packed blocks was aborted");
  return false;
}

}  // namespace lumo
