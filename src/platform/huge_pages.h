#pragma once

#include <cstddef>
#include <new>
#include <utility>

#include "platform/export.h"

namespace lumo::platform {

/// Allocates memory for a large array that is read here and there: in large pages where the system
/// has them, so that the processor finds the places of fewer. Throws std::bad_alloc.
VEXG_EXPORT void* AllocateHuge(std::size_t bytes);
/// Frees memory of AllocateHuge. @param bytes  as they were allocated.
VEXG_EXPORT void FreeHuge(void* memory, std::size_t bytes);

/// Allocates the elements of a container by AllocateHuge.
template <typename T>
struct HugePageAllocator {
  using value_type = T;

  HugePageAllocator() = default;
  template <typename U>
  explicit HugePageAllocator(const HugePageAllocator<U>& /*other*/) {}

  T* allocate(std::size_t count) { return static_cast<T*>(AllocateHuge(count * sizeof(T))); }
  void deallocate(T* memory, std::size_t count) { FreeHuge(memory, count * sizeof(T)); }
  /// Leaves numbers as they are in memory: whoever makes room for them writes them.
  template <typename U>
  void construct(U* element) {
    ::new (static_cast<void*>(element)) U;
  }
  template <typename U, typename... Args>
  void construct(U* element, Args&&... args) {
    ::new (static_cast<void*>(element)) U(std::forward<Args>(args)...);
  }
  friend bool operator==(const HugePageAllocator&, const HugePageAllocator&) { return true; }
};

}  // namespace lumo::platform
