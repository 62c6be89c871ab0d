#pragma once

#include <string>

#include "platform/export.h"

namespace lumo {

/// The line, from 1, in which a part of a JSON text stands; 1 where there is none, and the line of
/// the fault in a text that is no JSON.
/// @param pointer  JSON pointer (RFC 6901) of the part, but that characters of names stand as they
///                 are: "/classes/0/name".
VEXG_EXPORT unsigned LineOfJson(const std::string& text, const std::string& pointer);

}  // namespace lumo
