#include "jobs/command_text.h"

#include <algorithm>
#include <map>
#include <string_view>
#include <vector>

#include <fmt/format.h>
#include <fmt/ranges.h>

#include "commands/command.h"
#include "options/troff.h"

namespace lumo::host {
namespace {

using Group = std::vector<const CommandDeclaration*>;

/// All registered commands by group, each group by name.
std::map<std::string, Group> Groups() {
  std::map<std::string, Group> groups;
  for (const auto& [name, factory] : GetCommandRegistry()) {
    const CommandDeclaration& command = factory->GetDeclaration();
    groups[command.group].push_back(&command);
  }
  return groups;
}

std::string KindOf(ValueKind kind, const char* unit) {
  return *unit == 0 ? Describe(kind).name : fmt::format("{} in {}", Describe(kind).name, unit);
}

const char* PresenceWord(Presence presence) {
  return presence == Presence::kRequired ? "required" : "optional";
}

std::size_t WidestName(const CommandDeclaration& command) {
  std::size_t widest = 0;
  for (const auto& input : command.inputs)
    widest = std::max(widest, std::string(input.name).size());
  for (const auto& output : command.outputs) {
    widest = std::max(widest, std::string(output.name).size());
  }
  return widest;
}

std::string AsMarkdown(const CommandDeclaration& command) {
  std::string text = fmt::format("\n### {}\n\n{}\n", command.name, command.meaning);
  if (!command.inputs.empty()) text += "\n| Input | | Kind | Meaning |\n|---|---|---|---|\n";
  for (const InputDeclaration& input : command.inputs) {
    text += fmt::format("| `{}` | {} | {} | {} |\n", input.name, PresenceWord(input.presence),
                        KindOf(input.kind, input.unit), input.meaning);
  }
  if (!command.outputs.empty()) text += "\n| Output | | Kind | Meaning |\n|---|---|---|---|\n";
  for (const OutputDeclaration& output : command.outputs) {
    text += fmt::format("| `{}` | {} | {} | {} |\n", output.name, output.returned ? "returned" : "",
                        KindOf(output.kind, output.unit), output.meaning);
  }
  return text;
}

/// The words of an input, joined by `separator`; empty for one without.
std::string JoinWords(const InputDeclaration& input, const char* separator) {
  return input.words == nullptr ? "" : fmt::format("{}", fmt::join(input.words(), separator));
}

/// An entry of a list in a manual page: a name, its kind, and what it means.
std::string EntryInManual(const char* name, const std::string& kind, const std::string& meaning) {
  return fmt::format(".TP\n\\fB{}\\fR ({})\n{}.\n", Troff(name), Troff(kind), Troff(meaning));
}

bool IsToldForm(const InputDeclaration& input) {
  return input.words != nullptr && std::string_view(input.words().front()) == "Told";
}

/// The table of the inputs that choose between the told form of a result and a better one.
std::string ToldFormsAsMarkdown() {
  std::string text =
      "\n## Told forms\n\n"
      "These inputs choose between the form of a result that has always been given, `Told`, and a\n"
      "better one. Without the input the told form is given; the verbs of the command line ask "
      "for\n"
      "the better one.\n\n| Command | Input | Words | Meaning |\n|---|---|---|---|\n";
  for (const auto& [name, factory] : GetCommandRegistry()) {
    for (const InputDeclaration& input : factory->GetDeclaration().inputs) {
      if (!IsToldForm(input)) continue;
      text += fmt::format("| `{}` | `{}` | {} | {} |\n", factory->GetDeclaration().name, input.name,
                          JoinWords(input, ", "), input.meaning);
    }
  }
  return text;
}

}  // namespace

std::string CommandsAsList() {
  std::string text;
  for (const auto& [group, commands] : Groups()) {
    text += fmt::format("{}{}\n", text.empty() ? "" : "\n", group);
    for (const CommandDeclaration* command : commands) {
      text += fmt::format("  {:<40} {}\n", command->name, command->meaning);
    }
  }
  return text;
}

std::string CommandsAsNames() {
  std::string text;
  for (const auto& entry : GetCommandRegistry()) text += entry.first.ToUTF8() + "\n";
  return text;
}

std::string CommandsAsMarkdown() {
  std::string text =
      "# Commands\n\n"
      "Made by `vexg commands --markdown` from what the commands declare. How their values are\n"
      "written as text is told in [job-documents.md](job-documents.md).\n";
  for (const auto& [group, commands] : Groups()) {
    text += fmt::format("\n## {}\n", group);
    for (const CommandDeclaration* command : commands) text += AsMarkdown(*command);
  }
  return text + ToldFormsAsMarkdown();
}

std::string CommandAsHelp(const CommandDeclaration& command) {
  const std::size_t width = WidestName(command);
  std::string text = fmt::format("{}: {}\n", command.name, command.meaning);
  if (!command.inputs.empty()) text += "\nInputs, in the order in which they are checked:\n";
  for (const InputDeclaration& input : command.inputs) {
    text +=
        fmt::format("  {:<{}}  {}, {} ({}): {}\n", input.name, width, PresenceWord(input.presence),
                    KindOf(input.kind, input.unit), Describe(input.kind).form, input.meaning);
  }
  if (!command.outputs.empty()) text += "\nOutputs:\n";
  for (const OutputDeclaration& output : command.outputs) {
    text +=
        fmt::format("  {:<{}}  {}: {}{}\n", output.name, width, KindOf(output.kind, output.unit),
                    output.meaning, output.returned ? "" : " (not in the result document)");
  }
  return text;
}

std::string CommandAsManual(const CommandDeclaration& command) {
  std::string text = HeadOfManual(command.name, 7, command.meaning);
  text += fmt::format(".SH DESCRIPTION\nA command of jobs, of the group {}.\n{}\n",
                      Troff(command.group), Troff(command.meaning));
  if (!command.inputs.empty()) text += ".SH INPUTS\nIn the order in which they are checked.\n";
  for (const InputDeclaration& input : command.inputs) {
    const std::string words = JoinWords(input, ", ");
    text += EntryInManual(
        input.name,
        fmt::format("{}, {}; {}", PresenceWord(input.presence), KindOf(input.kind, input.unit),
                    words.empty() ? Describe(input.kind).form : words),
        input.meaning);
  }
  if (!command.outputs.empty()) text += ".SH OUTPUTS\n";
  for (const OutputDeclaration& output : command.outputs) {
    text += EntryInManual(
        output.name, KindOf(output.kind, output.unit),
        std::string(output.meaning) + (output.returned ? "" : " (not in the result document)"));
  }
  return text + ".SH SEE ALSO\n.BR vexg (1),\n.BR vexg\\-run (1)\n";
}

}  // namespace lumo::host
