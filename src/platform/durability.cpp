#include "platform/durability.h"

#include <fcntl.h>

namespace lumo::platform {
namespace {

std::atomic<bool> gIsDurable{false};

}  // namespace

void SetDurable(bool isDurable) {
  gIsDurable = isDurable;
}

bool IsDurable() {
  return gIsDurable;
}

void WriteBack::Count(int descriptor, std::uint64_t bytes) {
  constexpr std::uint64_t kStretch = 8U << 20;
  if (!IsDurable() || (waiting_ += bytes) < kStretch) return;
  waiting_ = 0;
  // It is only a beginning, of all that is not yet on its way: a failure shows in the sync.
  sync_file_range(descriptor, 0, 0, SYNC_FILE_RANGE_WRITE);
}

}  // namespace lumo::platform
