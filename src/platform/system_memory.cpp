#include "platform/system_memory.h"

#include <array>
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

void GrowHeap(std::size_t bytes) {
#ifdef __GLIBC__
  constexpr std::size_t kPiece = 120 << 10;  // just not large enough for pages of its own
  std::array<void*, (8 << 20) / kPiece> pieces{};
  std::size_t count = 0;
  while (count < pieces.size() && count * kPiece < bytes) {
    pieces[count] = std::malloc(kPiece);
    if (pieces[count] == nullptr) break;
    ++count;
  }
  while (count > 0) std::free(pieces[--count]);
#else
  static_cast<void>(bytes);
#endif
}

}  // namespace lumo::platform
