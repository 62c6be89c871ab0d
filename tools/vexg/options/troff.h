#pragma once

#include <string>

namespace lumo::host {

/// Lets a text stand in a manual page: a backslash is an escape there, a dot or quote at the start
/// of a line a request, and a plain dash may be broken or replaced.
std::string Troff(const std::string& text);

/// The head and the NAME section of a page.
/// @param section  1 for programs, 7 for what is no program.
std::string HeadOfManual(const std::string& name, int section, const std::string& summary);

}  // namespace lumo::host
