#include "commands/job_parser.h"

#include "commands/shared_memory_channel.h"

namespace lumo {
namespace {

using Attributes = Map<String, String>;

void MergeInto(Attributes& target, const Attributes& source) {
  for (const auto& [name, value] : source) target[name] = value;
}

}  // namespace

void JobParser::StartElement(const String& name, const Attributes& attributes) {
  if (name == "Job") {
    current_.Reset();
    channel_.Reset();
    job_.Clear();
  } else if (name == "Command") {
    StartCommand(attributes);
  } else if (IsChannelElement(name)) {
    channel_ = OpenChannel(name, attributes);
  } else if (name == "Reasons") {
    job_.tellsReasons = true;
  } else if (!current_.IsNull()) {
    if (name == "Input") MergeInto(current_->inputs, attributes);
    if (name == "Output") MergeInto(current_->outputs, attributes);
    if (name == "DependsOn") AddDependency(attributes.Find("Name"));
  }
}

void JobParser::EndElement(const String& name) {
  if (name == "Command") {
    EndCommand();
  } else if (IsChannelElement(name)) {
    EndChannel();
  }
}

void JobParser::StartCommand(const Attributes& attributes) {
  current_.Reset(new CommandDescriptor);
  current_->name = attributes.Find("Name");
  current_->id = attributes.Find("ID");
  current_->command = CreateCommand(current_->id);
  if (!current_->command.IsNull() && current_->command->IsValid()) return;
  job_.unknown.PushBack({current_->name, current_->id});
  current_.Reset();
}

void JobParser::EndCommand() {
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
    for (const CommandDescriptorPtr& earlier : job_.commands) {
      current_->dependsOn.Insert(earlier->command);
    }
  } else if (job_.commandIndex.HasKey(name)) {
    current_->dependsOn.Insert(job_.commands[job_.commandIndex.Find(name)]->command);
  }
}

void JobParser::EndChannel() {
  job_.ipc = channel_;
  if (!job_.ipc.IsNull()) job_.ipc->progress->Update(0.0);
  channel_.Reset();
}

}  // namespace lumo
