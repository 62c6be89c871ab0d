#include "platform/system_memory.h"

#include <cstdlib>
#include <limits>
#include <unistd.h>
#ifdef __GLIBC__
#include <malloc.h>
#endif

namespace lumo::platform {

std::uint64_t GetMemoryOfMachine() {
  const long pages = sysconf(_SC_PHYS_PAGES), bytes = sysconf(_SC_PAGESIZE);
  if (pages <= 0 || bytes <= 0) return std::numeric_limits<std::uint64_t>::max();
  return static_cast<std::uint64_t>(pages) * static_cast<std::uint64_t>(bytes);
}

void ReturnFreeMemory() {
#ifdef __GLIBC__
  malloc_trim(0);
#endif
}

}  // namespace lumo::platform
