#include "options/completion_text.h"

#include <fmt/format.h>
#include <fmt/ranges.h>

#include "verb.h"

namespace lumo::host {
namespace {

/// A text between single quotes, as zsh and bash read it.
std::string Quoted(const std::string& text) {
  std::string quoted = "'";
  for (const char c : text) quoted += c == '\'' ? std::string("'\\''") : std::string(1, c);
  return quoted + "'";
}

/// A text between single quotes, as fish reads it, where a backslash escapes.
std::string QuotedForFish(const std::string& text) {
  std::string quoted = "'";
  for (const char c : text) {
    if (c == '\'' || c == '\\') quoted += '\\';
    quoted += c;
  }
  return quoted + "'";
}

/// Puts a backslash before each of some characters.
std::string Escaped(const std::string& text, const std::string& characters) {
  std::string escaped;
  for (const char c : text) {
    if (c == '\\' || characters.find(c) != characters.npos) escaped += '\\';
    escaped += c;
  }
  return escaped;
}

std::string LongNames(const OptionSet& options) {
  std::string names;
  for (const OptionSpec& option : options.Options()) {
    if (!option.IsByPlace()) names += " " + option.Name();
  }
  return names;
}

// --- bash ---

std::string ForBash() {
  std::string verbs = LongNames(GetGeneralOptions()) + " --help --version", values, options;
  for (const Verb& verb : GetVerbs()) {
    verbs += " " + verb.name;
    options += fmt::format("    {}) words=\"--help{}\" ;;\n", verb.name, LongNames(verb.options));
    for (const OptionSpec& option : verb.options.Options()) {
      if (option.choices.empty()) continue;
      // The first argument by its place stands behind the verb.
      const std::string before = option.IsByPlace() ? verb.name : option.Name();
      values += fmt::format("    \"{} {}\") words=\"{}\" ;;\n", verb.name, before,
                            fmt::join(option.choices, " "));
    }
  }
  return R"sh(# Completion of vexg for bash: eval "$(vexg completion bash)"
_vexg() {
  local current=${COMP_WORDS[COMP_CWORD]} before=${COMP_WORDS[COMP_CWORD-1]} verb=${COMP_WORDS[1]}
  local words=
  if ((COMP_CWORD == 1)); then
    COMPREPLY=($(compgen -W ")sh" +
         verbs + R"sh(" -- "$current"))
    return
  fi
  if [[ $current == = ]]; then current=; elif [[ $before == = ]]; then before=${COMP_WORDS[COMP_CWORD-2]}; fi
  if [[ $verb == help && $current != -* ]]; then
    words=$("${COMP_WORDS[0]}" commands --names)
  fi
  case "$verb $before" in
)sh" + values +
         R"sh(  esac
  if [[ -n $words ]]; then
    COMPREPLY=($(compgen -W "$words" -- "$current"))
    return
  fi
  case $verb in
)sh" + options +
         R"sh(  esac
  if [[ $current == -* ]]; then
    COMPREPLY=($(compgen -W "$words" -- "$current"))
  else
    COMPREPLY=($(compgen -f -- "$current"))
  fi
}
complete -F _vexg vexg
)sh";
}

// --- zsh ---

/// The part of a specification of _arguments that tells of a value: message and action.
std::string ValueForZsh(const Verb* verb, const OptionSpec& option) {
  const std::string shown = option.shown.empty() ? "value" : option.shown;
  std::string action = " ";  // takes a value, and completes none
  if (!option.choices.empty()) action = fmt::format("({})", fmt::join(option.choices, " "));
  if (option.type == OptionType::kFile) action = "_files";
  if (verb != nullptr && verb->name == "help") action = "{_vexg_commands}";
  return Escaped(shown, ":") + ":" + action;
}

std::string OptionForZsh(const Verb* verb, const OptionSpec& option, bool& isFirst) {
  if (option.IsByPlace()) {
    const char* const place = option.isRepeatable ? "*" : isFirst ? "1" : "";
    isFirst = false;
    // Where an argument may be left out, a second colon says so.
    const char* const colon = option.isRequired || option.isRepeatable ? ":" : "::";
    return Quoted(fmt::format("{}{}{}", place, colon, ValueForZsh(verb, option)));
  }
  std::string text;
  for (const std::string& name : option.names) {
    // Only a repeatable option is offered again; an option rules out its other names too.
    const std::string others =
        option.isRepeatable ? "*" : fmt::format("({})", fmt::join(option.names, " "));
    const std::string value =
        option.type == OptionType::kFlag ? "" : fmt::format(":{}", ValueForZsh(nullptr, option));
    const std::string help = Escaped(option.help, "[]:");
    if (!text.empty()) text += ' ';
    text += Quoted(fmt::format("{}{}[{}]{}", others, name, help, value));
  }
  return text;
}

std::string OptionsForZsh(const Verb* verb, const OptionSet& options) {
  std::string text = " '(- *)--help[Show the help]'";
  bool isFirst = true;
  for (const OptionSpec& option : options.Options()) {
    text += ' ';
    text += OptionForZsh(verb, option, isFirst);
  }
  return text;
}

std::string ForZsh() {
  std::string verbs, cases;
  for (const Verb& verb : GetVerbs()) {
    if (!verbs.empty()) verbs += ' ';
    verbs += Quoted(fmt::format("{}:{}", verb.name, Escaped(verb.summary, ":")));
    cases +=
        fmt::format("    {}) _arguments -s{} ;;\n", verb.name, OptionsForZsh(&verb, verb.options));
  }
  return R"sh(#compdef vexg
# Completion of vexg for zsh: eval "$(vexg completion zsh)"
_vexg_commands() {
  local -a names
  names=(${(f)"$(_call_program commands vexg commands --names)"})
  compadd -a names
}
_vexg() {
  local context state state_descr line
  typeset -A opt_args
  local -a verbs
  verbs=()sh" +
         verbs + R"sh()
  _arguments -C)sh" +
         OptionsForZsh(nullptr, GetGeneralOptions()) +
         R"sh( '(- *)--version[Show the version]' '1:verb:->verb' '*::argument:->arguments' && return
  if [[ $state == verb ]]; then
    _describe verb verbs
    return
  fi
  case $words[1] in
)sh" + cases +
         R"sh(  esac
}
if [[ $funcstack[1] == _vexg ]]; then _vexg "$@"; else compdef _vexg vexg; fi
)sh";
}

// --- fish ---

/// The conditions of fish are commands; `place` counts the arguments before the one at hand.
std::string ForFish(const std::string& condition) {
  return "complete -c vexg -n " + QuotedForFish(condition);
}

std::string OptionForFish(const std::string& condition, const OptionSpec& option) {
  std::string text = ForFish(condition);
  for (const std::string& name : option.names) {
    text += name.starts_with("--") ? " -l " + name.substr(2) : " -s " + name.substr(1);
  }
  if (option.type == OptionType::kFile) {
    text += " -r -F";
  } else if (option.type != OptionType::kFlag) {
    text += " -x";
    if (!option.choices.empty()) {
      text += " -a " + QuotedForFish(fmt::format("{}", fmt::join(option.choices, " ")));
    }
  }
  return text + " -d " + QuotedForFish(option.help) + "\n";
}

std::string ForFish(const Verb& verb) {
  const std::string condition = "__vexg_verb_is " + verb.name;
  std::string text;
  bool isFirst = true, takesFiles = false;
  for (const OptionSpec& option : verb.options.Options()) {
    if (!option.IsByPlace()) {
      text += OptionForFish(condition, option);
      continue;
    }
    // Only the first argument by its place has choices.
    if (isFirst && !option.choices.empty()) {
      text += ForFish("__vexg_verb_is " + verb.name + " alone") + " -f -a " +
              QuotedForFish(fmt::format("{}", fmt::join(option.choices, " "))) + "\n";
    }
    isFirst = false;
    takesFiles |= option.choices.empty();
  }
  if (verb.name == "help") {
    text += ForFish(condition) + " -f -a '(vexg commands --names)'\n";
  } else if (!takesFiles) {
    text += ForFish(condition) + " -f\n";
  }
  return text;
}

std::string ForFish() {
  std::string text = R"sh(# Completion of vexg for fish: vexg completion fish | source
# True when the verb of the line is the one named; with "alone" when nothing stands behind it yet. Without
# a name, when there is no verb yet.
function __vexg_verb_is
  set -l words (commandline -opc)
  set -e words[1]
  while set -q words[1]
    switch $words[1]
      case --load
        set -e words[1]
      case '-*'
      case '*'
        break
    end
    set -e words[1]
  end
  if not set -q argv[1]
    not set -q words[1]
    return
  end
  test "$words[1]" = $argv[1]; or return
  not set -q argv[2]; or test (count $words) -eq 1
end
complete -c vexg -l help -d 'Show the help'
complete -c vexg -n __vexg_verb_is -f -l version -d 'Show the version'
)sh";
  for (const OptionSpec& option : GetGeneralOptions().Options()) {
    text += OptionForFish("__vexg_verb_is", option);
  }
  for (const Verb& verb : GetVerbs()) {
    text += "complete -c vexg -n __vexg_verb_is -f -a " + QuotedForFish(verb.name) + " -d " +
            QuotedForFish(verb.summary) + "\n" + ForFish(verb);
  }
  return text;
}

}  // namespace

const std::vector<std::string>& CompletedShells() {
  static const std::vector<std::string> shells{"bash", "zsh", "fish"};
  return shells;
}

std::string VerbsAsCompletion(const std::string& shell) {
  if (shell == "bash") return ForBash();
  if (shell == "zsh") return ForZsh();
  if (shell == "fish") return ForFish();
  return "";
}

}  // namespace lumo::host
