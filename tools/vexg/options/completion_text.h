#pragma once

#include <string>
#include <vector>

namespace lumo::host {

/// The shells that there are completions for.
const std::vector<std::string>& CompletedShells();

/// A script that has a shell complete verbs, options, the values of those with choices, files, and
/// names of commands.
/// @param shell  one of CompletedShells(); a text for another one is empty.
std::string VerbsAsCompletion(const std::string& shell);

}  // namespace lumo::host
