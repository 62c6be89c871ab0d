#pragma once

#include <functional>
#include <stdexcept>
#include <string>

namespace CLI {
class App;
}

namespace lumo::host {

/// What the program's exit code says.
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

/// One verb of the command line. A static object beside the verb's code puts it into the list.
///
/// `setup` adds options to the verb's part of the command line and gives the function that does the
/// work, which runs when the verb was chosen and gives the exit code. It may throw HostError.
class VerbRegistration {
 public:
  using Work = std::function<int()>;
  using Setup = Work (*)(CLI::App& app);

  VerbRegistration(const char* name, const char* summary, Setup setup);
};

}  // namespace lumo::host
