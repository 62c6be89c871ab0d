#pragma once

#include <unistd.h>
#include <utility>

namespace lumo::platform {

/// Owns an open file of the system and closes it. For the sources of this folder only.
class FileDescriptor {
 public:
  FileDescriptor() = default;
  /// Takes over an open file of the system.
  explicit FileDescriptor(int descriptor) : descriptor_(descriptor) {}
  FileDescriptor(FileDescriptor&& other) noexcept
      : descriptor_(std::exchange(other.descriptor_, -1)) {}
  FileDescriptor& operator=(FileDescriptor&& other) noexcept {
    std::swap(descriptor_, other.descriptor_);
    return *this;
  }
  ~FileDescriptor() { Close(); }

  /// True while it owns a file.
  bool IsOpen() const { return descriptor_ >= 0; }
  /// The system's number of the file; below 0 for none.
  int Get() const { return descriptor_; }
  /// Hands the file to the caller.
  int Release() { return std::exchange(descriptor_, -1); }
  /// Closes the file now. A failure to close is not seen here.
  void Close() {
    if (descriptor_ >= 0) close(descriptor_);
    descriptor_ = -1;
  }

 private:
  int descriptor_ = -1;
};

}  // namespace lumo::platform
