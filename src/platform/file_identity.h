#pragma once

#include <cstdint>
#include <string>

#include "platform/export.h"

namespace lumo::platform {

/// Identifies a file and its state, so that it can be distinguished from another one, and from
/// itself after a change.
struct FileIdentity {
  bool exists = false;       ///< there was a file
  std::uint64_t device = 0;  ///< of the file system
  std::uint64_t number = 0;  ///< by which the file system knows it
  std::uint64_t size = 0;    ///< bytes
  std::int64_t time = 0;     ///< of the last change, in ns since 1970

  friend bool operator==(const FileIdentity&, const FileIdentity&) = default;

  /// True for the same file, whatever it holds by now.
  bool IsSameFile(const FileIdentity& other) const {
    return exists && other.exists && device == other.device && number == other.number;
  }
};

/// The identity of the file or folder at `path`, links followed.
VEXG_EXPORT FileIdentity IdentifyFile(const std::string& path);

}  // namespace lumo::platform
