#pragma once

#include <string>

#include "platform/export.h"

namespace lumo {

/// Tells all that the registered commands declare, as a JSON array with an object for each command,
/// by name: its name, group and meaning, and its inputs and outputs with their kinds, units and
/// words.
VEXG_EXPORT std::string CommandsAsJson();

}  // namespace lumo
