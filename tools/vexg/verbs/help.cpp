#include <iostream>
#include <memory>

#include "commands/command.h"
#include "foundation/near_name.h"
#include "jobs/command_text.h"
#include "options/command_line.h"
#include "options/verb_text.h"
#include "verb.h"

namespace lumo::host {
namespace {

struct HelpOptions {
  std::string name;
  bool json = false;
  bool manual = false;
};

[[noreturn]] void FailUnknown(const std::string& name) {
  std::vector<std::string> known;
  for (const auto& entry : GetCommandRegistry()) known.push_back(entry.first.ToUTF8());
  for (const Verb& verb : GetVerbs()) known.push_back(verb.name);
  throw HostError(kExitUsage, "there is no command \"" + name + "\"" + DidYouMean(name, known) +
                                  "; see vexg commands");
}

std::string TextOf(const HelpOptions& options) {
  if (options.json) return VerbsAsJson();
  const CommandFactory* const factory = GetCommandRegistry().Find(String(options.name));
  if (factory != nullptr) {
    const CommandDeclaration& command = factory->GetDeclaration();
    return options.manual ? CommandAsManual(command) : CommandAsHelp(command);
  }
  const Verb* const verb = FindVerb(options.name);
  if (verb == nullptr && !options.name.empty()) FailUnknown(options.name);
  return options.manual ? VerbAsManual(verb) : HelpOf(verb);
}

const VerbRegistration helpRegistration(
    "help", "Tells about a command of jobs, or a verb", [](OptionSet& line) {
      const auto options = std::make_shared<HelpOptions>();
      line.AddExample("vexg help OpenRasterCommand");
      line.AddExample("vexg help --man read | man -l -");
      line.Add("name", options->name, "The command or verb").Shows("NAME");
      line.Add("--json", options->json, "All verbs with their options as JSON");
      line.Add("--man", options->manual, "The manual page of a command or verb, or of the program");
      line.AllowOneOf({"--json", "--man"});
      return VerbRegistration::Work([options] {
        std::cout << TextOf(*options);
        return int{kExitSuccess};
      });
    });

}  // namespace
}  // namespace lumo::host
