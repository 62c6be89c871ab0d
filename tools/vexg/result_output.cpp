#include "result_output.h"

#include <cstdio>
#include <iostream>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

#include "commands/command.h"
#include "option_values.h"
#include "platform/process.h"
#include "verb.h"

namespace lumo::host {
namespace {

constexpr const char* kFault = "Fault";

std::string ToJson(const Document& result) {
  nlohmann::ordered_json commands = nlohmann::ordered_json::array();
  nlohmann::ordered_json faults = nlohmann::ordered_json::array();
  for (const XMLElementPtr& command : result.GetRoot().children) {
    if (command->name == kFault) {
      faults.push_back(command->attributes.Find("Reason").ToUTF8());
      continue;
    }
    const auto attribute = [&](const char* name) {
      return command->attributes.Find(name).ToUTF8();
    };
    nlohmann::ordered_json returns = nlohmann::ordered_json::object();
    for (const XMLElementPtr& child : command->children) {
      for (const auto& [name, value] : child->attributes) returns[name.ToUTF8()] = value.ToUTF8();
    }
    nlohmann::ordered_json entry{{"name", attribute("Name")},
                                 {"result", attribute("Result")},
                                 {"wall", attribute("Wall")},
                                 {"cpu", attribute("CPU")},
                                 {"usage", attribute("Usage")}};
    if (command->attributes.HasKey("Reason")) entry["reason"] = attribute("Reason");
    entry["return"] = returns;
    commands.push_back(entry);
  }
  nlohmann::ordered_json all{{"commands", commands}};
  if (!faults.empty()) all["faults"] = faults;
  return all.dump(2) + "\n";
}

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

bool IsKnownHere(const NamedCommand& command) {
  return GetCommandRegistry().HasKey(command.id);
}

/// The commands of the job that have no counterpart in the result. Both lists have the same order
/// and only names to compare; where names repeat, one that is unknown here too is the likelier.
std::vector<NamedCommand> FindDropped(const std::vector<NamedCommand>& asked,
                                      const std::vector<NamedCommand>& answered) {
  std::vector<NamedCommand> dropped;
  std::size_t missing = asked.size() - std::min(asked.size(), answered.size());
  std::size_t next = 0;
  for (const NamedCommand& command : asked) {
    const bool matches = next < answered.size() && answered[next].name == command.name;
    if (matches && (missing == 0 || IsKnownHere(command))) {
      ++next;
    } else {
      dropped.push_back(command);
      if (missing != 0) --missing;
    }
  }
  return dropped;
}

}  // namespace

Output::Output(const std::string& file) : file_(file == "-" ? "" : file) {
  if (file_.empty()) return;
  unfinished_ = file_ + "." + std::to_string(platform::ProcessNumber()) + ".part";
  stream_.open(unfinished_, std::ios::binary | std::ios::trunc);
  if (!stream_) {
    unfinished_.clear();
    throw HostError(kExitUsage, file_ + ": can't be written; nothing was run");
  }
}

Output::~Output() {
  if (!unfinished_.empty()) std::remove(unfinished_.c_str());
}

void Output::Write(const std::string& text) {
  if (file_.empty()) {
    std::cout << text << std::flush;
    if (!std::cout) throw HostError(kExitFailed, "standard output can't be written");
    return;
  }
  stream_ << text;
  stream_.close();
  if (!stream_ || std::rename(unfinished_.c_str(), file_.c_str()) != 0) {
    throw HostError(kExitFailed, file_ + ": can't be written");
  }
  unfinished_.clear();
}

void JobOptions::AddTo(CLI::App& app) {
  app.add_option("job", file, "The job document, or - for standard input")
      ->type_name("JOB.xml")
      ->required();
  app.add_option("-o,--output", output, "Where the result goes, - for standard output")
      ->type_name("FILE");
  app.add_flag("--json", json, "Give the result as JSON");
  app.add_option("--progress", progress, "How progress shows on standard error")
      ->transform(OneOf({"auto", "bar", "json", "none"}))
      ->capture_default_str();
  app.add_flag("-q,--quiet", quiet, "Show no progress");
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

void WriteResult(const String& resultDocument, bool json, Output& output) {
  output.Write(json ? ToJson(Document(resultDocument, "the result"))
                    : resultDocument.ToUTF8() + "\n");
}

int ExitCodeOf(const Document& job, const String& resultDocument) {
  const std::vector<NamedCommand> asked = job.GetCommands();
  if (asked.empty()) {
    Say("the job holds no Command");
    return kExitUsage;
  }
  const Document result(resultDocument, "the result");
  bool failed = false;
  for (const NamedCommand& command : FindDropped(asked, result.GetCommands())) {
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
    if (next != asked.end()) SayReason(*next++, *command);
  }
  return failed ? kExitFailed : kExitSuccess;
}

}  // namespace lumo::host
