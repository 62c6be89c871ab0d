#include "metadata/xml_metadata_parser.h"

#include <initializer_list>
#include <memory>
#include <string_view>

#include <xercesc/framework/MemBufInputSource.hpp>
#include <xercesc/framework/URLInputSource.hpp>
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

#include "commands/xml_runtime.h"
#include "foundation/fault.h"
#include "foundation/thrown.h"
#include "metadata/metadata_parse_log.h"
#include "metadata/metadata_text.h"
#include "metadata/xml_path_writer.h"
#include "platform/memory_shortage.h"

namespace lumo {
namespace {

constexpr unsigned kMaxDepth = 200;
constexpr unsigned kMaxExpansions = 10000;
constexpr XMLSize_t kMaxEntityLength = 1024;

/// A document that is refused by a rule of this library rather than of XML.
struct RefusedDocument {
  const char* why;
};

std::string Join(std::initializer_list<std::string_view> pieces) {
  std::string text;
  for (const std::string_view piece : pieces) text += piece;
  return text;
}

void LogError(std::initializer_list<std::string_view> pieces) {
  MetadataParseLog::Instance().Write(MetadataParseLog::kErrors, "%s", Join(pieces).c_str());
}

/// "Xml Parser: <what>: <message> \n", or the line without a message.
void LogException(const char* what, const XMLCh* message) {
  const std::string text = message != nullptr ? String(message).ToUTF8() : std::string();
  text.empty() ? LogError({"Xml Parser: ", what, ". \n"})
               : LogError({"Xml Parser: ", what, ": ", text, " \n"});
}

/// Hears the events of the XML library.
class MDXmlHandler final : public xercesc::DefaultHandler {
 public:
  MDXmlHandler(MetadataContainer& collection, bool joinsTexts)
      : writer_(collection), joinsTexts_(joinsTexts) {}

  void startElement(const XMLCh* const, const XMLCh* const, const XMLCh* const qname,
                    const xercesc::Attributes& attributes) override {
    if (writer_.Depth() >= kMaxDepth) throw RefusedDocument{"elements are nested too deep"};
    PutPieces();
    writer_.StartElement(qname);
    for (XMLSize_t i = 0; i < attributes.getLength(); ++i) {
      const String value(attributes.getValue(i));
      Note(writer_.PutAttribute(attributes.getQName(i), Cut(View(value))));
    }
  }

  void endElement(const XMLCh* const, const XMLCh* const, const XMLCh* const) override {
    PutPieces();
    writer_.EndElement();
  }

  void characters(const XMLCh* const units, const XMLSize_t count) override {
    const std::u16string_view text(units, count);
    if (joinsTexts_) {
      pieces_ += text;
    } else {
      Put(text);
    }
  }

  void internalEntityDecl(const XMLCh* const, const XMLCh* const value) override {
    if (value != nullptr && xercesc::XMLString::stringLen(value) > kMaxEntityLength) {
      throw RefusedDocument{"an entity is too long"};
    }
  }

  /// Nothing outside the document counts.
  xercesc::InputSource* resolveEntity(const XMLCh* const, const XMLCh* const) override {
    static const XMLByte kNothing[] = {0};
    return new xercesc::MemBufInputSource(kNothing, 0, "nothing");
  }

  void fatalError(const xercesc::SAXParseException& error) override { Log("Fatal Error", error); }
  void error(const xercesc::SAXParseException& error) override { Log("Error", error); }
  void warning(const xercesc::SAXParseException& error) override { Log("Warning", error); }
  void resetErrors() override {}

  const std::string& FirstError() const { return firstError_; }

 private:
  static String Cut(std::u16string_view text) { return ToString(Trimmed(text, u" \t\r\n")); }

  void Put(std::u16string_view text) {
    if (text.find_first_not_of(u"\t\n ") == text.npos) return;
    Note(writer_.PutText(Cut(text)));
  }

  /// Puts what has come since the last tag.
  void PutPieces() {
    Put(pieces_);
    pieces_.clear();
  }

  void Note(bool stored) {
    if (stored) return;
    LogError({"Xml Parser: No place for a value of: (", ToString(writer_.Path()).ToUTF8(), ") \n"});
  }

  void Log(const char* kind, const xercesc::SAXParseException& error) {
    const String message(error.getMessage());
    if (message.GetLength() == 0) return LogException(kind, nullptr);
    const std::string line = std::to_string(error.getLineNumber());
    LogError({"Xml Parser: ", kind, ": ", message.ToUTF8(), " at line: (", line, ") \n"});
    if (firstError_.empty()) firstError_ = Join({"line ", line, ": ", message.ToUTF8()});
  }

  XmlPathWriter writer_;
  const bool joinsTexts_;
  std::u16string pieces_;  // of text since the last tag, where they are joined
  std::string firstError_;
};

/// A reader that validates nothing and loads nothing.
std::unique_ptr<xercesc::SAX2XMLReader> MakeReader(MDXmlHandler& handler,
                                                   xercesc::SecurityManager& security) {
  using xercesc::XMLUni;
  std::unique_ptr<xercesc::SAX2XMLReader> reader(xercesc::XMLReaderFactory::createXMLReader());
  for (const XMLCh* const feature :
       {XMLUni::fgXercesLoadExternalDTD, XMLUni::fgSAX2CoreValidation, XMLUni::fgXercesDynamic,
        XMLUni::fgXercesSchemaFullChecking, XMLUni::fgXercesSchema, XMLUni::fgXercesLoadSchema}) {
    reader->setFeature(feature, false);
  }
  reader->setFeature(XMLUni::fgXercesDisableDefaultEntityResolution, true);
  security.setEntityExpansionLimit(kMaxExpansions);
  reader->setProperty(XMLUni::fgXercesSecurityManager, &security);
  reader->setContentHandler(&handler);
  reader->setErrorHandler(&handler);
  reader->setEntityResolver(&handler);
  reader->setDeclarationHandler(&handler);
  return reader;
}

/// Reads what an address leads to.
bool ReadURL(const String& address, std::string& bytes, std::string& fault) {
  const XMLRuntime runtime;
  if (!runtime.IsReady()) return false;
  try {
    const xercesc::XMLURL url(address.GetData());
    if (url.getProtocol() == xercesc::XMLURL::File) {
      return ReadMetadataFile(String(url.getPath()).ToUTF8(), bytes, fault);
    }
    const std::unique_ptr<xercesc::BinInputStream> stream(
        xercesc::URLInputSource(url).makeStream());
    if (stream == nullptr) {
      fault = Join({address.ToUTF8(), ": can't be read"});
      return false;
    }
    XMLByte part[16384];
    while (const XMLSize_t count = stream->readBytes(part, sizeof part)) {
      bytes.append(reinterpret_cast<const char*>(part), count);
      if (bytes.size() <= kMaxMetadataBytes) continue;
      fault = Join({address.ToUTF8(), ": too large for metadata"});
      return false;
    }
    return true;
  } catch (const xercesc::XMLException& error) {
    LogException("XMLException", error.getMessage());
    fault = Join({address.ToUTF8(), ": ", String(error.getMessage()).ToUTF8()});
    return false;
  }
}

}  // namespace

bool XmlMetadataParser::Parse() {
  const String& type = format_.xmlInputType;
  if (type == "XmlFile") {
    Store(kParserUri, input_);
  } else if (type == "XmlUrl") {
    Store(kParserUri, String("xml url input : ") + input_);
  } else if (type == "XmlString") {
    Store(kParserUri, "xml wstring input ");
  } else {
    Store(kParserUri, " fatal error: xml input type was not set");
    SetFault(Join({"\"", type.ToUTF8(), "\" is none of XmlFile, XmlUrl and XmlString"}));
    return false;
  }
  Store(kParserType,
        String("XmlParser - ") + format_.input + ",  XmlDriverType - " + format_.xmlInputType);
  std::string bytes;
  if (!ReadDocument(bytes) || !ParseDocument(bytes)) return false;
  LogCollection();
  return true;
}

bool XmlMetadataParser::ReadDocument(std::string& bytes) const {
  std::string fault;
  bool isRead = false;
  if (format_.xmlInputType == "XmlString") {
    bytes = input_.ToUTF8();
    isRead = bytes.size() <= kMaxMetadataBytes;
    if (!isRead) fault = "the document is too large for metadata";
  } else if (format_.xmlInputType == "XmlUrl") {
    isRead = ReadURL(input_, bytes, fault);
  } else {
    isRead = ReadMetadataFile(input_.ToUTF8(), bytes, fault);
  }
  if (isRead) return true;
  LogException("XMLException", String(fault).GetData());
  SetFault(fault);
  return false;
}

bool XmlMetadataParser::ParseDocument(const std::string& bytes) {
  const bool isText = format_.xmlInputType == "XmlString";
  const std::string name = isText ? "the document" : input_.ToUTF8();
  const XMLRuntime runtime;
  if (!runtime.IsReady()) return false;
  MDXmlHandler handler(collection_, format_.joinsTexts);
  std::string fault;
  try {
    xercesc::SecurityManager security;
    const auto reader = MakeReader(handler, security);
    xercesc::MemBufInputSource source(reinterpret_cast<const XMLByte*>(bytes.data()), bytes.size(),
                                      isText ? "xml input str" : name.c_str());
    if (isText) source.setEncoding(u"UTF-8");
    reader->parse(source);
    if (reader->getErrorCount() == 0) return true;
    LogError({"Xml Parser: Error Count greater than 0: (", input_.ToUTF8(), ") \n"});
  } catch (const RefusedDocument& refused) {
    fault = refused.why;
    LogError({"Xml Parser: Fatal Error: ", fault, " \n"});
  } catch (const xercesc::XMLException& error) {
    LogException("XMLException", error.getMessage());
  } catch (const xercesc::SAXParseException& error) {
    LogException("SAXParseException", error.getMessage());
  } catch (const xercesc::OutOfMemoryException&) {
    platform::NoteMemoryShortage();
    fault = platform::kOutOfMemory;
  } catch (...) {
    fault = DescribeException();
    LogError({"Xml Parser: Unexpected Exception \n"});
  }
  if (fault.empty()) fault = handler.FirstError();
  SetFault(Join({name, ": ", fault.empty() ? "can't be parsed" : fault}));
  return false;
}

}  // namespace lumo
