#pragma once

#include <string>

#include "platform/export.h"

namespace lumo::platform {

/// Judges a file before it is opened or made.
/// @param fault  takes the reason of a refusal, unless null.
using FileGate = bool (*)(const std::string& path, bool writing, std::string* fault);

/// Sets the gate that RandomAccessFile asks; null for none. Any thread.
VEXG_EXPORT void SetFileGate(FileGate gate);

/// True when there is no gate, or it lets the file pass.
VEXG_EXPORT bool PassesFileGate(const std::string& path, bool writing, std::string* fault);

}  // namespace lumo::platform
