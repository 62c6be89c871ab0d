#include "commands/job_result.h"

#include <algorithm>
#include <cmath>

#include "foundation/near_name.h"

namespace lumo {
namespace {

/// A reason may hold names of files, and they anything.
String OneLine(const String& reason) {
  return String(Printable(reason.ToUTF8()));
}

XMLElementPtr DescribeCommand(CommandDescriptor& descriptor, bool tellReason) {
  auto* const element = new JobResultWriterValue;
  const XMLElementPtr owner(element);
  Command& command = *descriptor.command;
  const Command::Times start = command.GetStartTimes();
  const Command::Times end = command.GetEndTimes();
  element->attributes["Name"] = descriptor.name;
  element->attributes["Result"] = GetResultWord(command.GetResult());
  element->attributes["Wall"] = FormatDuration(end.wall - start.wall);
  element->attributes["CPU"] = FormatDuration(end.cpu - start.cpu);
  element->attributes["Usage"] = "0";
  const String& reason = descriptor.GetReason();
  if (tellReason && reason.GetLength() != 0) element->attributes["Reason"] = OneLine(reason);

  Map<String, String> returns;
  command.GetReturns(returns);
  for (const auto& [name, value] : returns) element->AddReturn(name, value);
  return owner;
}

/// A command of the document that is no command here.
XMLElementPtr DescribeUnknown(const UnknownCommand& command, bool withHint) {
  const XMLElementPtr element(new XMLElement("Command"));
  element->attributes["Name"] = command.name;
  element->attributes["Result"] = GetResultWord(CommandResult::kNone);
  element->attributes["Wall"] = FormatDuration(0.0);
  element->attributes["CPU"] = FormatDuration(0.0);
  element->attributes["Usage"] = "0";
  element->attributes["Reason"] = command.GetReason(withHint);
  return element;
}

/// Writes what the document gets wrong, in elements Fault ahead of the commands.
void AddFaults(const Job& job, XMLDocumentRoot& root) {
  const auto add = [&](const String& reason) {
    const XMLElementPtr fault(new XMLElement("Fault"));
    fault->attributes["Reason"] = OneLine(reason);
    root.children.PushBack(fault);
  };
  for (const String& fault : job.faults) add(fault);
  if (job.checks == JobChecks::kStrict) return;  // the commands have failed with their complaints
  for (const CommandDescriptorPtr& descriptor : job.commands) {
    if (descriptor->complaint.GetLength() == 0) continue;
    add("command \"" + descriptor->name + "\": " + descriptor->complaint);
  }
}

}  // namespace

String FormatDuration(double seconds) {
  struct Step {
    double limit;
    const char* unit;
  };
  static constexpr Step kSteps[] = {{1000.0, "ms"}, {1000.0, "s"}, {60.0, "min"}, {60.0, "hr"}};
  const char* unit = "us";
  double value = std::isfinite(seconds) && seconds > 0.0 ? seconds * 1000.0 * 1000.0 : 0.0;
  for (const Step& step : kSteps) {
    if (value <= step.limit) break;
    value /= step.limit;
    unit = step.unit;
  }
  return String::Format("%llu", static_cast<unsigned long long>(std::min(value, 1e18))) + unit;
}

void JobResultWriterValue::AddReturn(const String& returnName, const String& value) {
  if (returns_ == nullptr) returns_ = AddChild("Return");
  returns_->attributes[returnName] = value;
}

String JobResultWriter::Write() {
  XMLDocumentRoot root;
  root.name = "JobResult";
  if (job_.tellsReasons) AddFaults(job_, root);
  unsigned hints = kMostHints;
  auto unknown = job_.unknown.begin();
  const auto addUnknown = [&](unsigned position) {
    for (; job_.tellsReasons && unknown != job_.unknown.end(); ++unknown) {
      if (unknown->position > position) return;
      root.children.PushBack(DescribeUnknown(*unknown, hints != 0));
      if (hints != 0) --hints;
    }
  };
  for (unsigned i = 0; i < job_.commands.GetCount(); ++i) {
    addUnknown(i);
    root.children.PushBack(DescribeCommand(*job_.commands[i], job_.tellsReasons));
  }
  addUnknown(job_.commands.GetCount());
  XMLSimpleWriter writer;
  const String text = writer.Write(root);
  SetErrorState(writer);
  return text;
}

void JobResultParser::StartElement(const String& name, const Map<String, String>& attributes) {
  if (name == "Command") {
    key_ = attributes.Find("Name");
    current_.result = attributes.Find("Result");
    current_.cpu = attributes.Find("CPU");
    current_.wall = attributes.Find("Wall");
    current_.usage = attributes.Find("Usage");
    current_.reason = attributes.Find("Reason");
    current_.returns.Clear();
  } else if (name == "Return") {
    for (const auto& [returnName, value] : attributes) current_.returns[returnName] = value;
  }
}

void JobResultParser::EndElement(const String& name) {
  if (name == "Command") results_[key_] = current_;
}

}  // namespace lumo
