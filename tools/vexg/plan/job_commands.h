#pragma once

#include <map>
#include <string>
#include <vector>

#include "jobs/document.h"

namespace lumo::host {

/// One input of a command, as a document has it.
struct JobInput {
  std::string name;
  std::string value;
  bool isExpanded = false;  ///< variables may stand anywhere in the value
};

/// One output of a command, and the variable that it goes to.
struct JobOutput {
  std::string name;
  std::string variable;  ///< with its "$"
};

/// A command of a document, to be copied into others and changed there.
struct JobCommand {
  std::string name;
  std::string id;
  std::vector<JobInput> inputs{};
  std::vector<JobOutput> outputs{};

  /// The value of an input; null where there is none.
  const std::string* Find(const std::string& input) const;
  /// Sets an input, also one that is there.
  void Set(const std::string& input, const std::string& value);
  void Remove(const std::string& input);
};

/// The variables in the value of an input, each with its "$".
std::vector<std::string> VariablesOf(const JobInput& input);

/// The commands of a document in their order.
class JobCommands {
 public:
  JobCommands() = default;
  explicit JobCommands(const Document& document);

  /// A document of the same form without commands.
  JobCommands WithoutCommands() const;

  /// The document, whose commands run one after the other. Commands of the same name, or of none,
  /// get names.
  std::string Write() const;

  /// Adds the closing of rasters, the last one first.
  /// @param variables  that have their URIs.
  void AddCloses(const std::vector<std::string>& variables);

  std::vector<JobCommand> commands{};

 private:
  std::string checks_;  // empty: the document says nothing of them
};

/// Numbers, and texts, as inputs of a command have them.
std::string NumberArray(const std::vector<unsigned>& numbers);
std::string JoinedByBars(const std::vector<std::string>& texts);

/// The pieces of the value of an input that may name files.
std::vector<std::string> PiecesOf(const std::string& value);

/// Gives files other names wherever a command names them.
void RenameFiles(const std::map<std::string, std::string>& names, JobCommand& command);

/// The files that a document makes and reads.
struct JobFiles {
  std::vector<std::string> made;     ///< as the document names them
  std::vector<std::string> inPlace;  ///< those that have to be made where they will be
  std::vector<std::string> read;     ///< those that are there
};

/// Finds the files of commands: those are made that the commands declare as such, see
/// commands/division.h, and those are read that are there and are not made.
JobFiles FindFiles(const std::vector<JobCommand>& commands);

}  // namespace lumo::host
