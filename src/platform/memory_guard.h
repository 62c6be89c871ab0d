#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>

// A file that is mapped into this process may lose its pages, as when another process makes it
// shorter: the touch of such a page would end the process with a bus error. The guard here keeps it
// alive. For the sources of this folder only.

namespace lumo::platform {

/// Guards a mapping while it lives. When a page of it is touched that the system can't give, zeros
/// of this process's own take the place of the whole mapping, and WasCut() is true.
///
/// The first guard installs a handler for SIGBUS, which passes on what is none of its business.
class MemoryGuard {
 public:
  /// @param data,size  the mapping, from a page's begin on.
  MemoryGuard(void* data, std::size_t size);
  /// Comes before the mapping goes.
  ~MemoryGuard();
  MemoryGuard(const MemoryGuard&) = delete;
  MemoryGuard& operator=(const MemoryGuard&) = delete;

  /// False when the process has too many guards already; the mapping must not be used then.
  bool IsActive() const { return slot_ != nullptr; }
  /// True once a page was touched that the system couldn't give.
  bool WasCut() const;

  /// A place in the table that the handler looks through. A slot with size 0 guards nothing.
  struct Slot {
    std::atomic<bool> taken{false};
    std::atomic<bool> cut{false};
    std::atomic<std::uintptr_t> begin{0};
    std::atomic<std::size_t> size{0};
  };

 private:
  Slot* slot_;
};

}  // namespace lumo::platform
