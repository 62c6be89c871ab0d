#pragma once

#include <string>
#include <vector>

#include "foundation/string.h"

namespace lumo::host {

/// The names that GetRasterCategoriesCommand gives, by the values from 0 on; one without a name has
/// an empty one, so that those behind it keep their values.
std::vector<std::string> ReadValueNames(const String& categories);

}  // namespace lumo::host
