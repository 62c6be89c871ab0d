#include "tasks/process_builder.h"

namespace lumo {

template <typename P>
ProcessBuilder<P>::ProcessBuilder(const String& name, const IPC& ipc,
                                  const AsyncCallbackPtr& callback)
    : Async(ipc, callback), process_(name, ipc) {}

template <typename P>
bool ProcessBuilder<P>::RunProcess(unsigned mode) {
  if (!built_) return false;
  runMode_ = mode;
  if (mode != kInBackground) return SubmitAsync(AsyncPtr(this, true), false);
  const AsyncPtr self = AsyncPtr::ShareOwner(*this);
  return !self.IsNull() && SubmitAsync(self, true);
}

template <typename P>
void ProcessBuilder<P>::Execute() {
  SetProgress(0.0);
  const bool ran = process_.Run(args_);
  SetProgress(1.0);
  if (!ran) SetErrorState(AsyncErrorExecuteFailed());
}

template class ProcessBuilder<Process>;

}  // namespace lumo
