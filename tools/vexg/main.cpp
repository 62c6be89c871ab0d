#include <algorithm>
#include <iostream>
#include <map>

#include <CLI/CLI.hpp>

#include "data/access_policy.h"
#include "foundation/environment.h"
#include "foundation/fault.h"
#include "foundation/library.h"
#include "foundation/near_name.h"
#include "foundation/thrown.h"
#include "option_values.h"
#include "platform/debug_output.h"
#include "platform/interrupt.h"
#include "platform/memory_shortage.h"
#include "platform/module.h"
#include "platform/process.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct Verb {
  const char* summary;
  VerbRegistration::Setup setup;
};

std::map<std::string, Verb>& Verbs() {
  static std::map<std::string, Verb> verbs;
  return verbs;
}

bool gIsLenient = false;

/// Loads libraries of commands; what they hold registers itself.
void LoadLibraries(const std::vector<std::string>& files) {
  for (const std::string& file : files) {
    // A bare name is a file of the working directory here, as everywhere on the command line.
    const std::string path = file.find('/') == std::string::npos ? "./" + file : file;
    std::string fault;
    if (!platform::Module::Load(path, &fault).IsLoaded()) {
      throw HostError(kExitUsage, "can't load the library " + file + ": " + fault);
    }
  }
}

int Run(int argc, char** argv) {
  CLI::App app("Processing core for remote-sensing images: runs jobs of named commands.", "vexg");
  app.set_version_flag("--version", std::string("vexg ") + GetLibraryVersion());
  app.require_subcommand(1);
  app.fallthrough();
  std::vector<std::string> libraries;
  app.add_option("--load", libraries, "A library of commands to load first; may come again")
      ->type_name("FILE")
      ->allow_extra_args(false);

  app.add_flag("--lenient", gIsLenient,
               "Let jobs read what can't be read as 0 or nothing, and pass over unknown names");

  std::map<const CLI::App*, VerbRegistration::Work> works;
  for (const auto& [name, verb] : Verbs()) {
    CLI::App* const sub = app.add_subcommand(name, verb.summary);
    works[sub] = verb.setup(*sub);
  }
  const std::vector<std::string> arguments =
      JoinLists(app, std::vector<std::string>(argv + 1, argv + argc));
  try {
    std::vector<std::string> line = arguments;
    std::reverse(line.begin(), line.end());  // as the parser takes them
    app.parse(line);
  } catch (const CLI::ParseError& error) {
    if (error.get_exit_code() == 0) return app.exit(error);  // help or version
    throw HostError(kExitUsage, DescribeBadLine(app, arguments, error));
  }
  LoadLibraries(libraries);
  InitEnvironment();
  VEXInit();
  AccessPolicy policy;
  policy.special = false;  // nobody waits for a pipe that nobody writes to
  SetAccessPolicy(policy);
  const int code = works.at(app.get_subcommands().front())();
  if (!std::cout.flush()) throw HostError(kExitFailed, "standard output can't be written");
  return code;
}

}  // namespace

VerbRegistration::VerbRegistration(const char* name, const char* summary, Setup setup) {
  Verbs()[name] = {summary, setup};
}

void Say(const std::string& line) {
  platform::DebugOutput("vexg: " + Printable(line) + "\n");
}

bool ChecksAreStrict() {
  return !gIsLenient;
}

}  // namespace lumo::host

namespace {

namespace platform = lumo::platform;

int RunAndSay(int argc, char** argv) {
  int code = lumo::host::kExitFailed;
  std::string why;
  try {
    return lumo::host::Run(argc, argv);
  } catch (const lumo::host::HostError& error) {
    code = error.code;
    why = error.what();
  } catch (...) {
    why = lumo::DescribeException();
  }
  // Nothing in the making is left by now. Who has closed the pipe knows why there is no more.
  if (platform::OutputIsClosed()) platform::EndOfClosedPipe();
  // Where memory was short, all other reasons follow from that.
  if (platform::CountMemoryShortages() != 0) {
    code = lumo::host::kExitFailed;
    why = platform::kOutOfMemory;
  }
  lumo::host::Say(why);
  return code;
}

}  // namespace

int main(int argc, char** argv) {
  platform::SurviveFailedWrites();
  platform::EndInOrderWhenMemoryIsShort("vexg", lumo::host::kExitFailed);
  const int code = RunAndSay(argc, argv);
  // Work in the background that was aborted may still be about to end.
  if (platform::WasInterrupted()) platform::EndProcess(code);
  return code;
}
