#include "commands/job_result.h"

#include <algorithm>
#include <cmath>

namespace lumo {
namespace {

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
  const String& reason = command.GetReason();
  if (tellReason && reason.GetLength() != 0) element->attributes["Reason"] = reason;

  Map<String, String> returns;
  command.GetReturns(returns);
  for (const auto& [name, value] : returns) element->AddReturn(name, value);
  return owner;
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
  for (const CommandDescriptorPtr& descriptor : job_.commands) {
    root.children.PushBack(DescribeCommand(*descriptor, job_.tellsReasons));
  }
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
