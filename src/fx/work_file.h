#pragma once

#include <memory>

#include "platform/random_access_file.h"

namespace lumo {

/// Makes a file without a name for what doesn't stay in memory; see
/// RandomAccessFile::CreateUnnamed. Where the process keeps to some folders it lies in the first of
/// them. Null, with the fault set, when there can be none.
VEXG_EXPORT std::unique_ptr<platform::RandomAccessFile> MakeWorkFile();

/// Sets the fault of a transfer of such a file. @return false.
VEXG_EXPORT bool FailByWorkFile(const std::string& fault);

}  // namespace lumo
