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

std::string LocalDateText() {
  const time_t now = time(nullptr);
  tm local{};
  localtime_r(&now, &local);
  char text[64] = {};  // a year beyond four digits fits
  if (asctime_r(&local, text) == nullptr) return {};
  const std::string date(text);
  return date.substr(0, date.find('\n'));
}

}  // namespace lumo::platform
