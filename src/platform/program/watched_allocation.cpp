// Part of a program, not of the library: notes every allocation of the process that fails.
//
// A program's own malloc comes before all others, so that every library calls it. It hands each
// call on to the next one, which is that of a preloaded library or of the C library, and only looks
// at the answer. Sanitizers have an allocator of their own, which is left alone.

#include <cerrno>
#include <cstddef>

#include "platform/memory_shortage.h"

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)

#include <atomic>
#include <dlfcn.h>

namespace {

/// A request beyond this comes from a size that makes no sense, out of a damaged file for example.
/// Whoever made it says so; memory isn't short for that.
constexpr std::size_t kMostOfSense = std::size_t{1} << 30;

template <typename Function>
class Next {
 public:
  explicit constexpr Next(const char* name) : name_(name) {}

  /// The function of that name behind the program's own.
  Function* Get() {
    Function* found = found_.load(std::memory_order_relaxed);
    if (found == nullptr) {
      found = reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name_));
      found_.store(found, std::memory_order_relaxed);
    }
    return found;
  }

 private:
  const char* const name_;
  std::atomic<Function*> found_{nullptr};
};

constinit Next<void*(std::size_t)> gMalloc("malloc");
constinit Next<void*(std::size_t, std::size_t)> gCalloc("calloc");
constinit Next<void*(void*, std::size_t)> gRealloc("realloc");
constinit Next<void*(std::size_t, std::size_t)> gAlignedAlloc("aligned_alloc");
constinit Next<void*(std::size_t, std::size_t)> gMemalign("memalign");
constinit Next<int(void**, std::size_t, std::size_t)> gPosixMemalign("posix_memalign");

/// Finds all of them before the program begins. Found at their first use they could be looked up
/// while the loader writes down why it failed, and that look-up frees what it writes in.
[[maybe_unused]] const bool gAreFound = [] {
  gMalloc.Get(), gCalloc.Get(), gRealloc.Get();
  gAlignedAlloc.Get(), gMemalign.Get(), gPosixMemalign.Get();
  return true;
}();

void Look(bool isMade, std::size_t bytes) {
  if (!isMade && bytes != 0 && bytes <= kMostOfSense) lumo::platform::NoteMemoryShortage();
}

}  // namespace

extern "C" {

void* malloc(std::size_t bytes) {
  void* const made = gMalloc.Get()(bytes);
  Look(made != nullptr, bytes);
  return made;
}

void* calloc(std::size_t count, std::size_t bytes) {
  void* const made = gCalloc.Get()(count, bytes);
  std::size_t all = 0;
  if (!__builtin_mul_overflow(count, bytes, &all)) Look(made != nullptr, all);
  return made;
}

void* realloc(void* memory, std::size_t bytes) {
  void* const made = gRealloc.Get()(memory, bytes);
  Look(made != nullptr, bytes);
  return made;
}

void* memalign(std::size_t alignment, std::size_t bytes) {
  void* const made = gMemalign.Get()(alignment, bytes);
  Look(made != nullptr, bytes);
  return made;
}

void* aligned_alloc(std::size_t alignment, std::size_t bytes) {
  void* const made = gAlignedAlloc.Get()(alignment, bytes);
  Look(made != nullptr, bytes);
  return made;
}

int posix_memalign(void** memory, std::size_t alignment, std::size_t bytes) {
  const int code = gPosixMemalign.Get()(memory, alignment, bytes);
  Look(code != ENOMEM, bytes);
  return code;
}

}  // extern "C"

#endif
