#include "orva/orva_text.h"

#include <algorithm>
#include <charconv>
#include <set>

#include "foundation/text_case.h"

namespace lumo::orva {
namespace {

constexpr std::string_view kMagic = "ORVA";
constexpr std::string_view kBlanks = " \t\r";

std::string_view Trim(std::string_view text) {
  const std::size_t begin = text.find_first_not_of(kBlanks);
  if (begin == std::string_view::npos) return {};
  return text.substr(begin, text.find_last_not_of(kBlanks) + 1 - begin);
}

/// Takes lines off a text and counts them.
class LineReader {
 public:
  explicit LineReader(std::string_view text) : rest_(text) {}

  bool Next(std::string_view& line) {
    if (rest_.empty()) return false;
    const std::size_t end = std::min(rest_.find('\n'), rest_.size());
    line = Trim(rest_.substr(0, end));
    rest_.remove_prefix(std::min(end + 1, rest_.size()));
    ++number_;
    return true;
  }
  unsigned Number() const { return number_; }

 private:
  std::string_view rest_;
  unsigned number_ = 0;
};

/// Writes what a value can't hold as it is as % and two hexadecimal digits: control characters,
/// braces, percent signs, blanks at the ends, and in an item of a list the comma.
std::string Encode(std::string_view text, bool inList) {
  static constexpr char kDigits[] = "0123456789ABCDEF";
  std::string encoded;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const auto byte = static_cast<unsigned char>(text[i]);
    const bool atEnd = i == 0 || i + 1 == text.size();
    if (byte < 0x20 || byte == 0x7F || byte == '{' || byte == '}' || byte == '%' ||
        (byte == ' ' && atEnd) || (byte == ',' && inList)) {
      encoded += '%';
      encoded += kDigits[byte >> 4];
      encoded += kDigits[byte & 0xF];
    } else {
      encoded += text[i];
    }
  }
  return encoded;
}

std::string Decode(std::string_view text) {
  std::string decoded;
  for (std::size_t i = 0; i < text.size(); ++i) {
    unsigned byte = 0;
    const char* const digits = text.data() + i + 1;
    if (text[i] == '%' && i + 2 < text.size() &&
        std::from_chars(digits, digits + 2, byte, 16).ptr == digits + 2) {
      decoded += static_cast<char>(byte);
      i += 2;
    } else {
      decoded += text[i];
    }
  }
  return decoded;
}

/// Gives the text between the braces of a value, or the value when it has none.
std::string_view WithoutBraces(std::string_view raw) {
  if (raw.size() < 2 || raw.front() != '{') return raw;
  return raw.substr(1, raw.size() - 2);
}

}  // namespace

bool HeaderText::Parse(std::string_view text, std::string& fault) {
  entries_.clear();
  LineReader lines(text);
  const auto fail = [&](const std::string& what) {
    fault = "line " + std::to_string(std::max(lines.Number(), 1U)) + ": " + what;
    return false;
  };

  std::string_view line;
  if (!lines.Next(line) || line != kMagic) return fail("the first line isn't ORVA");
  bool ended = false;
  std::set<std::string> names;
  while (lines.Next(line)) {
    if (line.find('\0') != std::string_view::npos) return fail("no text");
    if (line.empty() || line.front() == ';') {
      if (!ended) entries_.push_back({{}, std::string(line), lines.Number()});
      continue;
    }
    if (ended) return fail("text after the end");
    const std::size_t sign = line.find('=');
    if (sign == std::string_view::npos) return fail("no \"=\"");
    Entry entry{LowerCase(Trim(line.substr(0, sign))), std::string(Trim(line.substr(sign + 1))),
                lines.Number()};
    if (entry.name.empty()) return fail("no name before \"=\"");
    if (!names.insert(entry.name).second) return fail("\"" + entry.name + "\" is there twice");
    if (!entry.raw.empty() && entry.raw.front() == '{') {
      while (entry.raw.find('}') == std::string::npos) {
        if (!lines.Next(line)) return fail("the list of \"" + entry.name + "\" has no end");
        entry.raw += '\n';
        entry.raw += line;
      }
      if (entry.raw.find('}') + 1 != entry.raw.size()) return fail("text after \"}\"");
    }
    if (entry.name == "end") {
      if (entry.raw != kMagic) return fail("the header breaks off");
      ended = true;
    } else {
      entries_.push_back(std::move(entry));
    }
  }
  lineCount_ = lines.Number();
  return ended || fail("the header breaks off");
}

std::string HeaderText::Format() const {
  std::string text(kMagic);
  text += '\n';
  for (const Entry& entry : entries_) {
    if (!entry.name.empty()) text.append(entry.name).append(" = ");
    text.append(entry.raw).append("\n");
  }
  return text.append("end = ").append(kMagic).append("\n");
}

const HeaderText::Entry* HeaderText::Find(std::string_view name) const {
  const auto found = std::find_if(entries_.begin(), entries_.end(),
                                  [&](const Entry& entry) { return entry.name == name; });
  return found != entries_.end() ? &*found : nullptr;
}

void HeaderText::SetRaw(std::string_view name, std::string raw) {
  const auto found = std::find_if(entries_.begin(), entries_.end(),
                                  [&](const Entry& entry) { return entry.name == name; });
  if (found != entries_.end()) {
    found->raw = std::move(raw);
  } else {
    entries_.push_back({std::string(name), std::move(raw), 0});
  }
}

void HeaderText::SetText(std::string_view name, std::string_view text) {
  SetRaw(name, Encode(text, false));
}

void HeaderText::SetBracedText(std::string_view name, std::string_view text) {
  SetRaw(name, std::string("{").append(Encode(text, false)).append("}"));
}

void HeaderText::SetList(std::string_view name, const std::vector<std::string>& items) {
  std::string raw = "{";
  for (const std::string& item : items) {
    if (raw.size() > 1) raw += ", ";
    raw += Encode(item, true);
  }
  raw += '}';
  SetRaw(name, std::move(raw));
}

void HeaderText::Remove(std::string_view name) {
  std::erase_if(entries_, [&](const Entry& entry) { return entry.name == name; });
}

std::string TextOf(const HeaderText::Entry& entry) {
  return Decode(Trim(WithoutBraces(entry.raw)));
}

std::vector<std::string> ItemsOf(const HeaderText::Entry& entry) {
  std::vector<std::string> items;
  std::string_view rest = WithoutBraces(entry.raw);
  if (rest.find_first_not_of(" \t\r\n") == std::string_view::npos) return items;
  for (std::size_t comma = 0; comma != std::string_view::npos;) {
    comma = rest.find(',');
    std::string_view item = rest.substr(0, comma);
    const std::size_t begin = std::min(item.find_first_not_of(" \t\r\n"), item.size());
    item.remove_prefix(begin);
    item = item.substr(0, item.find_last_not_of(" \t\r\n") + 1);
    items.push_back(Decode(item));
    if (comma != std::string_view::npos) rest.remove_prefix(comma + 1);
  }
  return items;
}

}  // namespace lumo::orva
