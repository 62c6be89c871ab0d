#pragma once

#include <functional>
#include <string>

#include "commands/declaration.h"
#include "foundation/string.h"

namespace lumo {

/// Gives the text of a variable, which is named with its leading $; false when it holds none.
using VariableReader = std::function<bool(const String& variable, String& text)>;

/// Calls `visit` with the name of each variable in `text`, in order. A variable is $ and letters,
/// digits and underscores, or any other name as ${name}; $$ is the character $ itself.
VEXG_EXPORT void ForEachVariable(const String& text,
                                 const std::function<void(const String& variable)>& visit);

/// Puts the values of variables in the place of their names.
///
/// For an array the text is a list of elements separated by blanks, and the array of them comes
/// back: "$red $nir" gives "1:2 [[red.tif] [nir.tif] ] ". A text that is an array already stays
/// one, with its variables replaced. In a text list the blanks around a value are left out.
/// @return false when one of the variables holds no text.
VEXG_EXPORT bool ExpandVariables(const String& text, ValueKind kind, const VariableReader& read,
                                 String& expanded);

}  // namespace lumo
