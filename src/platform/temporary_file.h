#pragma once

#include <string>
#include <vector>

#include "platform/export.h"

namespace lumo::platform {

// Names of files and folders that a process makes beside the place that they are to take. The name
// says which process they belong to, which separates the remains of a killed one from the work of a
// running one.

/// A path beside `path` that nobody else uses, for a file that is to take its place.
VEXG_EXPORT std::string TemporaryPathBeside(const std::string& path);

/// The same for a folder, whose name is hidden.
VEXG_EXPORT std::string TemporaryFolderBeside(const std::string& path);

/// True when `folder` is one right inside `place` that TemporaryFolderBeside has named.
VEXG_EXPORT bool IsTemporaryFolderIn(const std::string& folder, const std::string& place);
/// `text` with the names made here replaced by those of the files that they stand for, which alone
/// mean something to a user.
VEXG_EXPORT std::string WithoutTemporaryNames(std::string text);

/// Removes the files that TemporaryPathBeside named for `path` in a process of this machine that
/// has ended. Those of other machines, and what can't be removed, stay.
VEXG_EXPORT void RemoveAbandonedFiles(const std::string& path);

/// Removes the files that TemporaryPathBeside named for `path` in this process, for a process that
/// ends in the middle of its work.
VEXG_EXPORT void RemoveOwnFiles(const std::string& path);

/// The folders that TemporaryFolderBeside named for `path` in processes of this machine that have
/// ended.
VEXG_EXPORT std::vector<std::string> FindAbandonedFolders(const std::string& path);

}  // namespace lumo::platform
