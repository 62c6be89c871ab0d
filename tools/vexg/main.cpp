#include <iostream>

#include "data/access_policy.h"
#include "foundation/environment.h"
#include "foundation/fault.h"
#include "foundation/library.h"
#include "foundation/near_name.h"
#include "foundation/thrown.h"
#include "options/command_line.h"
#include "platform/debug_output.h"
#include "platform/interrupt.h"
#include "platform/memory_shortage.h"
#include "platform/module.h"
#include "platform/process.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct GeneralOptions {
  std::vector<std::string> libraries;
  bool isLenient = false;
  OptionSet options;

  GeneralOptions() {
    options.Add("--load", libraries, "A library of commands to load first; may come again")
        .IsFile();
    options.Add("--lenient", isLenient,
                "Let jobs read what can't be read as 0 or nothing, and pass over unknown names");
  }
};

GeneralOptions& General() {
  static GeneralOptions general;
  return general;
}

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
  const CommandLine line = ReadCommandLine(std::vector<std::string>(argv + 1, argv + argc));
  if (line.verb == nullptr) {
    std::cout << line.text;
    return kExitSuccess;
  }
  LoadLibraries(General().libraries);
  InitEnvironment();
  VEXInit();
  AccessPolicy policy;
  policy.special = false;  // nobody waits for a pipe that nobody writes to
  SetAccessPolicy(policy);
  const int code = line.verb->work();
  if (!std::cout.flush()) throw HostError(kExitFailed, "standard output can't be written");
  return code;
}

}  // namespace

const OptionSet& GetGeneralOptions() {
  return General().options;
}

void Say(const std::string& line) {
  platform::DebugOutput("vexg: " + Printable(line) + "\n");
}

bool ChecksAreStrict() {
  return !General().isLenient;
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
