#include "platform/clock.h"

#include <time.h>

namespace lumo::platform {
namespace {

double ReadClock(clockid_t clock) {
  timespec now{};
  clock_gettime(clock, &now);
  return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) * 1e-9;
}

}  // namespace

double MonotonicSeconds() {
  return ReadClock(CLOCK_MONOTONIC);
}

double ProcessCpuSeconds() {
  return ReadClock(CLOCK_PROCESS_CPUTIME_ID);
}

}  // namespace lumo::platform
