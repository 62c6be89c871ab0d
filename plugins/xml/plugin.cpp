#include <stdexcept>
#include <utility>

#include <xercesc/framework/MemBufInputSource.hpp>
#include <xercesc/framework/URLInputSource.hpp>
#include <xercesc/parsers/SAXParser.hpp>
#include <xercesc/sax/AttributeList.hpp>
#include <xercesc/sax/HandlerBase.hpp>
#include <xercesc/sax/SAXParseException.hpp>
#include <xercesc/sax2/Attributes.hpp>
#include <xercesc/sax2/DefaultHandler.hpp>
#include <xercesc/sax2/SAX2XMLReader.hpp>
#include <xercesc/sax2/XMLReaderFactory.hpp>
#include <xercesc/util/BinInputStream.hpp>
#include <xercesc/util/OutOfMemoryException.hpp>
#include <xercesc/util/SecurityManager.hpp>
#include <xercesc/util/XMLURL.hpp>
#include <xercesc/util/XMLUni.hpp>

#include "commands/xml_engine.h"
#include "foundation/own_plugin.h"
#include "foundation/thrown.h"
#include "platform/memory_shortage.h"
#include "tree_writer.h"
#include "xml_runtime.h"

VEXG_OWN_PLUGIN;

namespace lumo {
namespace {

using Kind = XmlOutcome::Kind;

/// Ends the reading of a document that is refused.
struct Refusal {
  Kind kind;
};

/// Runs some work of the XML library, and says how it came out.
template <typename Work>
XmlOutcome Guard(Work&& work) {
  const XMLRuntime runtime;
  if (!runtime.IsReady()) return {Kind::kException, "the XML parser is not ready"};
  try {
    return {work() ? Kind::kDone : Kind::kErrors, {}};
  } catch (const Refusal& refusal) {
    return {refusal.kind, {}};
  } catch (const xercesc::OutOfMemoryException&) {
    platform::NoteMemoryShortage();
    return {Kind::kNoMemory, {}};
  } catch (const xercesc::XMLException& error) {
    return {Kind::kException, String(error.getMessage())};
  } catch (const xercesc::SAXParseException& error) {
    return {Kind::kSaxException, String(error.getMessage())};
  } catch (const std::bad_alloc&) {
    DescribeException();  // which notes it
    return {Kind::kNoMemory, {}};
  } catch (...) {
    return {Kind::kOther, String(DescribeException())};
  }
}

void Hear(XmlListener& listener, XmlListener::Weight weight,
          const xercesc::SAXParseException& error) {
  listener.OnMessage(weight, error.getLineNumber(), error.getColumnNumber(), error.getMessage());
}

/// Hands an element over. AttributesOf and NameOf are those of the one interface or the other.
template <typename Attributes, typename NameOf>
void Begin(XmlListener& listener, const XMLCh* name, const Attributes& attributes,
           const NameOf& nameOf) {
  std::vector<XmlListener::Attribute> list(attributes.getLength());
  for (XMLSize_t i = 0; i < list.size(); ++i) list[i] = {nameOf(i), attributes.getValue(i)};
  if (!listener.OnElement(name, list.data(), list.size())) throw Refusal{Kind::kRefused};
}

/// Forwards the events of a plain parser.
class PlainHandler final : public xercesc::HandlerBase {
 public:
  explicit PlainHandler(XmlListener& listener) : listener_(listener) {}

  void startDocument() override { listener_.OnBegin(); }
  void endDocument() override { listener_.OnEnd(); }
  void startElement(const XMLCh* const name, xercesc::AttributeList& list) override {
    Begin(listener_, name, list, [&](XMLSize_t i) { return list.getName(i); });
  }
  void endElement(const XMLCh* const name) override { listener_.OnElementEnd(name); }
  void characters(const XMLCh* const text, const XMLSize_t length) override {
    listener_.OnText(text, length);
  }
  void fatalError(const xercesc::SAXParseException& error) override {
    Hear(listener_, XmlListener::Weight::kFatal, error);
    HandlerBase::fatalError(error);
  }

 private:
  XmlListener& listener_;
};

/// The parser with everything off that reaches outside the document.
class IsolatedParser final : public xercesc::SAXParser {
 public:
  explicit IsolatedParser(PlainHandler& handler) {
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
    throw Refusal{Kind::kDoctype};
  }

 private:
  xercesc::SecurityManager security_;
};

/// Forwards the events of a reader that takes a document's own entities.
class EntityHandler final : public xercesc::DefaultHandler {
 public:
  explicit EntityHandler(XmlListener& listener) : listener_(listener) {}

  void startElement(const XMLCh* const, const XMLCh* const, const XMLCh* const qname,
                    const xercesc::Attributes& attributes) override {
    Begin(listener_, qname, attributes, [&](XMLSize_t i) { return attributes.getQName(i); });
  }
  void endElement(const XMLCh* const, const XMLCh* const, const XMLCh* const qname) override {
    listener_.OnElementEnd(qname);
  }
  void characters(const XMLCh* const units, const XMLSize_t count) override {
    listener_.OnText(units, count);
  }
  void internalEntityDecl(const XMLCh* const, const XMLCh* const value) override {
    if (value != nullptr && !listener_.OnEntity(value)) throw Refusal{Kind::kRefused};
  }
  /// Nothing outside the document counts.
  xercesc::InputSource* resolveEntity(const XMLCh* const, const XMLCh* const) override {
    static const XMLByte kNothing[] = {0};
    return new xercesc::MemBufInputSource(kNothing, 0, "nothing");
  }
  void fatalError(const xercesc::SAXParseException& error) override {
    Hear(listener_, XmlListener::Weight::kFatal, error);
  }
  void error(const xercesc::SAXParseException& error) override {
    Hear(listener_, XmlListener::Weight::kError, error);
  }
  void warning(const xercesc::SAXParseException& error) override {
    Hear(listener_, XmlListener::Weight::kWarning, error);
  }
  void resetErrors() override {}

 private:
  XmlListener& listener_;
};

/// A reader that validates nothing and loads nothing.
std::unique_ptr<xercesc::SAX2XMLReader> MakeReader(EntityHandler& handler,
                                                   xercesc::SecurityManager& security) {
  using xercesc::XMLUni;
  std::unique_ptr<xercesc::SAX2XMLReader> reader(xercesc::XMLReaderFactory::createXMLReader());
  for (const XMLCh* const feature :
       {XMLUni::fgXercesLoadExternalDTD, XMLUni::fgSAX2CoreValidation, XMLUni::fgXercesDynamic,
        XMLUni::fgXercesSchemaFullChecking, XMLUni::fgXercesSchema, XMLUni::fgXercesLoadSchema}) {
    reader->setFeature(feature, false);
  }
  reader->setFeature(XMLUni::fgXercesDisableDefaultEntityResolution, true);
  reader->setProperty(XMLUni::fgXercesSecurityManager, &security);
  reader->setContentHandler(&handler);
  reader->setErrorHandler(&handler);
  reader->setEntityResolver(&handler);
  reader->setDeclarationHandler(&handler);
  return reader;
}

class XercesEngine final : public XmlEngine {
 public:
  XmlOutcome ReadPlain(const char* bytes, std::size_t count, XmlListener& listener) override {
    return Guard([&] {
      PlainHandler handler(listener);
      IsolatedParser parser(handler);
      xercesc::MemBufInputSource source(reinterpret_cast<const XMLByte*>(bytes), count, "Foo");
      source.setEncoding(u"UTF-8");
      parser.parse(source);
      return parser.getErrorCount() == 0;
    });
  }

  XmlOutcome ReadWithEntities(const char* bytes, std::size_t count, const char* name, bool isUtf8,
                              unsigned mostExpansions, XmlListener& listener) override {
    return Guard([&] {
      EntityHandler handler(listener);
      xercesc::SecurityManager security;
      security.setEntityExpansionLimit(mostExpansions);
      const auto reader = MakeReader(handler, security);
      xercesc::MemBufInputSource source(reinterpret_cast<const XMLByte*>(bytes), count, name);
      if (isUtf8) source.setEncoding(u"UTF-8");
      reader->parse(source);
      return reader->getErrorCount() == 0;
    });
  }

  XmlOutcome ReadAddress(const String& address, std::size_t most, std::string& path,
                         std::string& bytes) override {
    return Guard([&] {
      const xercesc::XMLURL url(address.GetData());
      if (url.getProtocol() == xercesc::XMLURL::File) {
        path = String(url.getPath()).ToUTF8();
        return true;
      }
      const std::unique_ptr<xercesc::BinInputStream> stream(
          xercesc::URLInputSource(url).makeStream());
      if (stream == nullptr) return false;
      XMLByte part[16384];
      while (const XMLSize_t count = stream->readBytes(part, sizeof part)) {
        bytes.append(reinterpret_cast<const char*>(part), count);
        if (bytes.size() > most) break;
      }
      return true;
    });
  }

  bool Write(const XMLDocumentRoot& root, String& document) override {
    return Guard([&] {
             document = WriteTree(root);
             return true;
           }).kind == Kind::kDone;
  }
};

}  // namespace
}  // namespace lumo

/// The entry point of the plug-in.
extern "C" VEXG_EXPORT lumo::XmlEngine* CreateXmlEngine() {
  static lumo::XercesEngine& engine = *new lumo::XercesEngine;
  return lumo::XMLRuntime().IsReady() ? &engine : nullptr;
}
