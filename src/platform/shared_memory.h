#pragma once

#include <cstddef>
#include <memory>
#include <string>

#include "platform/export.h"

namespace lumo::platform {

class MemoryGuard;

/// A mapped view of a block of named memory. It stands in the system's table of names (on Linux
/// /dev/shm), where a block is found by its name without a leading slash.
///
/// Another process may make the block shorter at any moment. Its bytes are zeros then, which nobody
/// else sees, and WasCut() is true; the process lives on.
///
/// Threads: the bytes are shared with other processes; access to them is the user's to order.
class VEXG_EXPORT SharedMemoryBlock {
 public:
  /// Opens a block that exists, for reading and writing.
  /// @param name  UTF-8; 1 to 255 bytes, without "/" or NUL.
  /// @param size  bytes that the block has at least, 1 or more.
  /// @param used  its first bytes that are mapped, and memory had for; all of `size` when 0.
  /// @return null when there is no such block, it belongs to another user, it is smaller than
  ///         `size`, memory for the used bytes can't be had, or they can't be mapped.
  static std::unique_ptr<SharedMemoryBlock> Open(const std::string& name, std::size_t size,
                                                 std::size_t used = 0);

  /// Makes a block of zeros that only this user can open, and removes its name when destroyed.
  /// @return null when the name is taken or not allowed, or memory is short.
  static std::unique_ptr<SharedMemoryBlock> Create(const std::string& name, std::size_t size);

  ~SharedMemoryBlock();
  SharedMemoryBlock(const SharedMemoryBlock&) = delete;
  SharedMemoryBlock& operator=(const SharedMemoryBlock&) = delete;

  /// The first byte of the view.
  unsigned char* GetData() const { return data_; }
  /// Bytes of the block, as it was opened or made.
  std::size_t GetSize() const { return size_; }

  /// True once bytes of the block were asked for that it doesn't have any more.
  bool WasCut() const;

 private:
  SharedMemoryBlock(unsigned char* data, std::size_t size, std::string ownedPath);

  unsigned char* data_;
  std::size_t size_;
  std::string ownedPath_;  // removed at the end; empty for a block of somebody else
  std::unique_ptr<MemoryGuard> guard_;
};

/// Takes away the names of all blocks that this process has made, for a process that ends in the
/// middle of its work.
VEXG_EXPORT void RemoveOwnSharedMemory();

}  // namespace lumo::platform
