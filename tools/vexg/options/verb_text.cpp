#include "options/verb_text.h"

#include <fmt/format.h>
#include <fmt/ranges.h>
#include <nlohmann/json.hpp>

#include "foundation/library.h"
#include "options/troff.h"

namespace lumo::host {
namespace {

using Json = nlohmann::ordered_json;

Json OptionAsJson(const OptionSpec& option) {
  Json json{{"names", option.names}, {"type", NameOf(option.type)}};
  if (!option.shown.empty()) json["shown"] = option.shown;
  if (!option.unit.empty()) json["unit"] = option.unit;
  if (!option.choices.empty()) json["choices"] = option.choices;
  if (option.least) json["least"] = *option.least;
  if (option.most) json["most"] = *option.most;
  if (!option.defaultText.empty()) json["default"] = option.defaultText;
  if (!option.example.empty()) json["example"] = option.example;
  json["required"] = option.isRequired;
  json["repeatable"] = option.isRepeatable;
  json["list"] = option.isList;
  json["help"] = option.help;
  return json;
}

Json OptionsAsJson(const OptionSet& options) {
  Json list = Json::array();
  for (const OptionSpec& option : options.Options()) list.push_back(OptionAsJson(option));
  return list;
}

std::string ShownInManual(const OptionSpec& option) {
  std::string text =
      fmt::format("\\fB{}\\fR", Troff(fmt::format("{}", fmt::join(option.names, ", "))));
  if (option.type == OptionType::kFlag || option.IsByPlace()) return text;
  const std::string value = !option.shown.empty() ? option.shown
                            : !option.choices.empty()
                                ? fmt::format("{}", fmt::join(option.choices, "|"))
                                : std::string("VALUE");
  return text + " \\fI" + Troff(value) + "\\fR";
}

std::string OptionAsManual(const OptionSpec& option) {
  std::string text = ".TP\n" + ShownInManual(option) + "\n" + Troff(option.help) + ".";
  if (!option.choices.empty() && !option.shown.empty()) {
    text += " One of " + Troff(fmt::format("{}", fmt::join(option.choices, ", "))) + ".";
  }
  if (option.least) text += fmt::format(" From {} to {}.", *option.least, *option.most);
  if (!option.unit.empty()) text += " In " + Troff(option.unit) + ".";
  if (!option.defaultText.empty()) text += " By default " + Troff(option.defaultText) + ".";
  if (!option.example.empty()) text += " For example " + Troff(option.example) + ".";
  return text + "\n";
}

std::string ManualOf(const Verb& verb) {
  std::string text = HeadOfManual("vexg-" + verb.name, 1, verb.summary);
  text += ".SH SYNOPSIS\n.B vexg " + Troff(verb.name) + "\n[\\fIOPTIONS\\fR]";
  for (const OptionSpec& option : verb.options.Options()) {
    if (!option.IsByPlace()) continue;
    const std::string name = "\\fI" + Troff(option.Name()) + "\\fR";
    text += option.isRequired ? " " + name : " [" + name + "]";
    if (option.isRepeatable) text += " ...";
  }
  text += "\n.SH DESCRIPTION\n";
  text += Troff(verb.summary) + ".\n";
  for (const std::string& note : verb.options.Notes()) text += ".PP\n" + Troff(note) + "\n";
  text += ".SH OPTIONS\n";
  for (const OptionSpec& option : verb.options.Options()) text += OptionAsManual(option);
  for (const OptionSpec& option : GetGeneralOptions().Options()) text += OptionAsManual(option);
  text += ".SH EXAMPLES\n.nf\n";
  for (const std::string& example : verb.options.Examples()) text += Troff(example) + "\n";
  return text +
         ".fi\n.SH EXIT STATUS\n0 for success, 1 when a command failed, 2 for a wrong command "
         "line or document, 3 when no server answers.\n.SH SEE ALSO\n.BR vexg (1)\n";
}

}  // namespace

std::string VerbsAsJson() {
  Json verbs = Json::array();
  for (const Verb& verb : GetVerbs()) {
    verbs.push_back({{"name", verb.name},
                     {"summary", verb.summary},
                     {"options", OptionsAsJson(verb.options)},
                     {"notes", verb.options.Notes()},
                     {"examples", verb.options.Examples()}});
  }
  const Json all{{"version", GetLibraryVersion()},
                 {"options", OptionsAsJson(GetGeneralOptions())},
                 {"verbs", verbs}};
  return all.dump(2) + "\n";
}

std::string VerbAsManual(const Verb* verb) {
  if (verb != nullptr) return ManualOf(*verb);
  std::string text = HeadOfManual("vexg", 1, "processing core for remote-sensing images");
  text += ".SH SYNOPSIS\n.B vexg\n[\\fIOPTIONS\\fR] \\fIVERB\\fR ...\n.SH OPTIONS\n";
  for (const OptionSpec& option : GetGeneralOptions().Options()) text += OptionAsManual(option);
  text += ".SH VERBS\n";
  for (const Verb& each : GetVerbs()) {
    text += ".TP\n.BR vexg\\-" + Troff(each.name) + " (1)\n" + Troff(each.summary) + ".\n";
  }
  return text +
         ".SH SEE ALSO\nEach command of jobs has a page of its own, for example\n"
         ".BR OpenRasterCommand (7);\n.B vexg commands\nlists them.\n";
}

}  // namespace lumo::host
