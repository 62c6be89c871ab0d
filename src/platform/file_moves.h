#pragma once

#include <string>

#include "platform/export.h"

namespace lumo::platform {

// Moves of files within one file system. Failure: false, and one line in `fault`, where that isn't
// null: "path: what"; errno holds the system's number. Nothing has moved then.

/// Whether a move is on the disk when it returns, with the content of the file: where files are
/// durable (durability.h), or never, as the caller sees to it.
enum class MoveSync { kWhereDurable, kByCaller };

/// Gives the file `from` the path `to`, in place of the file that stood there.
VEXG_EXPORT bool RenameFile(const std::string& from, const std::string& to,
                            std::string* fault = nullptr);

/// Gives the file `from` the path `to`, where there is nothing: two that do it at once can't both
/// succeed. Fails with EEXIST where there is something.
VEXG_EXPORT bool RenameToNew(const std::string& from, const std::string& to,
                             std::string* fault = nullptr, MoveSync sync = MoveSync::kWhereDurable);

/// Lets two files change places in one step. Where files are durable, the content of `a` and the
/// folder of `b` are on the disk then.
VEXG_EXPORT bool ExchangeFiles(const std::string& a, const std::string& b,
                               std::string* fault = nullptr);

/// Returns when the content of a file, or the entries of a folder, are on the disk.
VEXG_EXPORT bool SyncPath(const std::string& path, std::string* fault = nullptr);

}  // namespace lumo::platform
