#pragma once

#include <string>

namespace lumo {
struct CommandDeclaration;
}

namespace lumo::host {

// The declarations of the registered commands, in the forms that people and programs read.

std::string CommandsAsList();      ///< a line each, by group
std::string CommandsAsNames();     ///< a name each, for the completion of a shell
std::string CommandsAsMarkdown();  ///< everything, as a document

/// All about one command.
std::string CommandAsHelp(const CommandDeclaration& command);

/// A manual page about one command in the troff language, NAME(7).
std::string CommandAsManual(const CommandDeclaration& command);

}  // namespace lumo::host
