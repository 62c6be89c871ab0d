#include <cstring>
#include <string>

#include "commands/plain_xml.h"
#include "commands/xml.h"
#include "commands/xml_engine.h"
#include "foundation/fault.h"
#include "foundation/thrown.h"
#include "platform/memory_shortage.h"

namespace lumo {
namespace {

/// Forwards what a document holds to an XMLSimpleParser.
class ParserListener final : public XmlListener {
 public:
  explicit ParserListener(XMLSimpleParser& target) : target_(target) {}

  void OnBegin() override { target_.StartDocument(); }
  void OnEnd() override { target_.EndDocument(); }

  bool OnElement(const char16_t* name, const Attribute* attributes, std::size_t count) override {
    if (++depth_ > kMaxXMLDepth) return Refuse("elements are nested too deep");
    if (count > kMaxXMLAttributes) return Refuse("too many attributes");
    Map<String, String> values;
    for (std::size_t i = 0; i < count; ++i) values[attributes[i].name] = attributes[i].value;
    target_.StartElement(name, values);
    return true;
  }

  void OnElementEnd(const char16_t* name) override {
    --depth_;
    target_.EndElement(name);
  }

  void OnText(const char16_t* units, std::size_t count) override {
    target_.Characters(String(units, count));
  }

  void OnMessage(Weight weight, std::uint64_t line, std::uint64_t column,
                 const char16_t* text) override {
    if (weight != Weight::kFatal) return;
    fault_ = String("line " + std::to_string(line) + ", column " + std::to_string(column) + ": ") +
             String(text);
  }

  const String& GetFault() const { return fault_; }

 private:
  bool Refuse(const char* why) {
    fault_ = why;
    return false;
  }

  XMLSimpleParser& target_;
  unsigned depth_ = 0;
  String fault_;
};

}  // namespace

void XMLSimpleParser::Parse(const String& document) {
  ClearErrorState();
  fault_ = String();
  const char* const text = document.GetUTF8();
  const std::size_t length = text != nullptr ? std::strlen(text) : 0;
  if (length == 0) return SetFault("the document is empty");
  if (length > kMaxXMLBytes) return SetFault("the document is too large");

  try {
    if (ReadPlainXml({text, length}, *this)) return;
  } catch (...) {
    return SetFault(DescribeException().c_str());
  }
  XmlEngine* const engine = GetXmlEngine();
  if (engine == nullptr) return SetFault(TakeFault());
  ParserListener listener(*this);
  const XmlOutcome outcome = engine->ReadPlain(text, length, listener);
  switch (outcome.kind) {
    case XmlOutcome::Kind::kDone:
      return;
    case XmlOutcome::Kind::kErrors:
      return SetFault("the document is not well formed");
    case XmlOutcome::Kind::kDoctype:
      return SetFault("a DOCTYPE is not allowed");
    case XmlOutcome::Kind::kNoMemory:
      return SetFault(platform::kOutOfMemory);
    default:
      SetFault(listener.GetFault().GetLength() != 0 ? listener.GetFault()
                                                    : String("the document can't be parsed"));
  }
}

void XMLSimpleParser::SetFault(const String& fault) {
  fault_ = fault;
  SetErrorState(ObjectErrorIO());
}

}  // namespace lumo
