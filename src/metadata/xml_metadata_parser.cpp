#include "metadata/xml_metadata_parser.h"

#include <initializer_list>
#include <string_view>

#include "commands/xml_engine.h"
#include "foundation/fault.h"
#include "metadata/metadata_parse_log.h"
#include "metadata/metadata_text.h"
#include "metadata/xml_path_writer.h"
#include "platform/memory_shortage.h"

namespace lumo {
namespace {

constexpr unsigned kMaxElementDepth = 200;
constexpr unsigned kMaxExpansions = 10000;
constexpr std::size_t kMaxEntityLength = 1024;

std::string Join(std::initializer_list<std::string_view> pieces) {
  std::string text;
  for (const std::string_view piece : pieces) text += piece;
  return text;
}

void LogError(std::initializer_list<std::string_view> pieces) {
  MetadataParseLog::Instance().Write(MetadataParseLog::kErrors, "%s", Join(pieces).c_str());
}

/// "Xml Parser: <what>: <message> \n", or the line without a message.
void LogException(const char* what, const char16_t* message) {
  const std::string text = message != nullptr ? String(message).ToUTF8() : std::string();
  text.empty() ? LogError({"Xml Parser: ", what, ". \n"})
               : LogError({"Xml Parser: ", what, ": ", text, " \n"});
}

/// Puts what a document holds into a collection.
class MDXmlHandler final : public XmlListener {
 public:
  MDXmlHandler(MetadataContainer& collection, bool joinsTexts)
      : writer_(collection), joinsTexts_(joinsTexts) {}

  bool OnElement(const char16_t* name, const Attribute* attributes, std::size_t count) override {
    if (writer_.Depth() >= kMaxElementDepth) return Refuse("elements are nested too deep");
    PutPieces();
    writer_.StartElement(name);
    for (std::size_t i = 0; i < count; ++i) {
      const String value(attributes[i].value);
      Note(writer_.PutAttribute(attributes[i].name, Cut(View(value))));
    }
    return true;
  }

  void OnElementEnd(const char16_t*) override {
    PutPieces();
    writer_.EndElement();
  }

  void OnText(const char16_t* units, std::size_t count) override {
    const std::u16string_view text(units, count);
    if (joinsTexts_) {
      pieces_ += text;
    } else {
      Put(text);
    }
  }

  bool OnEntity(const char16_t* value) override {
    const bool isShort = std::u16string_view(value).size() <= kMaxEntityLength;
    return isShort || Refuse("an entity is too long");
  }

  void OnMessage(Weight weight, std::uint64_t lineNumber, std::uint64_t,
                 const char16_t* text) override {
    const char* const kind = weight == Weight::kFatal   ? "Fatal Error"
                             : weight == Weight::kError ? "Error"
                                                        : "Warning";
    const String message(text);
    if (message.GetLength() == 0) return LogException(kind, nullptr);
    const std::string line = std::to_string(lineNumber);
    LogError({"Xml Parser: ", kind, ": ", message.ToUTF8(), " at line: (", line, ") \n"});
    if (firstError_.empty()) firstError_ = Join({"line ", line, ": ", message.ToUTF8()});
  }

  /// Why the handler refused the document; null when it did not.
  const char* Refused() const { return refused_; }
  const std::string& FirstError() const { return firstError_; }

 private:
  static String Cut(std::u16string_view text) { return ToString(Trimmed(text, u" \t\r\n")); }

  bool Refuse(const char* why) {
    refused_ = why;
    return false;
  }

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

  XmlPathWriter writer_;
  const bool joinsTexts_;
  std::u16string pieces_;  // of text since the last tag, where they are joined
  const char* refused_ = nullptr;
  std::string firstError_;
};

/// Reads what an address leads to.
bool ReadURL(const String& address, std::string& bytes, std::string& fault) {
  XmlEngine* const engine = GetXmlEngine();
  if (engine == nullptr) return false;
  std::string path;
  const XmlOutcome outcome = engine->ReadAddress(address, kMaxMetadataBytes, path, bytes);
  if (outcome.kind == XmlOutcome::Kind::kDone) {
    if (!path.empty()) return ReadMetadataFile(path, bytes, fault);
    if (bytes.size() <= kMaxMetadataBytes) return true;
    fault = Join({address.ToUTF8(), ": too large for metadata"});
    return false;
  }
  const bool isTold = outcome.kind == XmlOutcome::Kind::kException;
  if (isTold) LogException("XMLException", outcome.text.GetData());
  fault = Join({address.ToUTF8(), ": ", isTold ? outcome.text.ToUTF8() : "can't be read"});
  return false;
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
  XmlEngine* const engine = GetXmlEngine();
  if (engine == nullptr) return false;
  MDXmlHandler handler(collection_, format_.joinsTexts);
  const XmlOutcome outcome =
      engine->ReadWithEntities(bytes.data(), bytes.size(), isText ? "xml input str" : name.c_str(),
                               isText, kMaxExpansions, handler);
  std::string fault;
  switch (outcome.kind) {
    case XmlOutcome::Kind::kDone:
      return true;
    case XmlOutcome::Kind::kErrors:
      LogError({"Xml Parser: Error Count greater than 0: (", input_.ToUTF8(), ") \n"});
      break;
    case XmlOutcome::Kind::kRefused:
      fault = handler.Refused();
      LogError({"Xml Parser: Fatal Error: ", fault, " \n"});
      break;
    case XmlOutcome::Kind::kException:
      LogException("XMLException", outcome.text.GetData());
      break;
    case XmlOutcome::Kind::kSaxException:
      LogException("SAXParseException", outcome.text.GetData());
      break;
    case XmlOutcome::Kind::kNoMemory:
      fault = platform::kOutOfMemory;
      break;
    default:
      fault = outcome.text.ToUTF8();
      LogError({"Xml Parser: Unexpected Exception \n"});
  }
  if (fault.empty()) fault = handler.FirstError();
  SetFault(Join({name, ": ", fault.empty() ? "can't be parsed" : fault}));
  return false;
}

}  // namespace lumo
