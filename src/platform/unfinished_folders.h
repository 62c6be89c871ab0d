#pragma once

#include <string>

namespace lumo::platform {

// The folders in which a program makes its outputs, for the case that it crashes there.

/// Keeps the name of a folder that TemporaryFolderBeside has named; the last few are kept.
void KeepUnfinishedFolder(const std::string& path) noexcept;

/// Removes the kept folders that are still there, with the files in them. One that holds an older
/// output too, which the new one was about to replace, stays for the next run to put back. Only the
/// system is called, so that a handler of a signal may do it.
void RemoveUnfinishedFolders() noexcept;

}  // namespace lumo::platform
