#pragma once

#include <string>
#include <vector>

#include "commands/xml.h"

namespace lumo::host {

/// All of a file, or of standard input for "-". Throws HostError.
std::string ReadFile(const std::string& file);

/// A Command element of a document, by the attributes that identify it.
struct NamedCommand {
  std::string name;
  std::string id;
};

/// Any XML document as a tree.
class Document {
 public:
  /// @param source  what to call the text in messages. Throws HostError when it isn't well formed.
  Document(const String& text, const std::string& source);

  const XMLElement& GetRoot() const { return *root_; }
  XMLElement& GetRoot() { return *root_; }

  /// All Command elements, however deep, in order.
  std::vector<NamedCommand> GetCommands() const;

  /// The channel element that counts, which is the last; null when there is none.
  const XMLElement* FindChannel() const;

  /// The document as a text again; text on its root itself is left out.
  String Write() const;

 private:
  XMLElementPtr root_;
};

}  // namespace lumo::host
