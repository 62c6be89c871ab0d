#pragma once

#include <functional>
#include <stdexcept>
#include <string>
#include <vector>

#include "options/option.h"

namespace lumo::host {

/// The meanings of the program's exit codes.
enum ExitCode : int {
  kExitSuccess = 0,
  kExitFailed = 1,    ///< a command failed or was aborted, or its result could not be written
  kExitUsage = 2,     ///< the command line or the document is wrong; nothing was run
  kExitNoServer = 3,  ///< no server answers
};

/// A failure that ends the program: one line that says what, where and what to do.
class HostError : public std::runtime_error {
 public:
  HostError(ExitCode exitCode, const std::string& line)
      : std::runtime_error(line), code(exitCode) {}

  const ExitCode code;
};

/// Writes one line of the program's own to standard error.
void Say(const std::string& line);

/// True unless the user asked for --lenient: jobs have their inputs checked before they run.
bool ChecksAreStrict();

/// The options that stand in front of every verb, or behind it.
const OptionSet& GetGeneralOptions();

/// One verb of the command line.
struct Verb {
  std::string name;
  std::string summary;  ///< one line for the list of verbs
  OptionSet options;
  std::function<int()> work;  ///< runs when the verb was chosen; gives the exit code, may throw
};

/// All verbs, by name. Their options are set up by the first call.
const std::vector<Verb>& GetVerbs();

/// The verb of a name; null for none.
const Verb* FindVerb(const std::string& name);

/// Makes a verb of a name with options of its own, to be run beside others of its name. Without
/// work where there is no such verb.
Verb MakeVerb(const std::string& name);

/// Puts a verb into the list. A static object beside the verb's code does it.
///
/// `setup` adds the verb's options and gives the function that does the work, which runs when the
/// verb was chosen and gives the exit code. It may throw HostError.
class VerbRegistration {
 public:
  using Work = std::function<int()>;
  using Setup = Work (*)(OptionSet& line);

  VerbRegistration(const char* name, const char* summary, Setup setup);
};

}  // namespace lumo::host
