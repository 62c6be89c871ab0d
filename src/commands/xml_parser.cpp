#include <cstring>
#include <new>
#include <string>

#include <xercesc/framework/MemBufInputSource.hpp>
#include <xercesc/parsers/SAXParser.hpp>
#include <xercesc/sax/AttributeList.hpp>
#include <xercesc/sax/HandlerBase.hpp>
#include <xercesc/sax/SAXParseException.hpp>
#include <xercesc/util/OutOfMemoryException.hpp>
#include <xercesc/util/SecurityManager.hpp>

#include "commands/xml.h"
#include "commands/xml_runtime.h"
#include "foundation/fault.h"
#include "foundation/thrown.h"
#include "platform/memory_shortage.h"

namespace lumo {
namespace {

/// A document that is refused by a rule of this library rather than of XML.
struct RefusedDocument {
  const char* why;
};

/// Forwards the events of the XML library to an XMLSimpleParser.
class XercesXMLHandler : public xercesc::HandlerBase {
 public:
  explicit XercesXMLHandler(XMLSimpleParser& target) : target_(target) {}

  void startDocument() override { target_.StartDocument(); }
  void endDocument() override { target_.EndDocument(); }

  void startElement(const XMLCh* const name, xercesc::AttributeList& list) override {
    if (++depth_ > kMaxXMLDepth) throw RefusedDocument{"elements are nested too deep"};
    if (list.getLength() > kMaxXMLAttributes) throw RefusedDocument{"too many attributes"};
    Map<String, String> attributes;
    for (XMLSize_t i = 0; i < list.getLength(); ++i) {
      attributes[list.getName(i)] = list.getValue(i);
    }
    target_.StartElement(name, attributes);
  }

  void endElement(const XMLCh* const name) override {
    --depth_;
    target_.EndElement(name);
  }

  void characters(const XMLCh* const text, const XMLSize_t length) override {
    target_.Characters(String(text, length));
  }

  void fatalError(const xercesc::SAXParseException& error) override {
    const std::string line = std::to_string(error.getLineNumber());
    const std::string column = std::to_string(error.getColumnNumber());
    fault_ = String("line " + line + ", column " + column + ": ") + String(error.getMessage());
    HandlerBase::fatalError(error);
  }

  const String& GetFault() const { return fault_; }

 private:
  XMLSimpleParser& target_;
  unsigned depth_ = 0;
  String fault_;
};

/// The parser with everything off that reaches outside the document.
class IsolatedParser : public xercesc::SAXParser {
 public:
  explicit IsolatedParser(XercesXMLHandler& handler) {
    security_.setEntityExpansionLimit(0);
    setSecurityManager(&security_);
    setLoadExternalDTD(false);
    setDisableDefaultEntityResolution(true);
    setDocumentHandler(&handler);
    setErrorHandler(&handler);
    setDTDHandler(&handler);  // without one, doctypeDecl is never called
  }

 protected:
  /// Comes before anything that the declaration holds is looked at.
  void doctypeDecl(const xercesc::DTDElementDecl&, const XMLCh* const, const XMLCh* const,
                   const bool, const bool) override {
    throw RefusedDocument{"a DOCTYPE is not allowed"};
  }

 private:
  xercesc::SecurityManager security_;
};

}  // namespace

void XMLSimpleParser::Parse(const String& document) {
  ClearErrorState();
  fault_ = String();
  const char* const text = document.GetUTF8();
  const std::size_t length = text != nullptr ? std::strlen(text) : 0;
  if (length == 0) return SetFault("the document is empty");
  if (length > kMaxXMLBytes) return SetFault("the document is too large");

  const XMLRuntime runtime;
  if (!runtime.IsReady()) return SetFault("the XML parser is not ready");
  XercesXMLHandler handler(*this);
  try {
    IsolatedParser parser(handler);
    xercesc::MemBufInputSource source(reinterpret_cast<const XMLByte*>(text), length, "Foo");
    // The text is UTF-8 by now, whatever its declaration says of the bytes that it came from.
    source.setEncoding(u"UTF-8");
    parser.parse(source);
    if (parser.getErrorCount() != 0) SetFault("the document is not well formed");
  } catch (const RefusedDocument& refused) {
    SetFault(refused.why);
  } catch (const xercesc::OutOfMemoryException&) {
    platform::NoteMemoryShortage();
    SetFault(platform::kOutOfMemory);
  } catch (const std::bad_alloc&) {
    SetFault(DescribeException().c_str());
  } catch (...) {
    SetFault(handler.GetFault().GetLength() != 0 ? handler.GetFault()
                                                 : String("the document can't be parsed"));
  }
}

void XMLSimpleParser::SetFault(const String& fault) {
  fault_ = fault;
  SetErrorState(ObjectErrorIO());
}

}  // namespace lumo
