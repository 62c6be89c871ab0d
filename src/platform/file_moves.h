#pragma once

#include <string>

#include "platform/export.h"

namespace lumo::platform {

// Moves of files within one file system. Failure: false, and one line in `fault`, where that isn't
// null: "path: what"; errno holds the system's number. Nothing has moved then.

/// Gives the file `from` the path `to`, in place of the file that stood there.
VEXG_EXPORT bool RenameFile(const std::string& from, const std::string& to,
                            std::string* fault = nullptr);

/// Gives the file `from` the path `to`, where there is nothing: two that do it at once can't both
/// succeed. Fails with EEXIST where there is something.
VEXG_EXPORT bool RenameToNew(const std::string& from, const std::string& to,
                             std::string* fault = nullptr);

/// Lets two files change places in one step.
VEXG_EXPORT bool ExchangeFiles(const std::string& a, const std::string& b,
                               std::string* fault = nullptr);

/// Returns when the content of a file, or the entries of a folder, are on the disk.
VEXG_EXPORT bool SyncPath(const std::string& path, std::string* fault = nullptr);

}  // namespace lumo::platform
