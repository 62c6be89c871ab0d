#pragma once

#include <string>
#include <vector>

#include "verb.h"

namespace lumo::host {

/// A command line that was understood.
struct CommandLine {
  const Verb* verb = nullptr;  ///< null where there is a text instead
  std::string text;            ///< help or the version, to be printed
};

/// Reads the arguments of the program into the variables of the options.
///
/// Options may stand before or behind the verb. Behind "batch" or "plan"
/// and its verb stand the arguments of that one too. The elements of a list may be arguments of
/// their own: "--gain 6 5 4" is "--gain 6,5,4".
///
/// Failure: HostError with one line that says what is wrong, where to read on, and which verb or
///          option is the nearest.
CommandLine ReadCommandLine(const std::vector<std::string>& arguments);

/// Reads the arguments of one verb into the variables of its options.
/// @param verb       as MakeVerb gives it.
/// @param arguments  without the verb's name.
/// Failure: HostError, as above.
void ReadVerbArguments(const Verb& verb, const std::vector<std::string>& arguments);

/// The help of a verb, or the list of all verbs for null.
std::string HelpOf(const Verb* verb);

}  // namespace lumo::host
