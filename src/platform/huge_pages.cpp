#include "platform/huge_pages.h"

#include <new>
#include <sys/mman.h>

namespace lumo::platform {
namespace {

constexpr std::size_t kPage = std::size_t{2} << 20U;

/// Small arrays stay in small pages, which are all used.
std::align_val_t AlignmentOf(std::size_t bytes) {
  constexpr std::size_t kCacheLine = 64;
  return std::align_val_t{bytes >= 2 * kPage ? kPage : kCacheLine};
}

}  // namespace

void* AllocateHuge(std::size_t bytes) {
  void* const memory = ::operator new(bytes, AlignmentOf(bytes));
  if (bytes >= 2 * kPage) madvise(memory, bytes, MADV_HUGEPAGE);  // a wish; it may stay one
  return memory;
}

void FreeHuge(void* memory, std::size_t bytes) {
  ::operator delete(memory, AlignmentOf(bytes));
}

}  // namespace lumo::platform
