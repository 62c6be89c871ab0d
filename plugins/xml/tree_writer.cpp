#include "tree_writer.h"

#include <algorithm>
#include <stdexcept>
#include <string>

#include <xercesc/framework/MemBufFormatTarget.hpp>
#include <xercesc/framework/XMLFormatter.hpp>
#include <xercesc/util/XMLChar.hpp>
#include <xercesc/util/XMLString.hpp>

namespace lumo {
namespace {

using xercesc::XMLChar1_0;
using xercesc::XMLFormatter;

const char16_t* Units(const String& text) {
  return text.GetData() != nullptr ? text.GetData() : u"";
}

/// `text` with U+FFFD for each unit that no XML document can hold.
std::u16string Carried(const String& text) {
  std::u16string units(Units(text), text.GetLength());
  for (std::size_t i = 0; i < units.size(); ++i) {
    if (XMLChar1_0::isXMLChar(units[i])) continue;
    if (i + 1 < units.size() && XMLChar1_0::isXMLChar(units[i], units[i + 1])) {
      ++i;
    } else {
      units[i] = u'\uFFFD';
    }
  }
  return units;
}

class TreeWriter {
 public:
  TreeWriter()
      : target_(1023),
        formatter_(u"UTF-8", u"1.0", &target_, XMLFormatter::NoEscapes,
                   XMLFormatter::UnRep_CharRef) {
    formatter_ << u"<?xml version=\"1.0\" encoding=\"UTF-8\" standalone=\"no\" ?>";
  }

  void Open(const String& name) {
    if (!XMLChar1_0::isValidName(Units(name))) throw std::invalid_argument("not an XML name");
    formatter_ << XMLFormatter::NoEscapes << u'<' << Units(name);
  }

  void Children(const String& name, const Deque<XMLElementPtr>& children, const String& text) {
    if (children.GetCount() == 0 && text.GetLength() == 0) {
      formatter_ << XMLFormatter::NoEscapes << u"/>";
      return;
    }
    formatter_ << XMLFormatter::NoEscapes << u'>' << XMLFormatter::CharEscapes
               << Carried(text).c_str();
    for (const XMLElementPtr& child : children) Element(*child);
    formatter_ << XMLFormatter::NoEscapes << u"</" << Units(name) << u'>';
  }

  void Attributes(const Map<String, String>& attributes) {
    for (const auto& [name, value] : attributes) {
      if (!XMLChar1_0::isValidName(Units(name))) throw std::invalid_argument("not an XML name");
      formatter_ << XMLFormatter::NoEscapes << u' ' << Units(name) << u"=\""
                 << XMLFormatter::AttrEscapes << Carried(value).c_str() << XMLFormatter::NoEscapes
                 << u'"';
    }
  }

  void Element(const XMLElement& element) {
    Open(element.name);
    Attributes(element.attributes);
    Children(element.name, element.children, element.text);
  }

  String Text() const {
    const auto* const bytes = reinterpret_cast<const char*>(target_.getRawBuffer());
    return String(std::string(bytes, target_.getLen()));
  }

 private:
  xercesc::MemBufFormatTarget target_;
  XMLFormatter formatter_;
};

}  // namespace

String WriteTree(const XMLDocumentRoot& root) {
  TreeWriter writer;
  writer.Open(root.name);
  writer.Attributes(root.attributes);
  writer.Children(root.name, root.children, String());
  return writer.Text();
}

}  // namespace lumo
