#include "metadata/text_metadata_parser.h"

#include <algorithm>

#include "foundation/fault.h"
#include "metadata/metadata_parse_log.h"
#include "metadata/metadata_text.h"

namespace lumo {
namespace {

constexpr char16_t kBlank = u' ';
constexpr std::ptrdiff_t kMaxSections = 64;  // inside one another

std::u16string_view Mark(const char16_t& mark) {
  return {&mark, 1};
}

/// Takes `mark` out of `text` from `start` to `end`.
void TakeOut(std::u16string& text, std::size_t start, std::size_t end, char16_t mark) {
  const auto first = text.begin() + static_cast<std::ptrdiff_t>(start);
  const auto last = text.begin() + static_cast<std::ptrdiff_t>(end);
  text.erase(std::remove(first, last, mark), last);
}

/// Leaves one start mark, with nothing between it and the first element.
void CleanStart(std::u16string& text, char16_t mark) {
  if (text.empty() || text.front() != mark) return;
  TakeOut(text, 1, text.size(), mark);
  text.erase(1, std::min(text.find_first_not_of(kBlank, 1), text.size()) - 1);
}

/// Leaves one end mark, with nothing between it and the last element.
void CleanEnd(std::u16string& text, char16_t mark) {
  if (text.empty() || text.back() != mark) return;
  TakeOut(text, 0, text.size() - 1, mark);
  text.pop_back();
  text.erase(text.find_last_not_of(kBlank) + 1);
  text += mark;
}

/// Leaves one blank of several behind each separator.
void CleanSeparators(std::u16string& text, char16_t separator) {
  std::u16string clean;
  bool isBehind = false;  // only blanks since the last separator
  for (const char16_t unit : text) {
    if (isBehind && unit == kBlank && clean.back() == kBlank) continue;
    isBehind = unit == separator || (isBehind && unit == kBlank);
    clean += unit;
  }
  text = std::move(clean);
}

}  // namespace

std::u16string CleanValue(std::u16string_view raw, const MdfFormat& format) {
  std::u16string whole(raw);
  TakeOut(whole, 0, whole.size(), u'\t');
  std::u16string_view value = Trimmed(whole, Mark(kBlank));
  if (format.eol != MdfFormat::kNone) {
    value = value.substr(0, value.find_last_not_of(format.eol) + 1);
    value = Trimmed(value, Mark(kBlank));
  }
  if (format.del != MdfFormat::kNone) value = Trimmed(value, Mark(format.del));
  std::u16string text(value);
  CleanStart(text, format.sm);
  CleanEnd(text, format.em);
  CleanSeparators(text, format.vsep);
  return text;
}

TextMetadataParser::TextMetadataParser(MetadataContainer& collection, const MdfFormat& format,
                                       const String& path, const String& section)
    : MetadataParser(collection, format), path_(path), section_(NormalPath(View(section))) {}

bool TextMetadataParser::Parse() {
  std::string bytes, fault;
  if (!ReadMetadataFile(path_.ToUTF8(), bytes, fault)) {
    MetadataParseLog::Instance().Write(
        MetadataParseLog::kErrors, "Text Parser: Failed to open: (%s)\n", path_.ToUTF8().c_str());
    SetFault(fault);
    return false;
  }
  return ParseText(DecodeMetadataText(bytes));
}

bool TextMetadataParser::ParseText(std::u16string_view text) {
  Store(kParserUri, path_);
  Store(kParserType, String("TextNVParser - ") + format_.input);
  TextLines lines(text);
  std::u16string_view line;
  while (lines.Next(line)) {
    if (TakeLine(line, lines)) continue;
    const std::string where = path_.ToUTF8() + ", line " + std::to_string(lines.Number());
    SetFault(where + ": sections are nested too deep");
    MetadataParseLog::Instance().Write(MetadataParseLog::kErrors,
                                       "Text Parser: Sections are nested too deep: (%s)\n",
                                       where.c_str());
    return false;
  }
  LogCollection();
  return true;
}

/// @return false when the line opens one section too many.
bool TextMetadataParser::TakeLine(std::u16string_view line, TextLines& lines) {
  const std::size_t separator = line.find(format_.sep);
  if (separator == line.npos) return true;
  const std::u16string_view name = Trimmed(line.substr(0, separator));
  const std::u16string_view value = line.substr(separator + 1);
  const std::u16string upper = ToUpper(name);
  if (format_.sectionStarts.count(upper) != 0) return OpenSection(Trimmed(value));
  if (format_.sectionEnds.count(upper) != 0) {
    CloseSection();
  } else {
    TakeValue(name, value, lines);
  }
  return true;
}

bool TextMetadataParser::OpenSection(std::u16string_view name) {
  section_ = NormalPath(section_ + std::u16string(name));
  return std::count(section_.begin(), section_.end(), u'/') <= kMaxSections;
}

void TextMetadataParser::CloseSection() {
  if (section_.size() > 1) section_.erase(section_.rfind(u'/', section_.size() - 2) + 1);
}

/// @param start  what stands behind the separator; more lines are taken when it needs them.
void TextMetadataParser::TakeValue(std::u16string_view name, std::u16string_view start,
                                   TextLines& lines) {
  std::u16string value(start);
  const std::size_t list = value.find(format_.sm);
  const char16_t end = format_.eol != MdfFormat::kNone ? format_.eol : format_.em;
  const bool isOpen = list != value.npos && value.find(format_.em, list + 1) == value.npos &&
                      value.find(end, list + 1) == value.npos;
  std::u16string_view line;
  while (isOpen && lines.Next(line)) {
    value += line;
    if (line.find(end) != line.npos) break;
  }
  Store(ToString(section_ + std::u16string(name) + u"/"), ToString(CleanValue(value, format_)));
}

}  // namespace lumo
