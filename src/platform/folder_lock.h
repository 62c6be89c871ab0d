#pragma once

#include <memory>
#include <string>

#include "platform/export.h"

namespace lumo::platform {

class FileDescriptor;

/// Holds a folder for those who change the files beside a raster: one at a time, in this process
/// and in others, reads what a file says by now, and puts another file in its place.
///
/// It is held while little is written, never over a computation, and not twice on one thread. The
/// system lets go of it when a process ends. Where a folder can't be locked, as on some network
/// file systems, there is no order between programs.
///
///     const FolderLock lock(path);
///     if (!lock.IsHeld(&fault)) return false;
///     …  // read what is there by now, change it, replace the file
class VEXG_EXPORT FolderLock {
 public:
  /// Waits for the lock on the folder that `path` lies in, up to half a minute.
  explicit FolderLock(const std::string& path);
  ~FolderLock();
  FolderLock(const FolderLock&) = delete;
  FolderLock& operator=(const FolderLock&) = delete;

  /// False when somebody else has held the folder all the time; one line in `fault`, unless null.
  bool IsHeld(std::string* fault = nullptr) const;

 private:
  const std::string path_;
  std::unique_ptr<FileDescriptor> folder_;
  bool isHeld_ = true;
};

}  // namespace lumo::platform
