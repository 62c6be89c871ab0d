#include "platform/zero_memory.h"

#include <algorithm>
#include <atomic>
#include <bit>
#include <mutex>
#include <new>
#include <sys/mman.h>

namespace lumo::platform {
namespace {

/// Names a mapping of zeros, and the smaller ones that were made before, which may be in use.
struct Zeros {
  const unsigned char* begin;
  std::size_t bytes;
  const Zeros* older;
};

std::atomic<const Zeros*> latest{nullptr};

}  // namespace

const unsigned char* GetZeros(std::size_t bytes) {
  const Zeros* known = latest.load(std::memory_order_acquire);
  if (known != nullptr && known->bytes >= bytes) return known->begin;
  constexpr std::size_t kLeast = std::size_t{16} << 20U, kMost = std::size_t{1} << 40U;
  if (bytes > kMost) return nullptr;
  static std::mutex lock;
  const std::lock_guard locked(lock);
  known = latest.load(std::memory_order_acquire);
  if (known != nullptr && known->bytes >= bytes) return known->begin;
  const std::size_t size = std::max(kLeast, std::bit_ceil(bytes));
  // All of its pages are the one page of zeros that the system has, as long as nobody writes. Large
  // pages would be memory, and would not stay in a first cache.
  void* const memory =
      mmap(nullptr, size, PROT_READ, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0);
  if (memory == MAP_FAILED) return nullptr;
  madvise(memory, size, MADV_NOHUGEPAGE);  // a wish; it may stay one
  const auto* const begin = static_cast<const unsigned char*>(memory);
  const auto* const made = new (std::nothrow) Zeros{begin, size, known};
  if (made == nullptr) {
    munmap(memory, size);
    return nullptr;
  }
  latest.store(made, std::memory_order_release);
  return begin;
}

bool AreZeros(const unsigned char* bytes) {
  for (const Zeros* zeros = latest.load(std::memory_order_acquire); zeros != nullptr;
       zeros = zeros->older) {
    if (bytes >= zeros->begin && bytes < zeros->begin + zeros->bytes) return true;
  }
  return false;
}

}  // namespace lumo::platform
