#include "jobs/document.h"

#include <cerrno>
#include <fstream>
#include <iostream>
#include <iterator>

#include "commands/shared_memory_channel.h"
#include "platform/memory_shortage.h"
#include "verb.h"

namespace lumo::host {
namespace {

/// Builds the tree of a document.
class TreeParser : public XMLSimpleParser {
 public:
  void StartElement(const String& name, const Map<String, String>& attributes) override {
    XMLElement* element = nullptr;
    if (open_.empty()) {
      root_.Reset(new XMLElement(name));
      element = root_.Get();
    } else {
      element = open_.back()->AddChild(name);
    }
    element->attributes = attributes;
    open_.push_back(element);
  }
  void EndElement(const String& /*name*/) override { open_.pop_back(); }
  void Characters(const String& text) override {
    if (!open_.empty()) open_.back()->text += text;
  }

  const XMLElementPtr& GetRoot() const { return root_; }

 private:
  XMLElementPtr root_;
  std::vector<XMLElement*> open_;
};

template <typename Visit>
void ForEach(const XMLElement& element, Visit&& visit) {
  visit(element);
  for (const XMLElementPtr& child : element.children) ForEach(*child, visit);
}

}  // namespace

std::string ReadFile(const std::string& file) {
  const auto fail = [&](const char* what) {
    const std::string why = errno != 0 ? ": " + platform::SystemErrorText(errno) : std::string();
    throw HostError(kExitUsage,
                    file + ": can't be " + what + why + "; name a file, or - for standard input");
  };
  std::ifstream opened;
  errno = 0;
  if (file != "-") {
    opened.open(file, std::ios::binary);
    if (!opened) fail("opened");
  }
  std::istream& in = file != "-" ? opened : std::cin;
  try {
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
  } catch (const std::ios::failure&) {  // a directory, for example
    fail("read");
    throw;
  }
}

Document::Document(const String& text, const std::string& source) {
  TreeParser parser;
  parser.Parse(text);
  if (parser.HasError()) {
    throw HostError(kExitUsage, source + ": not well formed: " + parser.GetFault().ToUTF8() +
                                    "; nothing was run");
  }
  root_ = parser.GetRoot();
}

std::vector<NamedCommand> Document::GetCommands() const {
  std::vector<NamedCommand> commands;
  ForEach(*root_, [&](const XMLElement& element) {
    if (element.name != "Command") return;
    commands.push_back(
        {element.attributes.Find("Name").ToUTF8(), element.attributes.Find("ID").ToUTF8()});
  });
  return commands;
}

const XMLElement* Document::FindChannel() const {
  const XMLElement* channel = nullptr;
  ForEach(*root_, [&](const XMLElement& element) {
    if (IsChannelElement(element.name)) channel = &element;
  });
  return channel;
}

String Document::Write() const {
  XMLDocumentRoot root;
  root.name = root_->name;
  root.attributes = root_->attributes;
  root.children = root_->children;
  return XMLSimpleWriter().Write(root);
}

}  // namespace lumo::host
