// A library to load before a program (LD_PRELOAD): makes one allocation fail.
//
//   VEXG_ALLOCATIONS_ABOVE   bytes; smaller allocations are not counted
//   VEXG_ALLOCATION_FAILS    the allocation that fails, counted from 1; none when absent
//   VEXG_ALLOCATION_COUNT    a file that gets their number when the program ends
//   VEXG_ALLOCATION_TRACE    a file that gets the addresses of the calls that led to the failure
//
// Operators new of the C++ library allocate by malloc and so fail alike.

#include <atomic>
#include <cerrno>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <execinfo.h>
#include <fcntl.h>
#include <iterator>
#include <unistd.h>

extern "C" {
void* __libc_malloc(std::size_t bytes);
void* __libc_calloc(std::size_t count, std::size_t bytes);
void* __libc_realloc(void* memory, std::size_t bytes);
void* __libc_memalign(std::size_t alignment, std::size_t bytes);
}

namespace {

std::atomic<unsigned long> gCount{0};

unsigned long NumberFrom(const char* variable, unsigned long otherwise) {
  const char* const text = std::getenv(variable);
  return text != nullptr ? std::strtoul(text, nullptr, 10) : otherwise;
}

/// Writes who asked for the allocation that fails.
void Trace() {
  const char* const file = std::getenv("VEXG_ALLOCATION_TRACE");
  if (file == nullptr) return;
  const int descriptor = open(file, O_WRONLY | O_CREAT | O_TRUNC, 0600);
  if (descriptor < 0) return;
  void* calls[48];
  backtrace_symbols_fd(calls, backtrace(calls, std::size(calls)), descriptor);
  close(descriptor);
}

/// Whether this allocation is the one that fails.
bool Fails(std::size_t bytes) {
  static const unsigned long above = NumberFrom("VEXG_ALLOCATIONS_ABOVE", 0);
  static const unsigned long nth = NumberFrom("VEXG_ALLOCATION_FAILS", 0);
  if (bytes < above) return false;
  if (++gCount != nth) return false;
  Trace();
  errno = ENOMEM;
  return true;
}

/// Writes the count when the program ends.
struct CountAtEnd {
  ~CountAtEnd() {
    const char* const file = std::getenv("VEXG_ALLOCATION_COUNT");
    if (file == nullptr) return;
    const int descriptor = open(file, O_WRONLY | O_CREAT | O_TRUNC, 0600);
    if (descriptor < 0) return;
    dprintf(descriptor, "%lu\n", gCount.load());
    close(descriptor);
  }
};
const CountAtEnd gCountAtEnd;

}  // namespace

extern "C" {

__attribute__((visibility("default"))) void* malloc(std::size_t bytes) {
  return Fails(bytes) ? nullptr : __libc_malloc(bytes);
}

__attribute__((visibility("default"))) void* calloc(std::size_t count, std::size_t bytes) {
  return Fails(count * bytes) ? nullptr : __libc_calloc(count, bytes);
}

__attribute__((visibility("default"))) void* realloc(void* memory, std::size_t bytes) {
  return Fails(bytes) ? nullptr : __libc_realloc(memory, bytes);
}

__attribute__((visibility("default"))) void* memalign(std::size_t alignment, std::size_t bytes) {
  return Fails(bytes) ? nullptr : __libc_memalign(alignment, bytes);
}

__attribute__((visibility("default"))) void* aligned_alloc(std::size_t alignment,
                                                           std::size_t bytes) {
  return memalign(alignment, bytes);
}

__attribute__((visibility("default"))) int posix_memalign(void** memory, std::size_t alignment,
                                                          std::size_t bytes) {
  void* const made = memalign(alignment, bytes);
  if (made == nullptr) return ENOMEM;
  *memory = made;
  return 0;
}
}
