#include "plan/job_commands.h"

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <set>

#include <fmt/format.h>

#include "commands/division.h"
#include "commands/job_writer.h"
#include "verb.h"

namespace lumo::host {
namespace {

void AddCommand(const XMLElement& element, std::vector<JobCommand>& commands) {
  JobCommand command{element.attributes.Find("Name").ToUTF8(),
                     element.attributes.Find("ID").ToUTF8()};
  for (const XMLElementPtr& child : element.children) {
    const bool isExpanded = child->attributes.Find("expand") == "1";
    for (const auto& [name, value] : child->attributes) {
      if (child->name == "Input" && name != "expand") {
        command.Remove(name.ToUTF8());  // a second value replaces the first
        command.inputs.push_back({name.ToUTF8(), value.ToUTF8(), isExpanded});
      } else if (child->name == "Output") {
        command.outputs.push_back({name.ToUTF8(), value.ToUTF8()});
      }
    }
  }
  commands.push_back(std::move(command));
}

void AddCommands(const XMLElement& element, std::vector<JobCommand>& commands) {
  if (element.name == "Command") return AddCommand(element, commands);
  for (const XMLElementPtr& child : element.children) AddCommands(*child, commands);
}

/// The variable that begins at a dollar sign in a text; empty for none.
std::string VariableAt(const std::string& text, std::size_t dollar) {
  std::size_t end = dollar + 1;
  if (text.compare(end, 1, "{") == 0) {
    const std::size_t close = text.find('}', end);
    if (close == text.npos) return {};
    return fmt::format("${}", std::string_view(text).substr(end + 1, close - end - 1));
  }
  const auto isOfName = [](char c) {
    return std::isalnum(static_cast<unsigned char>(c)) != 0 || c == '_';
  };
  while (end < text.size() && isOfName(text[end])) ++end;
  return end == dollar + 1 ? std::string() : text.substr(dollar, end - dollar);
}

bool IsFile(const std::string& name) {
  std::error_code ignored;
  return !name.empty() && std::filesystem::is_regular_file(name, ignored);
}

/// The piece of a connection string that names the file: behind the key of a format.
std::string FileAmong(const std::vector<std::string>& pieces) {
  for (const std::string& piece : pieces) {
    if (piece.find('/') != piece.npos) return piece;
  }
  return pieces.empty() ? std::string() : pieces.back();
}

/// True for a command that makes its files where they will be.
bool IsFirst(const JobCommand& command) {
  if (command.Find(kShareInput) != nullptr) return false;
  const DivisionDeclaration* const division = FindDivision(String(command.id));
  return division != nullptr && division->kind == DivisionKind::kFirst;
}

/// True for the opening of a raster with a pyramid that isn't there where no command builds it: a
/// share of its levels makes none.
bool IsLeftUnbuilt(const JobCommand& command, const std::vector<JobCommand>& all) {
  if (command.id != "OpenRasterCommand") return false;
  return std::none_of(all.begin(), all.end(), [](const JobCommand& other) {
    return other.id == "BuildRasterPyramidCommand" && other.Find(kShareInput) == nullptr;
  });
}

/// The inputs of a command that name files which it makes.
std::vector<std::string> MadeBy(const JobCommand& command) {
  if (command.Find(kShareInput) != nullptr) return {kShareFileInput};
  const DivisionDeclaration* const division = FindDivision(String(command.id));
  if (division == nullptr) return {};
  const std::string when = division->makesWhen;
  const std::string* const does = when.empty() ? nullptr : command.Find(when);
  if (!when.empty() && (does == nullptr || *does != "1")) return {};
  return {division->makes.begin(), division->makes.end()};
}

/// True for an input that names a file which the command makes, but not a share of it: that reads
/// no file which lies there from before.
bool IsLeftToOthers(const JobCommand& command, const std::string& input) {
  const DivisionDeclaration* const division = FindDivision(String(command.id));
  return command.Find(kShareInput) != nullptr && division != nullptr &&
         std::find(division->makes.begin(), division->makes.end(), input) != division->makes.end();
}

}  // namespace

const std::string* JobCommand::Find(const std::string& input) const {
  const auto at = std::find_if(inputs.begin(), inputs.end(),
                               [&](const JobInput& other) { return other.name == input; });
  return at != inputs.end() ? &at->value : nullptr;
}

void JobCommand::Set(const std::string& input, const std::string& value) {
  Remove(input);
  inputs.push_back({input, value});
}

void JobCommand::Remove(const std::string& input) {
  std::erase_if(inputs, [&](const JobInput& other) { return other.name == input; });
}

std::vector<std::string> VariablesOf(const JobInput& input) {
  if (!input.isExpanded) {
    return input.value.starts_with('$') ? std::vector{input.value} : std::vector<std::string>();
  }
  std::vector<std::string> variables;
  for (std::size_t at = 0; (at = input.value.find('$', at)) != input.value.npos;) {
    if (input.value.compare(at + 1, 1, "$") == 0) {
      at += 2;
      continue;
    }
    const std::string variable = VariableAt(input.value, at++);
    if (!variable.empty()) variables.push_back(variable);
  }
  return variables;
}

JobCommands::JobCommands(const Document& document)
    : checks_(document.GetRoot().attributes.Find("Checks").ToUTF8()) {
  if (checks_.empty() && ChecksAreStrict()) checks_ = "Strict";
  for (const XMLElementPtr& child : document.GetRoot().children) AddCommands(*child, commands);
}

JobCommands JobCommands::WithoutCommands() const {
  JobCommands empty;
  empty.checks_ = checks_;
  return empty;
}

void JobCommands::AddCloses(const std::vector<std::string>& variables) {
  for (auto raster = variables.rbegin(); raster != variables.rend(); ++raster) {
    commands.push_back({"close." + raster->substr(1), "CloseRasterCommand", {{"URI", *raster}}});
  }
}

std::string JobCommands::Write() const {
  XMLDocumentRoot root;
  root.name = "Job";
  if (!checks_.empty()) root.attributes["Checks"] = String(checks_);
  root.children.PushBack(XMLElementPtr(new XMLElement("Reasons")));
  std::set<std::string> names;
  std::string before;
  for (const JobCommand& command : commands) {
    auto* const element = new JobWriterCommand;
    root.children.PushBack(XMLElementPtr(element));
    std::string name = command.name.empty() ? "step" : command.name;
    for (int number = 2; !names.insert(name).second; ++number) {
      name = fmt::format("{}.{}", command.name.empty() ? "step" : command.name, number);
    }
    element->attributes["ID"] = String(command.id);
    element->attributes["Name"] = String(name);
    if (!before.empty()) element->AddDependsOn(String(before));
    before = name;
    for (const JobInput& input : command.inputs) {
      XMLElement* const child = element->AddChild("Input");
      child->attributes[String(input.name)] = String(input.value);
      if (input.isExpanded) child->attributes["expand"] = "1";
    }
    for (const JobOutput& output : command.outputs) {
      element->AddOutput(String(output.name), String(output.variable));
    }
  }
  return XMLSimpleWriter().Write(root).ToUTF8();
}

std::string NumberArray(const std::vector<unsigned>& numbers) {
  std::string text = fmt::format("1:{} [", numbers.size());
  for (std::size_t i = 0; i < numbers.size(); ++i) {
    text += fmt::format("{}{}", i == 0 ? "" : " ", numbers[i]);
  }
  return text + "] ";
}

std::string JoinedByBars(const std::vector<std::string>& texts) {
  std::string joined;
  for (const std::string& text : texts) joined += (joined.empty() ? "" : "|") + text;
  return joined;
}

std::vector<std::string> PiecesOf(const std::string& value) {
  std::vector<std::string> pieces;
  std::string piece;
  const auto end = [&] {
    if (!piece.empty()) pieces.push_back(piece);
    piece.clear();
  };
  if (value.find('|') == value.npos && value.find('[') == value.npos) return {value};
  for (const char c : value) {
    if (c == '|' || c == '[' || c == ']') {
      end();
    } else {
      piece += c;
    }
  }
  end();
  return pieces;
}

void RenameFiles(const std::map<std::string, std::string>& names, JobCommand& command) {
  for (JobInput& input : command.inputs) {
    std::string renamed;
    const auto isEnd = [](char c) { return c == '|' || c == '[' || c == ']'; };
    for (std::size_t at = 0; at < input.value.size();) {
      std::size_t end = at;
      while (end < input.value.size() && !isEnd(input.value[end])) ++end;
      const std::string piece = input.value.substr(at, end - at);
      const auto name = names.find(piece);
      renamed += name != names.end() ? name->second : piece;
      if (end < input.value.size()) renamed += input.value[end];
      at = end + 1;
    }
    input.value = renamed;
  }
}

JobFiles FindFiles(const std::vector<JobCommand>& commands) {
  JobFiles files;
  std::set<std::string> made, read;
  for (const JobCommand& command : commands) {
    if (IsLeftUnbuilt(command, commands)) continue;
    for (const std::string& input : MadeBy(command)) {
      const std::string* const value = command.Find(input);
      if (value == nullptr || value->starts_with('$')) continue;
      const std::string file = FileAmong(PiecesOf(*value));
      if (file.empty() || !made.insert(file).second) continue;
      (IsFirst(command) ? files.inPlace : files.made).push_back(file);
    }
  }
  for (const JobCommand& command : commands) {
    for (const JobInput& input : command.inputs) {
      if (!VariablesOf(input).empty() || IsLeftToOthers(command, input.name)) continue;
      for (const std::string& piece : PiecesOf(input.value)) {
        if (made.contains(piece) || read.contains(piece) || !IsFile(piece)) continue;
        read.insert(piece);
        files.read.push_back(piece);
      }
    }
  }
  return files;
}

}  // namespace lumo::host
