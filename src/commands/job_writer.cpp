#include "commands/job_writer.h"

namespace lumo {

JobWriter::JobWriter() {
  root_.name = "Job";
}

JobWriterCommand* JobWriter::AddCommand(const String& name, const String& id) {
  auto* const command = new JobWriterCommand;
  root_.children.PushBack(XMLElementPtr(command));
  command->attributes["Name"] = name;
  command->attributes["ID"] = id;
  return command;
}

String JobWriter::Write() {
  XMLSimpleWriter writer;
  const String text = writer.Write(root_);
  SetErrorState(writer);
  return text;
}

}  // namespace lumo
