#pragma once

#include <string>
#include <vector>

#include "platform/export.h"

namespace lumo::platform {

/// Folders and files that a process keeps to, with all that lies in them.
struct FileFence {
  std::vector<std::string> writable;  ///< may be read, changed, made and removed
  std::vector<std::string> readable;  ///< may be read, and loaded as libraries
  bool network = true;                ///< TCP connections may be made
};

/// Has the system itself keep the calling thread, and all threads that it starts from now on, to
/// `fence`, whatever opens the files. There is no way back. A path that isn't there is left out.
/// Beyond the fence stay what is open already, the named memory of other processes, the folder of
/// the pipes, and what a loaded library of the system needs: programs' shared files, numbers of the
/// machine and the devices null and urandom.
/// @param fault  takes one line when it can't be done, and nothing has changed then. That the
///               process has other threads, which the fence does not hold, counts as such.
VEXG_EXPORT bool RaiseFileFence(const FileFence& fence, std::string& fault);

}  // namespace lumo::platform
