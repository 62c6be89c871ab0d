#include "options/command_line.h"

#include <algorithm>

#include <CLI/CLI.hpp>
#include <fmt/format.h>
#include <fmt/ranges.h>

#include "foundation/library.h"
#include "foundation/near_name.h"
#include "options/option_values.h"

namespace lumo::host {
namespace {

using Strings = std::vector<std::string>;

// From data to the parser:

/// The value of an option as the help shows it.
std::string ShownValue(const OptionSpec& option) {
  std::string shown = option.shown;
  if (shown.empty() && !option.choices.empty()) {
    shown = fmt::format("{}", fmt::join(option.choices, "|"));
  }
  if (shown.empty()) shown = option.type == OptionType::kText ? "TEXT" : "N";
  if (option.least) shown += fmt::format(" from {} to {}", *option.least, *option.most);
  return shown;
}

std::string ShownHelp(const OptionSpec& option) {
  return option.example.empty() ? option.help : option.help + ", as " + option.example;
}

void AddTo(CLI::App& app, const OptionSpec& option) {
  std::string names;
  for (auto name = option.names.rbegin(); name != option.names.rend(); ++name) {
    names += (names.empty() ? "" : ",") + *name;  // the short one comes first in the help
  }
  if (option.type == OptionType::kFlag) {
    app.add_flag_callback(
        names, [&option] { option.take({}); }, ShownHelp(option));
    return;
  }
  const auto take = [&option](const Strings& values) {
    const std::string fault = option.take(values);
    if (!fault.empty()) throw CLI::ValidationError(option.Name(), fault);
    return true;
  };
  CLI::Option* const added = app.add_option(names, take, ShownHelp(option));
  added->type_name(ShownValue(option))->required(option.isRequired);
  if (!option.defaultText.empty()) added->default_str(option.defaultText);
  if (!option.isRepeatable) return;
  added->expected(1, CLI::detail::expected_max_vector_size);
  added->allow_extra_args(option.IsByPlace());  // else what follows may be the file
}

std::string FooterOf(const OptionSet& options) {
  std::string footer;
  for (const std::string& note : options.Notes()) footer += note + "\n";
  const char* title = options.Examples().size() > 1 ? "Examples: " : "Example: ";
  for (const std::string& example : options.Examples()) {
    footer += title + example + "\n";
    title = "          ";
  }
  return footer;
}

void AddTo(CLI::App& app, const OptionSet& options) {
  for (const OptionSpec& option : options.Options()) AddTo(app, option);
  for (const Strings& names : options.Exclusive()) {
    for (const std::string& name : names) {
      for (const std::string& other : names) {
        if (name != other) app.get_option(name)->excludes(other);
      }
    }
  }
  app.footer(FooterOf(options));
}

/// The parser of all verbs, with the options of the one that is meant.
struct Parser {
  CLI::App app{"Processing core for remote-sensing images: runs jobs of named commands.", "vexg"};

  explicit Parser(const Verb* meant) {
    app.set_version_flag("--version", std::string("vexg ") + GetLibraryVersion());
    app.require_subcommand(1);
    app.fallthrough();
    AddTo(app, GetGeneralOptions());
    for (const Verb& verb : GetVerbs()) {
      CLI::App* const added = app.add_subcommand(verb.name, verb.summary);
      if (meant == &verb) AddTo(*added, verb.options);
    }
  }
};

// The words that the user typed:

/// Finds the place of the verb among the arguments; their number for none.
std::size_t FindVerbPlace(const Strings& arguments) {
  std::size_t at = 0;
  for (; at < arguments.size() && arguments[at].starts_with('-'); ++at) {
    const OptionSpec* const option = GetGeneralOptions().Find(arguments[at]);
    if (option != nullptr && option->type != OptionType::kFlag) ++at;
  }
  return std::min(at, arguments.size());
}

bool IsNumber(const std::string& text) {
  Quantity quantity;
  return ReadQuantity(text, quantity) && quantity.unit.empty();
}

/// Gives a list with one comma between its elements where there are blanks, a comma, or both.
std::string WithCommas(const std::string& text) {
  std::string joined;
  bool isBlank = false;
  for (const char c : text) {
    if (c == ' ' || c == '\t') {
      isBlank = true;
      continue;
    }
    if (isBlank && c != ',' && !joined.empty() && joined.back() != ',') joined += ',';
    isBlank = false;
    joined += c;
  }
  return joined;
}

/// True when every element of the list is a number. A comma may stand behind the last one.
bool HoldsNumbers(const std::string& text) {
  std::string list = WithCommas(text);
  if (list.ends_with(',')) list.pop_back();
  const Strings elements = SplitList(list);
  return std::all_of(elements.begin(), elements.end(), IsNumber);
}

/// Joins the elements of lists: "--gain 6 5 4" becomes "--gain=6,5,4". What an option that takes
/// one value is followed by stays.
Strings JoinLists(const Strings& arguments) {
  const std::size_t verbAt = FindVerbPlace(arguments);
  const Verb* const verb = verbAt < arguments.size() ? FindVerb(arguments[verbAt]) : nullptr;
  if (verb == nullptr) return arguments;
  Strings joined(arguments.begin(), arguments.begin() + static_cast<std::ptrdiff_t>(verbAt) + 1);
  for (std::size_t i = verbAt + 1; i < arguments.size(); ++i) {
    const std::string& argument = arguments[i];
    if (argument == "--") {
      joined.insert(joined.end(), arguments.begin() + static_cast<std::ptrdiff_t>(i),
                    arguments.end());
      break;
    }
    const std::size_t equals = argument.find('=');
    const std::string name = argument.substr(0, equals);
    const OptionSpec* const option = name.starts_with("--") ? verb->options.Find(name) : nullptr;
    joined.push_back(argument);
    if (option == nullptr || !option->isList) continue;
    std::string list;
    if (equals != std::string::npos) {
      list = argument.substr(equals + 1);
    } else if (i + 1 < arguments.size()) {
      list = arguments[++i];
    }
    if (!HoldsNumbers(list)) {
      if (equals == std::string::npos && !list.empty()) joined.push_back(list);
      continue;
    }
    while (i + 1 < arguments.size() && HoldsNumbers(arguments[i + 1])) {
      list += " " + arguments[++i];
    }
    joined.back() = name + "=" + WithCommas(list);
  }
  return joined;
}

/// The verbs behind which another verb stands with its arguments.
bool TakesVerb(const std::string& verb) {
  return verb == "batch" || verb == "plan";
}

/// Puts the arguments of the verb behind "batch" or "plan" behind "--", where they belong to none
/// of its own options. Behind that verb an option that both have is that verb's.
Strings MoveWordsOfVerb(const Strings& arguments) {
  const std::size_t outerAt = FindVerbPlace(arguments);
  if (outerAt >= arguments.size() || !TakesVerb(arguments[outerAt])) return arguments;
  const Verb& outer = *FindVerb(arguments[outerAt]);
  Strings own(arguments.begin(), arguments.begin() + static_cast<std::ptrdiff_t>(outerAt) + 1);
  Strings words;
  bool hasVerb = false;
  const Verb* inner = nullptr;
  for (std::size_t i = outerAt + 1; i < arguments.size(); ++i) {
    const std::string& argument = arguments[i];
    const std::string name = argument.substr(0, argument.find('='));
    const OptionSpec* option = name.starts_with('-') ? outer.options.Find(name) : nullptr;
    if (inner != nullptr && inner->options.Find(name) != nullptr) option = nullptr;
    if (argument == "--") {
      words.insert(words.end(), arguments.begin() + static_cast<std::ptrdiff_t>(i) + 1,
                   arguments.end());
      break;
    }
    const bool isHelp = !hasVerb && (argument == "--help" || argument == "-h");
    const bool isVerb = !hasVerb && !argument.starts_with('-');
    if (isVerb && !TakesVerb(argument)) inner = FindVerb(argument);
    hasVerb = hasVerb || isVerb;
    (isVerb || isHelp || option != nullptr ? own : words).push_back(argument);
    const bool hasValue = option != nullptr && option->type != OptionType::kFlag;
    if (hasValue && name == argument && i + 1 < arguments.size()) own.push_back(arguments[++i]);
  }
  if (words.empty()) return own;
  own.emplace_back("--");
  own.insert(own.end(), words.begin(), words.end());
  return own;
}

void AddLongNames(const OptionSet& options, Strings& names) {
  for (const OptionSpec& option : options.Options()) {
    for (const std::string& name : option.names) {
      if (name.starts_with("--")) names.push_back(name);
    }
  }
}

/// Describes the fault of a command line in one line.
std::string DescribeFault(const Strings& arguments, const CLI::ParseError& error) {
  const std::size_t verbAt = FindVerbPlace(arguments);
  const Verb* const verb = verbAt < arguments.size() ? FindVerb(arguments[verbAt]) : nullptr;
  std::string text = error.what();
  if (verb == nullptr && verbAt < arguments.size()) {
    Strings verbs;
    for (const Verb& known : GetVerbs()) verbs.push_back(known.name);
    text = "there is no verb " + arguments[verbAt] + DidYouMean(arguments[verbAt], verbs);
  } else if (verb != nullptr) {
    Strings known{"--help"};
    AddLongNames(verb->options, known);
    AddLongNames(GetGeneralOptions(), known);
    for (std::size_t i = verbAt + 1; i < arguments.size() && arguments[i] != "--"; ++i) {
      const std::string name = arguments[i].substr(0, arguments[i].find('='));
      if (!name.starts_with("--")) continue;
      if (std::find(known.begin(), known.end(), name) != known.end()) continue;
      text = verb->name + " has no option " + name + DidYouMean(name, known);
      break;
    }
  }
  std::replace(text.begin(), text.end(), '\n', ' ');
  return text + "; see vexg " + (verb != nullptr ? verb->name + " --help" : "--help");
}

}  // namespace

CommandLine ReadCommandLine(const Strings& arguments) {
  const Strings joined = JoinLists(MoveWordsOfVerb(arguments));
  const std::size_t verbAt = FindVerbPlace(joined);
  Parser parser(verbAt < joined.size() ? FindVerb(joined[verbAt]) : nullptr);
  try {
    parser.app.parse(Strings(joined.rbegin(), joined.rend()));  // as the parser takes them
  } catch (const CLI::CallForVersion& version) {
    return {nullptr, std::string(version.what()) + "\n"};
  } catch (const CLI::Success&) {
    const std::vector<CLI::App*> chosen = parser.app.get_subcommands();
    return {nullptr, HelpOf(chosen.empty() ? nullptr : FindVerb(chosen.front()->get_name()))};
  } catch (const CLI::ParseError& error) {
    throw HostError(kExitUsage, DescribeFault(arguments, error));
  }
  return {FindVerb(parser.app.get_subcommands().front()->get_name()), {}};
}

void ReadVerbArguments(const Verb& verb, const Strings& arguments) {
  CLI::App app{"", "vexg"};
  app.require_subcommand(1);
  app.fallthrough();
  AddTo(app, GetGeneralOptions());
  AddTo(*app.add_subcommand(verb.name, verb.summary), verb.options);
  Strings line{verb.name};
  line.insert(line.end(), arguments.begin(), arguments.end());
  line = JoinLists(line);
  try {
    app.parse(Strings(line.rbegin(), line.rend()));
  } catch (const CLI::Success&) {
    throw HostError(kExitUsage, "vexg help " + verb.name + " tells about " + verb.name);
  } catch (const CLI::ParseError& error) {
    throw HostError(kExitUsage, DescribeFault(line, error));
  }
}

std::string HelpOf(const Verb* verb) {
  const Parser parser(verb);
  if (verb == nullptr) return parser.app.help();
  return parser.app.get_subcommand(verb->name)->help(parser.app.get_name());
}

}  // namespace lumo::host
