#include "tasks/engine_arena.h"

#include <oneapi/tbb/task_arena.h>

#include "foundation/library.h"

namespace lumo {
namespace {

/// The place for more threads than there are cores; null where the scheduler's own will do.
tbb::task_arena* MakeLargeArena() {
  const int threads = GetThreadsHint();
  if (threads <= GetProcessingCores()) return nullptr;
  // Whoever brings work finds a seat of his own beside the helpers: a full arena would have the
  // work done by another thread, which does not know whose it is.
  constexpr int kSeats = 256;
  return new tbb::task_arena(threads + kSeats, kSeats);
}

}  // namespace

void RunInEngine(const std::function<void()>& work) {
  static tbb::task_arena* const large = MakeLargeArena();  // stays until the process ends
  if (large != nullptr) {
    large->execute(work);
  } else {
    work();
  }
}

}  // namespace lumo
