#pragma once

#include <string>

#include "verb.h"

namespace lumo::host {

/// All verbs and their options as a JSON document.
std::string VerbsAsJson();

/// A manual page in the troff language, vexg-NAME(1) of a verb, or vexg(1) for null.
std::string VerbAsManual(const Verb* verb);

}  // namespace lumo::host
