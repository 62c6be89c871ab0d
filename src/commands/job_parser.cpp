#include "commands/job_parser.h"

#include <algorithm>
#include <map>

#include "commands/shared_memory_channel.h"
#include "foundation/near_name.h"

namespace lumo {
namespace {

using Attributes = Map<String, String>;

constexpr const char* kChecks = "Checks";
constexpr const char* kExpand = "expand";

void MergeInto(Attributes& target, const Attributes& source) {
  for (const auto& [name, value] : source) target[name] = value;
}

}  // namespace

void JobParser::Parse(const String& document) {
  XMLSimpleParser::Parse(document);
  if (!HasError()) return;
  job_.faults.PushBack("the document is not well formed: " + GetFault());
  // A document that is refused at its head has shown no element so far.
  if (document.Find("<Reasons") != String::kNotFound) job_.tellsReasons = true;
}

void JobParser::StartElement(const String& name, const Attributes& attributes) {
  // A misspelt attribute first: what it leaves out is complained of too.
  if (name != "Job" && name != "Command") NoteAttributes(name, attributes);
  StartKnownElement(name, attributes);
  if (name == "Job" || name == "Command") NoteAttributes(name, attributes);  // they begin anew
}

void JobParser::StartKnownElement(const String& name, const Attributes& attributes) {
  if (name == "Job") {
    StartJob(attributes);
  } else if (name == "Command") {
    StartCommand(attributes);
  } else if (IsChannelElement(name)) {
    channel_ = OpenChannel(name, attributes);
  } else if (name == "Reasons") {
    job_.tellsReasons = true;
  } else if (name != "Input" && name != "Output" && name != "DependsOn") {
    NoteElement(name);
  } else if (!current_.IsNull()) {
    if (name == "Input") AddInputs(attributes);
    if (name == "Output") MergeInto(current_->outputs, attributes);
    if (name == "DependsOn") AddDependency(attributes.Find("Name"));
  } else if (!isInCommand_) {
    job_.faults.PushBack("an element " + name + " stands in no Command");
  }
}

void JobParser::StartJob(const Attributes& attributes) {
  current_.Reset();
  channel_.Reset();
  isInCommand_ = false;
  job_.Clear();
  unknownNames_ = Set<String>();
  hints_ = kMostHints;
  if (!attributes.HasKey(kChecks)) return;
  const String word = attributes.Find(kChecks);
  job_.checks = ParseValue<JobChecks>(word);
  if (FormatValue(job_.checks) == word) return;
  const std::vector<std::string> words{"Told", "Strict"};
  const std::string text = word.ToUTF8();
  job_.faults.PushBack(String("Checks=\"" + Printable(text, 80) + "\" is none of Told, Strict" +
                              DidYouMean(text, words)));
}

/// Notes an element that is nearly one of those known. Any other is nobody's mistake.
void JobParser::NoteElement(const String& name) {
  static const std::vector<std::string> kElements{"Job",    "Command",   "Input",
                                                  "Output", "DependsOn", "Reasons",
                                                  "SHMIPC", "ORVAIPC",   "TQFProcessIPC"};
  const std::string text = name.ToUTF8();
  const std::string didYouMean = DidYouMean(text, kElements);
  if (didYouMean.empty()) return;
  Note("the element " + text + " means nothing" + didYouMean);
}

/// Notes attributes that are nearly one of those that the element has.
void JobParser::NoteAttributes(const String& element, const Attributes& attributes) {
  static const std::map<std::string, std::vector<std::string>> kAttributes{
      {"Job", {kChecks}},
      {"Command", {"ID", "Name"}},
      {"DependsOn", {"Name"}},
      {"SHMIPC", {"Name", "Size", "AbortOffset", "ProgressOffset"}},
      {"ORVAIPC", {"Name", "Size"}},
      {"TQFProcessIPC", {"Name"}}};
  const auto found = kAttributes.find(element.ToUTF8());
  if (found == kAttributes.end()) return;
  const std::vector<std::string>& known = found->second;
  for (const auto& [name, value] : attributes) {
    const std::string text = name.ToUTF8();
    if (std::find(known.begin(), known.end(), text) != known.end()) continue;
    const std::string didYouMean = DidYouMean(text, known);
    if (didYouMean.empty()) continue;
    Note("the attribute " + text + " of " + found->first + " means nothing" + didYouMean);
  }
}

/// Notes what is wrong with the command, or the document, that is being read.
void JobParser::Note(const std::string& what) {
  if (current_.IsNull()) {
    job_.faults.PushBack(String(what));
  } else {
    Complain(what);
  }
}

/// Notes what is wrong with the current command; the first stands.
void JobParser::Complain(const std::string& what) {
  if (current_->complaint.GetLength() == 0) current_->complaint = String(what);
}

/// An element with expand="1" has variables in its texts.
void JobParser::AddInputs(const Attributes& attributes) {
  const bool isExpanded = attributes.Find(kExpand) == "1";
  for (const auto& [name, value] : attributes) {
    if (isExpanded && name == kExpand) continue;
    const std::string text = name.ToUTF8();
    if (text == "Expand" || text == "EXPAND") {
      Complain("the attribute " + text + " of Input means nothing; did you mean expand?");
    } else if (text == kExpand) {
      Complain("expand=\"" + Printable(value.ToUTF8(), 80) + "\" means nothing; expand=\"1\" does");
    }
    current_->inputs[name] = value;
    if (isExpanded) {
      current_->expanded.Insert(name);
    } else {
      current_->expanded.Remove(name);
    }
  }
}

void JobParser::EndElement(const String& name) {
  if (name == "Command") {
    EndCommand();
  } else if (IsChannelElement(name)) {
    EndChannel(name);
  }
}

void JobParser::StartCommand(const Attributes& attributes) {
  isInCommand_ = true;
  current_.Reset(new CommandDescriptor);
  current_->name = attributes.Find("Name");
  current_->id = attributes.Find("ID");
  current_->command = CreateCommand(current_->id);
  if (!current_->command.IsNull() && current_->command->IsValid()) return;
  unknownNames_.Insert(current_->name);
  job_.unknown.PushBack({current_->name, current_->id, job_.commands.GetCount()});
  current_.Reset();
}

void JobParser::EndCommand() {
  isInCommand_ = false;
  if (current_.IsNull()) return;
  const unsigned position = job_.commands.GetCount();
  const String key = current_->name.GetLength() != 0
                         ? current_->name
                         : String::Format("UNNAMMED_COMMAND_%08x", position);
  job_.commands.PushBack(current_);
  job_.commandIndex[key] = position;
  current_.Reset();
}

void JobParser::AddDependency(const String& name) {
  if (name == "@ALL") {
    // In a long job a set for each would take memory in the square of it.
    constexpr unsigned kMostListed = 256;
    current_->dependsOnFirst = job_.commands.GetCount();
    if (current_->dependsOnFirst > kMostListed) return;
    for (const CommandDescriptorPtr& earlier : job_.commands) {
      current_->dependsOn.Insert(earlier->command);
    }
    return;
  }
  if (job_.commandIndex.HasKey(name)) {
    current_->dependsOn.Insert(job_.commands[job_.commandIndex.Find(name)]->command);
    return;
  }
  const std::string text = name.ToUTF8();
  if (unknownNames_.Contains(name)) {
    return Complain("skipped, as the ID of \"" + Printable(text, 80) + "\" is unknown");
  }
  std::vector<std::string> names;
  if (hints_ != 0) {
    --hints_;
    for (const auto& entry : job_.commandIndex) names.push_back(entry.first.ToUTF8());
  }
  Complain("DependsOn: no command before this one is called \"" + Printable(text, 80) + "\"" +
           DidYouMean(text, names));
}

void JobParser::EndChannel(const String& name) {
  job_.ipc = channel_;
  if (job_.ipc.IsNull()) {
    job_.faults.PushBack("the channel of the element " + name +
                         " can't be used: there is no such block of shared memory, it is too "
                         "small, or the offsets lie outside it");
  } else {
    job_.ipc->progress->Update(0.0);
  }
  channel_.Reset();
}

}  // namespace lumo
