#pragma once

#include "commands/value_text.h"
#include "commands/xml.h"

namespace lumo {

/// A Command element of a job document in the making.
class VEXG_EXPORT JobWriterCommand : public XMLElement {
 public:
  JobWriterCommand() : XMLElement("Command") {}

  /// Adds an Input element with one input, in the text form of its type.
  template <typename T>
  void AddInput(const String& inputName, const T& value) {
    AddChild("Input")->attributes[inputName] = FormatValue(value);
  }

  /// Has an input read a variable, which is named with its leading $.
  void AddVariableInput(const String& inputName, const String& variable) {
    AddInput(inputName, variable);
  }

  /// Has an input read the variables in a text: "$a $b" is an array of two.
  void AddExpandedInput(const String& inputName, const String& variables) {
    XMLElement* const input = AddChild("Input");
    input->attributes["expand"] = "1";
    input->attributes[inputName] = variables;
  }

  /// Stores an output in a variable, which is named with its leading $.
  void AddOutput(const String& outputName, const String& variable) {
    AddChild("Output")->attributes[outputName] = variable;
  }

  /// Has this command wait for an earlier one, or for all of them with "@ALL".
  void AddDependsOn(const String& commandName) {
    AddChild("DependsOn")->attributes["Name"] = commandName;
  }
};

/// Writes a job document.
///
///     JobWriter writer;
///     JobWriterCommand* const open = writer.AddCommand("open", "OpenRasterCommand");
///     open->AddInput("ConnStr", path);
///     open->AddOutput("URI", "$raster");
///     JobWriterCommand* const stats = writer.AddCommand("stats", "GetBasicRasterStatsCommand");
///     stats->AddVariableInput("URI", "$raster");
///     stats->AddDependsOn("open");
///     const String document = writer.Write();
///
/// Failure: ObjectErrorIO and an empty text.
class VEXG_EXPORT JobWriter : public ErrorState {
 public:
  JobWriter();

  /// Adds a command; the writer owns it.
  /// @param id  class name of the command.
  JobWriterCommand* AddCommand(const String& name, const String& id);

  /// The document, in UTF-8 on one line; an empty text on a failure.
  String Write();

 private:
  XMLDocumentRoot root_;
};

}  // namespace lumo
