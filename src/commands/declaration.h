#pragma once

#include <span>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// Says whether an input has to be there before a command runs.
enum class Presence { kRequired, kOptional };

/// The kinds of values that inputs and outputs hold, by which their texts are read; Describe gives
/// the form of each.
enum class ValueKind {
  kText,
  kURI,
  kBoolean,
  kInteger,
  kNumber,
  kWord,
  kTextList,
  kIntegerArray,
  kNumberArray,
  kRectangle,
  kPalette,
  kBooleanArray,
  kTiles,
  kGeoRef,
  kPaletteArray,
  kURIArray,
};

/// The name of a kind and its text form, for people.
struct ValueKindText {
  const char* name;  ///< one or two words
  const char* form;  ///< how the text is written
};
/// The name and the form of a kind.
VEXG_EXPORT ValueKindText Describe(ValueKind kind);

/// Gives the words that an input takes; an unknown word reads as the first of them, unless the
/// enumeration names another value for it. See WordsIn in value_text.h.
using WordsFunction = std::vector<const char*> (*)();

/// One input of a command. Texts are single lines.
///
/// An input whose first word is "Told" chooses between the form of a result that has always been
/// given and a better one. Without the input the told form is given; the verbs of the command line
/// ask for the better one. The reference document lists these inputs in one table.
struct InputDeclaration {
  const char* name;  ///< attribute in the job document
  Presence presence;
  ValueKind kind;
  const char* meaning;            ///< for people, without a capital or a full stop
  const char* unit = "";          ///< unit of a number; empty for none
  WordsFunction words = nullptr;  ///< of a kWord
};

/// One output of a command.
struct OutputDeclaration {
  const char* name;  ///< attribute in the job document
  ValueKind kind;
  const char* meaning;    ///< for people
  const char* unit = "";  ///< unit of a number; empty for none
  bool returned = true;   ///< stands in the result document too
};

/// Describes a command, once: the input checks, the lists of commands, the help, the completion of
/// the shell and the reference document are all made from it. See Command for an example.
struct CommandDeclaration {
  const char* name;                      ///< class name, and key in the registry
  const char* group;                     ///< heading under which lists show it
  const char* meaning;                   ///< one line
  std::vector<InputDeclaration> inputs;  ///< in the order in which they are checked
  std::vector<OutputDeclaration> outputs;
};

}  // namespace lumo
