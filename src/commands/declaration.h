#pragma once

#include <span>
#include <vector>

#include "platform/export.h"

namespace lumo {

/// What a command needs of an input before it runs.
enum class Presence { kRequired, kOptional };

/// How the text of an input or output is to be read.
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
  const char* name;
  const char* form;
};
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
  const char* name;
  Presence presence;
  ValueKind kind;
  const char* meaning;
  const char* unit = "";          ///< unit of a number; empty for none
  WordsFunction words = nullptr;  ///< of a kWord
};

/// One output of a command.
struct OutputDeclaration {
  const char* name;
  ValueKind kind;
  const char* meaning;
  const char* unit = "";
  bool returned = true;  ///< stands in the result document too
};

/// What a command says of itself, once: the input checks, the lists of commands, the help, the
/// completion of the shell and the reference document are all made from it.
struct CommandDeclaration {
  const char* name;                      ///< class name, and key in the registry
  const char* group;                     ///< heading under which lists show it
  const char* meaning;                   ///< one line
  std::vector<InputDeclaration> inputs;  ///< in the order in which they are checked
  std::vector<OutputDeclaration> outputs;
};

}  // namespace lumo
