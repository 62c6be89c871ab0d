#pragma once

#include <string>
#include <vector>

#include "platform/export.h"

namespace lumo {

// Warnings say in words that something went wrong beside an operation that succeeded, as a file
// beside a raster that could not be read. Who notices it adds one here, and who reports to a person
// takes them. The texts belong to the thread, as fault texts do; a call into a source carries them
// back.

/// Keeps `text`, one line that says what and where and that the work went on. The same text counts
/// once, and beyond a handful nothing more is kept.
VEXG_EXPORT void AddWarning(const std::string& text);

/// Takes the texts off the thread, the first one first.
VEXG_EXPORT std::vector<std::string> TakeWarnings();

}  // namespace lumo
