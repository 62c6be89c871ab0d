#pragma once

#include <string>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// Gives each of some names of classes once, in order: numbers by value, in front of texts.
VEXG_EXPORT std::vector<std::string> OrderClassNames(std::vector<std::string> names);

}  // namespace lumo
