#include <iostream>
#include <memory>

#include <CLI/CLI.hpp>

#include "option_values.h"
#include "verb.h"

namespace lumo::host {
namespace {

/// The long options of a part of the command line, separated by blanks.
std::string OptionNames(const CLI::App& app) {
  std::string names;
  for (const CLI::Option* option : app.get_options()) {
    for (const std::string& name : option->get_lnames()) names += " --" + name;
  }
  for (const CLI::App* group : app.get_subcommands([](const CLI::App* sub) {
         return sub->get_name().empty();  // a group of options
       })) {
    names += OptionNames(*group);
  }
  return names;
}

constexpr const char* kBashScript =
    R"sh(# Completion of vexg for bash: eval "$(vexg completion bash)"
_vexg() {
  local current=${COMP_WORDS[COMP_CWORD]} verb=${COMP_WORDS[1]} words
  if ((COMP_CWORD == 1)); then
    COMPREPLY=($(compgen -W "@VERBS@" -- "$current"))
    return
  fi
  if [[ $verb == help ]]; then
    COMPREPLY=($(compgen -W "$("${COMP_WORDS[0]}" commands --names)" -- "$current"))
    return
  fi
  case $verb in
@CASES@  esac
  if [[ $current == -* ]]; then
    COMPREPLY=($(compgen -W "$words" -- "$current"))
  else
    COMPREPLY=($(compgen -f -- "$current"))
  fi
}
complete -F _vexg vexg
)sh";

std::string BashScript(const CLI::App& app) {
  std::string verbs = OptionNames(app);
  std::string cases;
  for (const CLI::App* verb : app.get_subcommands([](const CLI::App*) { return true; })) {
    verbs += " " + verb->get_name();
    cases += "    " + verb->get_name() + ") words=\"" + OptionNames(*verb) + "\" ;;\n";
  }
  std::string script = CLI::detail::find_and_replace(kBashScript, "@VERBS@", verbs);
  return CLI::detail::find_and_replace(script, "@CASES@", cases);
}

const VerbRegistration registration(
    "completion", "Prints a script with which a shell completes command lines", [](CLI::App& app) {
      const auto shell = std::make_shared<std::string>();
      app.footer("Example: eval \"$(vexg completion bash)\"\n");
      app.add_option("shell", *shell, "The shell")->transform(OneOf({"bash"}))->required();
      return VerbRegistration::Work([&app, shell] {
        std::cout << BashScript(*app.get_parent());
        return int{kExitSuccess};
      });
    });

}  // namespace
}  // namespace lumo::host
