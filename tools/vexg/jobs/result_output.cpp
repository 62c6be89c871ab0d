#include "jobs/result_output.h"

#include <algorithm>
#include <iostream>

#include "commands/command.h"
#include "jobs/raster_job.h"
#include "options/option_values.h"
#include "output/value_json.h"
#include "verb.h"

namespace lumo::host {
namespace {

constexpr const char* kFault = "Fault";

/// Says why a command failed.
void SayReason(const NamedCommand& command, const XMLElement& result) {
  const std::string word = result.attributes.Find("Result").ToUTF8();
  const std::string reason = result.attributes.Find("Reason").ToUTF8();
  if (word == "None" && !reason.empty()) {
    Say("command \"" + command.name + "\" was left out: " + reason + "; see vexg commands");
  } else if (word == "Failed") {
    Say("command \"" + command.name + "\" (" + command.id + ") failed" +
        (reason.empty() ? "" : ": " + reason));
  }
}

/// Reports the loss of a command that succeeded: one that closes a raster does so by its form, also
/// where the file could not be completed. @return false when there was something.
bool SayLoss(const NamedCommand& command, const XMLElement& result) {
  if (result.attributes.Find("Result") != "Success") return true;
  for (const XMLElementPtr& child : result.children) {
    const std::string fault = child->attributes.Find("Fault").ToUTF8();
    if (child->name != "Return" || fault.empty()) continue;
    Say("command \"" + command.name + "\" (" + command.id + "): " + fault);
    return false;
  }
  return true;
}

bool IsKnownHere(const NamedCommand& command) {
  return GetCommandRegistry().HasKey(command.id);
}

/// The commands of a job by what became of them, in order.
struct MatchedCommands {
  std::vector<NamedCommand> answered;  ///< as many as the result has, if it is of this job
  std::vector<NamedCommand> dropped;   ///< without a counterpart in the result
};

/// Both lists have the same order and only names to compare; where names repeat, a command that is
/// unknown here too is the likelier to have been dropped.
MatchedCommands MatchCommands(const std::vector<NamedCommand>& asked,
                              const std::vector<NamedCommand>& answered) {
  MatchedCommands matched;
  std::size_t missing = asked.size() - std::min(asked.size(), answered.size());
  std::size_t next = 0;
  for (const NamedCommand& command : asked) {
    const bool matches = next < answered.size() && answered[next].name == command.name;
    if (matches && (missing == 0 || IsKnownHere(command))) {
      matched.answered.push_back(command);
      ++next;
    } else {
      matched.dropped.push_back(command);
      if (missing != 0) --missing;
    }
  }
  return matched;
}

/// How the value of a returned output is to be read, by its name; text for what isn't declared.
ValueKind KindOf(const CommandDeclaration* command, const String& output) {
  if (command == nullptr) return ValueKind::kText;
  for (const OutputDeclaration& declared : command->outputs) {
    if (output == declared.name) return declared.kind;
  }
  return ValueKind::kText;
}

/// The declaration of a command; null for one that is unknown here.
const CommandDeclaration* FindDeclaration(const NamedCommand& command) {
  if (!IsKnownHere(command)) return nullptr;
  return &GetCommandRegistry().Find(String(command.id))->GetDeclaration();
}

Json AsJson(const XMLElement& command, const CommandDeclaration* declaration) {
  const auto attribute = [&](const char* name) { return command.attributes.Find(name); };
  Json returns = Json::object();
  for (const XMLElementPtr& child : command.children) {
    for (const auto& [name, value] : child->attributes) {
      returns[name.ToUTF8()] = ValueAsJson(value, KindOf(declaration, name));
    }
  }
  Json entry{{"name", attribute("Name").ToUTF8()},
             {"result", attribute("Result").ToUTF8()},
             {"wall", SecondsAsJson(attribute("Wall"))},
             {"cpu", SecondsAsJson(attribute("CPU"))},
             {"usage", ValueAsJson(attribute("Usage"), ValueKind::kNumber)}};
  if (command.attributes.HasKey("Reason")) entry["reason"] = attribute("Reason").ToUTF8();
  entry["return"] = returns;
  return entry;
}

}  // namespace

Json ResultAsJson(const Document& job, const String& resultDocument) {
  const Document result(resultDocument, "the result");
  const std::vector<NamedCommand> matched =
      MatchCommands(job.GetCommands(), result.GetCommands()).answered;
  Json commands = Json::array(), faults = Json::array();
  for (const XMLElementPtr& child : result.GetRoot().children) {
    if (child->name == kFault) {
      faults.push_back(child->attributes.Find("Reason").ToUTF8());
      continue;
    }
    const bool isMatched = commands.size() < matched.size();
    commands.push_back(
        AsJson(*child, isMatched ? FindDeclaration(matched[commands.size()]) : nullptr));
  }
  Json all{{"commands", commands}};
  if (!faults.empty()) all["faults"] = faults;
  return all;
}

Output::Output(const std::string& file, const std::string& input) {
  if (file.empty() || file == "-") return;
  file_ = std::make_unique<OutputFile>(file, OutputRules{.overwrite = true, .hasSides = false});
  if (!input.empty() && input != "-") file_->RefuseInput(input);
  file_->Begin(0);
}

void Output::Write(const std::string& text) {
  if (file_ == nullptr) {
    std::cout << text << std::flush;
    if (!std::cout) throw HostError(kExitFailed, "standard output can't be written");
    return;
  }
  FileWriter writer(*file_);
  writer.Write(text.data(), text.size());
  writer.Close();
  file_->MoveAtOnce(file_->Collect());
}

void JobOptions::AddTo(OptionSet& line) {
  line.Add("job", file, "The job document, or - for standard input").IsFile("JOB.xml").Required();
  line.Add("--output,-o", output, "Where the result goes, - for standard output").IsFile();
  line.Add("--json", json, "Give the result as JSON");
  line.Add("--progress", progress, "How progress shows on standard error")
      .Takes(OneOf({"auto", "bar", "json", "none"}))
      .ShowsDefault();
  line.Add("--quiet,-q", quiet, "Show no progress");
  AddDurableTo(line, isDurable);
}

Document ReadJob(const JobOptions& options, String& text) {
  const std::string source = options.file == "-" ? "standard input" : options.file;
  const std::string bytes = ReadFile(options.file);
  if (bytes.find('\0') != std::string::npos) {
    throw HostError(kExitUsage, source + ": holds a zero byte; nothing was run");
  }
  text = String(bytes);
  return {text, source};
}

bool AsksForStrictChecks(const Document& job) {
  return ChecksAreStrict() && !job.GetRoot().attributes.HasKey("Checks");
}

void WriteResult(const Document& job, const String& resultDocument, bool json, Output& output) {
  output.Write((json ? ResultAsJson(job, resultDocument).dump(2) : resultDocument.ToUTF8()) + "\n");
}

int ExitCodeOf(const Document& job, const String& resultDocument) {
  const std::vector<NamedCommand> asked = job.GetCommands();
  if (asked.empty()) {
    Say("the job holds no Command");
    return kExitUsage;
  }
  const Document result(resultDocument, "the result");
  bool failed = false;
  for (const NamedCommand& command : MatchCommands(asked, result.GetCommands()).dropped) {
    Say("command \"" + command.name + "\" was left out: the ID \"" + command.id +
        "\" is unknown; see vexg commands");
    failed = true;
  }
  auto next = asked.begin();
  for (const XMLElementPtr& command : result.GetRoot().children) {
    if (command->name == kFault) {
      Say("the job: " + command->attributes.Find("Reason").ToUTF8());
      failed = failed || ChecksAreStrict();
    }
    if (command->name != "Command") continue;
    if (command->attributes.Find("Result") != "Success") failed = true;
    while (next != asked.end() && next->name != command->attributes.Find("Name").ToUTF8()) ++next;
    if (next == asked.end()) continue;
    SayReason(*next, *command);
    failed = !SayLoss(*next++, *command) || failed;
  }
  return failed ? kExitFailed : kExitSuccess;
}

Outcome OutcomeOf(const String& resultDocument, bool aborted) {
  if (aborted) return Outcome::kAborted;
  const Document result(resultDocument, "the result");
  const auto& commands = result.GetRoot().children;
  const bool succeeded =
      std::all_of(commands.begin(), commands.end(), [](const XMLElementPtr& command) {
        return command->name != "Command" || command->attributes.Find("Result") == "Success";
      });
  return succeeded ? Outcome::kDone : Outcome::kFailed;
}

int ExitCodeAfter(Outcome outcome, int code) {
  if (outcome != Outcome::kAborted) return code;
  Say("the job was aborted; what it made is not whole");
  return kExitFailed;
}

}  // namespace lumo::host
