#include <iostream>
#include <memory>

#include <CLI/CLI.hpp>

#include "command_text.h"
#include "commands/command.h"
#include "foundation/near_name.h"
#include "verb.h"

namespace lumo::host {
namespace {

int Help(CLI::App& app, const std::string& name) {
  if (name.empty()) {
    std::cout << app.get_parent()->help();
    return kExitSuccess;
  }
  const CommandFactory* const factory = GetCommandRegistry().Find(String(name));
  if (factory != nullptr) {
    std::cout << CommandAsHelp(factory->GetDeclaration());
    return kExitSuccess;
  }
  const auto verbs = app.get_parent()->get_subcommands(
      [&](const CLI::App* verb) { return verb->get_name() == name; });
  if (verbs.empty()) {
    std::vector<std::string> known;
    for (const auto& entry : GetCommandRegistry()) known.push_back(entry.first.ToUTF8());
    for (const CLI::App* verb :
         app.get_parent()->get_subcommands([](const CLI::App*) { return true; })) {
      known.push_back(verb->get_name());
    }
    throw HostError(kExitUsage, "there is no command \"" + name + "\"" + DidYouMean(name, known) +
                                    "; see vexg commands");
  }
  std::cout << verbs.front()->help(app.get_parent()->get_name());
  return kExitSuccess;
}

const VerbRegistration registration(
    "help", "Tells about a command of jobs, or a verb", [](CLI::App& app) {
      const auto name = std::make_shared<std::string>();
      app.footer("Examples: vexg help OpenRasterCommand, vexg help read\n");
      app.add_option("name", *name, "The command or verb")->type_name("NAME");
      return VerbRegistration::Work([&app, name] { return Help(app, *name); });
    });

}  // namespace
}  // namespace lumo::host
