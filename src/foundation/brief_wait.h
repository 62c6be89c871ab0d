#pragma once

#include <chrono>
#include <thread>

namespace lumo {

/// Looks at a condition for a few tens of microseconds before the caller blocks for it. To wake a
/// thread costs about as long, more on a virtual machine, so an answer that comes at once is had in
/// a third of the time. On a machine of one processor it doesn't wait.
///
/// @param isMet  is called without a lock, many times.
/// @return true once `isMet` has given true.
template <typename Condition>
bool WaitBriefly(const Condition& isMet) {
  using Clock = std::chrono::steady_clock;
  constexpr std::chrono::microseconds kMost{30};
  constexpr int kLooks = 64;  // between two looks at the clock
  static const bool hasOthers = std::thread::hardware_concurrency() > 1;
  if (!hasOthers) return isMet();
  const Clock::time_point end = Clock::now() + kMost;
  do {
    for (int i = 0; i < kLooks; ++i) {
      if (isMet()) return true;
#if defined(__x86_64__)
      __builtin_ia32_pause();
#endif
    }
    std::this_thread::yield();  // to the one that is waited for, where it has no other processor
  } while (Clock::now() < end);
  return isMet();
}

}  // namespace lumo
