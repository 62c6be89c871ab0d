#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// The one of `known` that a person most likely meant by `name`: the fewest letters to change, add,
/// leave out or swap with their neighbour, whatever their case. Empty when none is near, which is
/// within a third of the letters of `name`; the first of several as near.
VEXG_EXPORT std::string NearestName(std::string_view name, const std::vector<std::string>& known);

/// "; did you mean X?" for the nearest name, to be put behind a message; empty when none is near.
VEXG_EXPORT std::string DidYouMean(std::string_view name, const std::vector<std::string>& known);

/// `text` as it can stand in one line of a message: control characters, and bytes that are no
/// UTF-8, are written as \n, \t or \xNN. A long text is cut in its middle.
/// @param most  bytes of the text that are shown; 0 for all.
VEXG_EXPORT std::string Printable(std::string_view text, std::size_t most = 0);

}  // namespace lumo
