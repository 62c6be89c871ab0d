#include "commands/plain_xml.h"

#include <algorithm>
#include <cstring>
#include <expat.h>
#include <memory>
#include <string>
#include <vector>

namespace lumo {
namespace {

constexpr std::size_t kMostBytes = 4 << 20;

bool IsNameStart(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_';
}

bool IsNamePart(char c) {
  return IsNameStart(c) || (c >= '0' && c <= '9') || c == '-' || c == '.';
}

void AppendUtf8(std::uint32_t c, std::string& text) {
  const auto tail = [&](unsigned shift) {
    text += static_cast<char>(0x80 | ((c >> shift) & 0x3F));
  };
  if (c < 0x80) {
    text += static_cast<char>(c);
  } else if (c < 0x800) {
    text += static_cast<char>(0xC0 | c >> 6), tail(0);
  } else if (c < 0x10000) {
    text += static_cast<char>(0xE0 | c >> 12), tail(6), tail(0);
  } else {
    text += static_cast<char>(0xF0 | c >> 18), tail(12), tail(6), tail(0);
  }
}

/// A part of a document.
struct Event {
  enum class Kind { kStart, kEnd, kText } kind;
  std::string text;  // or the name
  Map<String, String> attributes;
};

/// Gathers what a document holds, by Expat.
class Reader {
 public:
  Reader() : parser_(XML_ParserCreate("UTF-8")) {
    if (!parser_) return;
    XML_SetUserData(parser_.get(), this);
    XML_SetElementHandler(parser_.get(), &Reader::OnStart, &Reader::OnEnd);
    XML_SetCharacterDataHandler(parser_.get(), &Reader::OnText);
    XML_SetXmlDeclHandler(parser_.get(), &Reader::OnDeclaration);
    XML_SetStartDoctypeDeclHandler(parser_.get(), &Reader::OnDoctype);
  }

  bool Read(std::string_view document) {
    return parser_ && XML_Parse(parser_.get(), document.data(), static_cast<int>(document.size()),
                                XML_TRUE) == XML_STATUS_OK;
  }
  const std::vector<Event>& Events() const { return events_; }

 private:
  struct Free {
    void operator()(XML_Parser parser) const { XML_ParserFree(parser); }
  };

  static bool IsPlainName(const char* name) {
    return IsNameStart(*name) &&
           std::all_of(name, name + std::strlen(name), [](char c) { return IsNamePart(c); });
  }

  void Stop() { XML_StopParser(parser_.get(), XML_FALSE); }

  static void OnStart(void* user, const char* name, const char** attributes) {
    Reader& self = *static_cast<Reader*>(user);
    Event start{Event::Kind::kStart, name, {}};
    bool isPlain = IsPlainName(name) && ++self.depth_ <= kMaxXMLDepth;
    unsigned count = 0;
    for (; isPlain && *attributes != nullptr; attributes += 2) {
      isPlain = ++count <= kMaxXMLAttributes && IsPlainName(attributes[0]);
      start.attributes[attributes[0]] = attributes[1];
    }
    if (!isPlain) return self.Stop();
    self.events_.push_back(std::move(start));
  }
  static void OnEnd(void* user, const char* name) {
    Reader& self = *static_cast<Reader*>(user);
    --self.depth_;
    self.events_.push_back({Event::Kind::kEnd, name, {}});
  }
  static void OnText(void* user, const char* text, int length) {
    std::vector<Event>& events = static_cast<Reader*>(user)->events_;
    if (events.empty() || events.back().kind != Event::Kind::kText) {
      events.push_back({Event::Kind::kText, {}, {}});
    }
    events.back().text.append(text, static_cast<std::size_t>(length));
  }
  static void OnDeclaration(void* user, const char* version, const char* encoding, int) {
    const bool isPlain = version != nullptr && std::string_view(version) == "1.0" &&
                         (encoding == nullptr || std::string_view(encoding) == "UTF-8" ||
                          std::string_view(encoding) == "utf-8");
    if (!isPlain) static_cast<Reader*>(user)->Stop();
  }
  static void OnDoctype(void* user, const char*, const char*, const char*, int) {
    static_cast<Reader*>(user)->Stop();
  }

  std::unique_ptr<XML_ParserStruct, Free> parser_;
  std::vector<Event> events_;
  unsigned depth_ = 0;
};

/// Writes elements as long as their texts are plain.
class Writer {
 public:
  bool Open(const String& name) {
    out_ += '<';
    return Name(name);
  }

  bool Attributes(const Map<String, String>& attributes) {
    for (const auto& [name, value] : attributes) {
      out_ += ' ';
      if (!Name(name)) return false;
      out_ += "=\"";
      if (!Text(value, true)) return false;
      out_ += '"';
    }
    return true;
  }

  bool Children(const String& name, const Deque<XMLElementPtr>& children, const String& text) {
    if (children.GetCount() == 0 && text.GetLength() == 0) {
      out_ += "/>";
      return true;
    }
    out_ += '>';
    if (!Text(text, false)) return false;
    for (const XMLElementPtr& child : children) {
      if (!Open(child->name) || !Attributes(child->attributes) ||
          !Children(child->name, child->children, child->text)) {
        return false;
      }
    }
    out_ += "</";
    if (!Name(name)) return false;
    out_ += '>';
    return true;
  }

  const std::string& Document() const { return out_; }

 private:
  bool Name(const String& name) {
    const std::size_t start = out_.size();
    for (std::size_t i = 0; i < name.GetLength(); ++i) {
      const char16_t unit = name.GetData()[i];
      if (unit >= 0x80 || !IsNamePart(static_cast<char>(unit))) return false;
      out_ += static_cast<char>(unit);
    }
    return out_.size() != start && IsNameStart(out_[start]);
  }

  bool Text(const String& text, bool isAttribute) {
    for (std::size_t i = 0; i < text.GetLength(); ++i) {
      const char16_t unit = text.GetData()[i];
      if (unit < 0x20 || (unit >= 0x7F && unit < 0xA0) || unit >= 0xFFFE || unit == 0x2028) {
        return false;
      }
      if (unit == '&') {
        out_ += "&amp;";
      } else if (unit == '<') {
        out_ += "&lt;";
      } else if (unit == '>' && !isAttribute) {
        out_ += "&gt;";
      } else if (unit == '"' && isAttribute) {
        out_ += "&quot;";
      } else if (unit < 0xD800 || unit >= 0xE000) {
        AppendUtf8(unit, out_);
      } else {
        const char16_t low = i + 1 < text.GetLength() ? text.GetData()[i + 1] : u'\0';
        if (unit >= 0xDC00 || low < 0xDC00 || low >= 0xE000) return false;
        AppendUtf8(0x10000 + ((unit - 0xD800U) << 10) + (low - 0xDC00U), out_);
        ++i;
      }
    }
    return true;
  }

  std::string out_ = "<?xml version=\"1.0\" encoding=\"UTF-8\" standalone=\"no\" ?>";
};

}  // namespace

bool ReadPlainXml(std::string_view document, XMLSimpleParser& target) {
  Reader reader;
  if (document.size() > kMostBytes || !reader.Read(document)) return false;
  target.StartDocument();
  for (const Event& event : reader.Events()) {
    switch (event.kind) {
      case Event::Kind::kStart:
        target.StartElement(String(event.text), event.attributes);
        break;
      case Event::Kind::kEnd:
        target.EndElement(String(event.text));
        break;
      case Event::Kind::kText:
        target.Characters(String(event.text));
    }
  }
  target.EndDocument();
  return true;
}

bool WritePlainXml(const XMLDocumentRoot& root, String& document) {
  Writer writer;
  if (!writer.Open(root.name) || !writer.Attributes(root.attributes) ||
      !writer.Children(root.name, root.children, String())) {
    return false;
  }
  document = String(writer.Document());
  return true;
}

}  // namespace lumo
