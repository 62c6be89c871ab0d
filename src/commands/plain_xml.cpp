#include "commands/plain_xml.h"

#include <algorithm>
#include <charconv>
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

bool IsSpace(char c) {
  return c == ' ' || c == '\n' || c == '\t';
}

/// The characters of XML 1.0 but for those that it reads as others.
bool IsPlainCodePoint(std::uint32_t c) {
  return c == '\t' || c == '\n' || (c >= 0x20 && c < 0xD800) || (c >= 0xE000 && c < 0xFFFE) ||
         (c >= 0x10000 && c < 0x110000);
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

/// A text that is empty rather than none.
String ToString(const std::string& text) {
  return text.empty() ? String("") : String(text);
}

struct Event {
  enum class Kind { kStart, kEnd, kText } kind;
  std::string text;  // or the name
  Map<String, String> attributes;
};

class Reader {
 public:
  explicit Reader(std::string_view document) : rest_(document) {}

  bool Read(std::vector<Event>& events) {
    if (!SkipDeclaration()) return false;
    SkipSpace();
    if (!ReadTree(events)) return false;
    SkipSpace();
    return rest_.empty();
  }

 private:
  bool Take(std::string_view text) {
    if (!rest_.starts_with(text)) return false;
    rest_.remove_prefix(text.size());
    return true;
  }

  bool SkipSpace() {
    const std::size_t before = rest_.size();
    while (!rest_.empty() && IsSpace(rest_.front())) rest_.remove_prefix(1);
    return rest_.size() != before;
  }

  /// Only the declarations that are written here, and the shortest.
  bool SkipDeclaration() {
    if (!rest_.starts_with("<?")) return true;
    for (const char* const rest : {"encoding=\"UTF-8\" standalone=\"no\" ?>",
                                   "encoding=\"UTF-8\"?>", "encoding=\"utf-8\"?>", "?>"}) {
      const std::string form =
          std::string("<?xml version=\"1.0\"") + (*rest == '?' ? "" : " ") + rest;
      if (Take(form)) return true;
    }
    return false;
  }

  bool ReadName(std::string& name) {
    std::size_t length = 0;
    while (length < rest_.size() && IsNamePart(rest_[length])) ++length;
    if (length == 0 || !IsNameStart(rest_.front())) return false;
    name = rest_.substr(0, length);
    rest_.remove_prefix(length);
    return true;
  }

  /// A reference to one of the five characters that have names, or to a number.
  bool ReadReference(std::string& text) {
    const std::size_t end = rest_.find(';');
    if (end == rest_.npos || end > 12) return false;
    const std::string_view name = rest_.substr(1, end - 1);
    std::uint32_t code = 0;
    if (name.starts_with('#')) {
      const bool isHex = name.starts_with("#x");
      const std::string_view digits = name.substr(isHex ? 2 : 1);
      const auto [stop, fault] =
          std::from_chars(digits.data(), digits.data() + digits.size(), code, isHex ? 16 : 10);
      const bool isWhole = fault == std::errc() && stop == digits.data() + digits.size();
      if (!isWhole || !(IsPlainCodePoint(code) || code == '\r')) return false;
    } else {
      constexpr std::pair<std::string_view, char> kNamed[] = {
          {"amp", '&'}, {"lt", '<'}, {"gt", '>'}, {"quot", '"'}, {"apos", '\''}};
      const auto* const at = std::find_if(std::begin(kNamed), std::end(kNamed),
                                          [&](const auto& named) { return named.first == name; });
      if (at == std::end(kNamed)) return false;
      code = static_cast<unsigned char>(at->second);
    }
    AppendUtf8(code, text);
    rest_.remove_prefix(end + 1);
    return true;
  }

  /// One character as it stands. False for bytes that aren't one.
  bool ReadCharacter(std::string& text) {
    const auto first = static_cast<unsigned char>(rest_.front());
    const std::size_t length = first < 0x80 ? 1 : first >= 0xF0 ? 4 : first >= 0xE0 ? 3 : 2;
    if (first >= 0x80 && (first < 0xC2 || first > 0xF4)) return false;
    if (rest_.size() < length) return false;
    std::uint32_t code = length == 1 ? first : first & (0xFFU >> (length + 1));
    for (std::size_t i = 1; i < length; ++i) {
      const auto byte = static_cast<unsigned char>(rest_[i]);
      if ((byte & 0xC0) != 0x80) return false;
      code = code << 6 | (byte & 0x3F);
    }
    constexpr std::uint32_t kLeast[] = {0, 0, 0x80, 0x800, 0x10000};
    if (code < kLeast[length] || !IsPlainCodePoint(code)) return false;
    text.append(rest_.substr(0, length));
    rest_.remove_prefix(length);
    return true;
  }

  bool ReadAttribute(Map<String, String>& attributes) {
    std::string name, value;
    if (!ReadName(name)) return false;
    SkipSpace();
    if (!Take("=")) return false;
    SkipSpace();
    if (rest_.empty() || (rest_.front() != '"' && rest_.front() != '\'')) return false;
    const char quote = rest_.front();
    rest_.remove_prefix(1);
    while (!rest_.empty() && rest_.front() != quote) {
      const char c = rest_.front();
      if (c == '<' || c == '\n' || c == '\t') return false;
      if (!(c == '&' ? ReadReference(value) : ReadCharacter(value))) return false;
    }
    if (rest_.empty()) return false;
    rest_.remove_prefix(1);
    const String key(name);
    if (attributes.HasKey(key)) return false;
    attributes[key] = ToString(value);
    return true;
  }

  bool ReadStart(std::vector<Event>& events, std::vector<std::string>& open) {
    Event start{Event::Kind::kStart, {}, {}};
    if (!ReadName(start.text)) return false;
    bool isEmpty = false;
    for (unsigned count = 0;; ++count) {
      const bool hasSpace = SkipSpace();
      if (Take(">")) break;
      if (Take("/>")) {
        isEmpty = true;
        break;
      }
      if (!hasSpace || count >= kMaxXMLAttributes || !ReadAttribute(start.attributes)) return false;
    }
    if (open.size() >= kMaxXMLDepth) return false;
    const std::string name = start.text;
    events.push_back(std::move(start));
    if (isEmpty) {
      events.push_back({Event::Kind::kEnd, name, {}});
    } else {
      open.push_back(name);
    }
    return true;
  }

  bool ReadTree(std::vector<Event>& events) {
    std::vector<std::string> open;
    if (!Take("<") || !ReadStart(events, open)) return false;
    std::string text;
    const auto endText = [&] {
      if (!text.empty()) events.push_back({Event::Kind::kText, text, {}});
      text.clear();
    };
    while (!open.empty()) {
      if (rest_.empty()) return false;
      if (rest_.front() == '<') {
        endText();
        rest_.remove_prefix(1);
        if (!Take("/")) {
          if (!ReadStart(events, open)) return false;
          continue;
        }
        std::string name;
        if (!ReadName(name) || name != open.back()) return false;
        SkipSpace();
        if (!Take(">")) return false;
        open.pop_back();
        events.push_back({Event::Kind::kEnd, name, {}});
      } else if (rest_.front() == '&') {
        if (!ReadReference(text)) return false;
      } else if (rest_.starts_with("]]>") || !ReadCharacter(text)) {
        return false;
      }
    }
    return true;
  }

  std::string_view rest_;
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
  std::vector<Event> events;
  if (document.size() > kMostBytes || !Reader(document).Read(events)) return false;
  target.StartDocument();
  for (const Event& event : events) {
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
