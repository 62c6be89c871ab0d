#include "metadata/mdf_file.h"

#include <deque>
#include <limits>
#include <map>
#include <optional>

#include "foundation/fault.h"
#include "foundation/thrown.h"
#include "metadata/metadata_parse_log.h"
#include "metadata/metadata_text.h"
#include "platform/unicode.h"

namespace lumo {
namespace {

constexpr char16_t kStart = u'[';
constexpr char16_t kEnd = u']';
constexpr char16_t kSeparator = u'=';
constexpr char16_t kComment = u'#';
constexpr std::size_t kKeptLines = 6;
constexpr std::size_t kShortestPath = 3;
constexpr std::uint64_t kMaxSharedElements = 65536;  // of an array that many entries fill

/// The reason why a line can't be used; none when it can.
using Fault = std::optional<std::string>;

constexpr std::pair<std::u16string_view, unsigned> kTypes[] = {
    {u"DT_UCHAR", 1},  {u"DT_SHORT", 2},   {u"DT_USHORT", 12},  {u"DT_INT", 3},
    {u"DT_UINT", 13},  {u"DT_LONG64", 14}, {u"DT_ULONG64", 15}, {u"DT_FLOAT", 4},
    {u"DT_DOUBLE", 5}, {u"DT_STRING", 7}};

/// The entry that is being read.
class EntryDraft {
 public:
  explicit EntryDraft(MdfFormat& format) : format_(format) {}

  /// Takes one line inside the entry, without blanks at its ends.
  Fault TakeLine(std::u16string_view line);

  bool IsEnded() const { return isEnded_; }

  /// Checks the finished entry.
  Fault Check() const;

  /// False for one that only changes the format.
  bool MakesEntry() const { return !hasFormat_; }
  const MdfEntry& Entry() const { return entry_; }

 private:
  Fault TakeProperty(std::u16string_view line);
  Fault TakeFormat(const std::string& name, std::u16string_view value);
  Fault Set(const std::string& name, std::u16string_view value);
  Fault CheckPaths() const;
  Fault CheckSharedArray() const;
  bool Has(const char* name) const { return given_.count(name) != 0; }
  bool IsRepeated() const { return View(entry_.src).find(kRepeat) != std::u16string_view::npos; }

  MdfFormat& format_;
  MdfEntry entry_;
  std::set<std::string> given_;  // properties of the entry
  bool hasFormat_ = false;
  bool isEnded_ = false;
};

Fault EntryDraft::TakeLine(std::u16string_view line) {
  if (line.front() == kStart) {
    return "Encountered second start of entry char. Look for missing end of entry char.";
  }
  std::u16string property(line);
  const std::size_t end = property.rfind(kEnd);
  if (end != property.npos) {
    isEnded_ = true;
    if (property.front() == kEnd) return {};
    property.erase(end, 1);
  }
  return TakeProperty(property);
}

Fault EntryDraft::TakeProperty(std::u16string_view line) {
  const std::size_t separator = line.find(kSeparator);
  if (separator == line.npos) return "Separator is missing.";
  const std::u16string name = ToLower(Trimmed(line.substr(0, separator)));
  const std::u16string_view value = Trimmed(line.substr(separator + 1));
  if (value.empty()) return "Missing value.";
  const std::string narrow = platform::Utf16ToUtf8(name);
  return narrow.starts_with("frmt.") ? TakeFormat(narrow, value) : Set(narrow, value);
}

Fault EntryDraft::TakeFormat(const std::string& name, std::u16string_view value) {
  static const std::map<std::string, char16_t MdfFormat::*> kMarks = {
      {"frmt.sep", &MdfFormat::sep}, {"frmt.vsep", &MdfFormat::vsep},
      {"frmt.sm", &MdfFormat::sm},   {"frmt.em", &MdfFormat::em},
      {"frmt.eol", &MdfFormat::eol}, {"frmt.del", &MdfFormat::del}};
  hasFormat_ = true;
  if (const auto at = kMarks.find(name); at != kMarks.end()) {
    format_.*at->second = value.front();
  } else if (name == "frmt.start") {
    format_.sectionStarts.emplace(value);
  } else if (name == "frmt.end") {
    format_.sectionEnds.emplace(value);
  } else if (name == "frmt.text") {
    const std::u16string word = ToLower(value);
    if (word != u"pieces" && word != u"joined") return "Invalid text value.";
    format_.joinsTexts = word == u"joined";
  } else {
    return "Unknown mdf property.";
  }
  return {};
}

Fault ParseNumber(std::u16string_view text, std::uint32_t& number) {
  std::uint64_t wide = 0;
  if (ReadUnsigned(text, wide) != text.size() || text.front() == u'-' ||
      wide > std::numeric_limits<std::uint32_t>::max()) {
    return "Invalid number.";
  }
  number = static_cast<std::uint32_t>(wide);
  return {};
}

Fault ReadType(std::u16string_view text, unsigned& code) {
  const std::u16string word = ToUpper(text);
  for (const auto& [known, itsCode] : kTypes) {
    if (word != known) continue;
    code = itsCode;
    return {};
  }
  return "Invalid data type.";
}

Fault EntryDraft::Set(const std::string& name, std::u16string_view value) {
  static const std::map<std::string, String MdfEntry::*> kPaths = {
      {"src", &MdfEntry::src}, {"dest", &MdfEntry::dest}, {"alias", &MdfEntry::alias}};
  static const std::map<std::string, std::uint32_t MdfEntry::*> kNumbers = {
      {"cnt", &MdfEntry::cnt},
      {"cols", &MdfEntry::cols},
      {"idx", &MdfEntry::idx},
      {"mton", &MdfEntry::mton},
      {"mtoi", &MdfEntry::mtoi}};
  const auto path = kPaths.find(name);
  const auto number = kNumbers.find(name);
  if (path == kPaths.end() && number == kNumbers.end() && name != "dt") {
    return "Unknown mdf property.";
  }
  if (!given_.insert(name).second) {
    return "Already have a " + name + ". Check for missing end of entry character.";
  }
  if (path != kPaths.end()) {
    entry_.*path->second = ToString(NormalPath(value));
    return {};
  }
  return number != kNumbers.end() ? ParseNumber(value, entry_.*number->second)
                                  : ReadType(value, entry_.dt);
}

Fault EntryDraft::Check() const {
  if (hasFormat_) {
    return given_.empty() ? Fault() : "Invalid mix of mdf and frmt properties.";
  }
  if (Fault fault = CheckPaths()) return fault;
  if (!Has("dt")) return "Data Type value is missing.";
  return CheckSharedArray();
}

Fault EntryDraft::CheckPaths() const {
  if (!Has("src")) return "Src value is missing.";
  if (entry_.src.GetLength() < kShortestPath) return "Invalid src value.";
  if (!Has("dest")) return "Dest value is missing.";
  if (entry_.dest.GetLength() < kShortestPath) return "Invalid dest value.";
  if (!Has("cnt")) return "Cnt value is missing.";
  if (Has("alias") && entry_.alias.GetLength() < kShortestPath) return "Invalid dest value.";
  return {};
}

Fault EntryDraft::CheckSharedArray() const {
  if (Has("mtoi") && !Has("mton")) {
    return "Missing mton value. When using the many to one type you must set both mtoi and mton.";
  }
  if (Has("mton") && !Has("mtoi")) {
    return "Missing mtoi value. When using the many to one type you must set both mtoi and mton.";
  }
  if (Has("mtoi") && Has("cols")) {
    return "Invalid combination of mdf entry types: many to one and 2d array types are mutually "
           "exclusive.";
  }
  if (Has("cols") && IsRepeated()) {
    return "Invalid combination of mdf entry types: 2d array and repeated types are mutually "
           "exclusive.";
  }
  if (Has("idx") && !IsRepeated()) {
    return "You can not use the idx field if the src string does not contain the repeat char (#).";
  }
  const std::uint64_t end = std::uint64_t{entry_.mtoi} + entry_.mton;
  if (entry_.mton != 0 && end > entry_.cnt) return "The mtoi and mton values reach beyond cnt.";
  if (entry_.mton != 0 && entry_.cnt > kMaxSharedElements) return "Invalid cnt value.";
  return {};
}

/// Goes through the lines of a definition file.
class MdfReader {
 public:
  MdfReader(std::u16string_view text, MdfFormat& format, std::vector<MdfEntry>& entries)
      : lines_(text), format_(format), entries_(entries) {}

  Fault Read();

  unsigned LineNumber() const { return lines_.Number(); }
  const std::deque<std::u16string>& KeptLines() const { return kept_; }

 private:
  Fault Take(std::u16string_view line);
  Fault TakeInside(std::u16string_view line);
  Fault Finish();

  TextLines lines_;
  MdfFormat& format_;
  std::vector<MdfEntry>& entries_;
  std::optional<EntryDraft> draft_;
  std::deque<std::u16string> kept_;  // the last lines of the entry
};

Fault MdfReader::Read() {
  std::u16string_view line;
  while (lines_.Next(line)) {
    line = Trimmed(line);
    if (line.empty() || line.front() == kComment) continue;
    if (Fault fault = Take(line)) return fault;
  }
  return draft_ ? Finish() : Fault();
}

Fault MdfReader::Take(std::u16string_view line) {
  if (draft_) return TakeInside(line);
  const std::size_t start = line.find(kStart);
  if (start == line.npos) return {};
  draft_.emplace(format_);
  kept_.clear();
  std::u16string first(line);
  first.erase(start, 1);
  const std::u16string_view property = Trimmed(first);
  return property.empty() || property.front() == kComment ? Fault() : TakeInside(property);
}

Fault MdfReader::TakeInside(std::u16string_view line) {
  kept_.emplace_back(line);
  if (kept_.size() > kKeptLines) kept_.pop_front();
  if (Fault fault = draft_->TakeLine(line)) return fault;
  return draft_->IsEnded() ? Finish() : Fault();
}

Fault MdfReader::Finish() {
  if (Fault fault = draft_->Check()) return fault;
  if (draft_->MakesEntry()) entries_.push_back(draft_->Entry());
  draft_.reset();
  return {};
}

void LogFault(const MdfReader& reader, const String& path, const std::string* message) {
  MetadataParseLog& log = MetadataParseLog::Instance();
  constexpr unsigned kLevel = MetadataParseLog::kErrors;
  log.Write(kLevel, message != nullptr ? "MDF Parsing Error, Invalid entry:\n"
                                       : "MDF Parsing Error, Invalid entry (unknown exception):");
  log.Write(kLevel, "   file:              %s \n", path.ToUTF8().c_str());
  for (const std::u16string& line : reader.KeptLines()) {
    log.Write(kLevel, "   preceding lines    %s \n", platform::Utf16ToUtf8(line).c_str());
  }
  if (message != nullptr) log.Write(kLevel, "   error msg:         %s \n", message->c_str());
}

}  // namespace

bool ReadMdfText(std::u16string_view text, const String& path, MdfFormat& format,
                 std::vector<MdfEntry>& entries) {
  MdfReader reader(text, format, entries);
  try {
    const Fault fault = reader.Read();
    if (!fault) return true;
    LogFault(reader, path, &*fault);
    std::string told = path.ToUTF8();
    told.append(", line ").append(std::to_string(reader.LineNumber())).append(": ").append(*fault);
    SetFault(told);
  } catch (...) {
    LogFault(reader, path, nullptr);
    SetFault("a definition file could not be read: " + DescribeException());
  }
  return false;
}

bool ReadMdfFile(const String& path, MdfFormat& format, std::vector<MdfEntry>& entries) {
  std::string bytes, fault;
  if (ReadMetadataFile(path.ToUTF8(), bytes, fault)) {
    return ReadMdfText(DecodeMetadataText(bytes), path, format, entries);
  }
  MetadataParseLog::Instance().Write(MetadataParseLog::kErrors,
                                     "MDF Parser: Failed to open: (%s)\n", path.ToUTF8().c_str());
  SetFault(fault);
  return false;
}

}  // namespace lumo
