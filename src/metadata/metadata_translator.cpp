#include "metadata/metadata_translator.h"

#include <utility>

#include "foundation/fault.h"
#include "foundation/thrown.h"
#include "metadata/metadata_conversion.h"
#include "metadata/metadata_parse_log.h"
#include "metadata/metadata_parser.h"
#include "metadata/metadata_text.h"

namespace lumo {
namespace {

/// Calls `visit(path, text)` for every text of a collection.
template <typename Visit>
void VisitTexts(const MetadataContainer& container, const String& path, const Visit& visit) {
  for (const auto& [name, child] : container.GetChildren()) {
    const String childPath = path + name + "/";
    String text;
    if (const auto* const inner = dynamic_cast<const MetadataContainer*>(child.get())) {
      VisitTexts(*inner, childPath, visit);
    } else if (child->Get(text, 0)) {
      visit(childPath, text);
    }
  }
}

bool PutText(MetadataContainer& container, const String& path, const String& text) {
  return container.Put(path, std::make_unique<MetadataString>(std::vector<String>{text}));
}

/// Makes a list of a text whose elements only blanks separate; another text stays as it is.
void RewriteBlankList(const MdfEntry& entry, MetadataContainer& source, const MdfFormat& format) {
  String text;
  if (!FindText(source, entry.src, text)) return;
  const std::u16string_view value = Trimmed(View(text), kBlanks);
  if (value.find_first_of(kBlanks) == value.npos) return;
  std::u16string list(1, format.sm);
  for (std::size_t at = 0; at < value.size();) {
    const std::size_t end = std::min(value.find_first_of(kBlanks, at), value.size());
    if (at != 0) list.append(1, format.vsep).append(u" ");
    list.append(value.substr(at, end - at));
    at = std::min(value.find_first_not_of(kBlanks, end), value.size());
  }
  PutText(source, entry.src, ToString(list + format.em));
}

/// Carries over what no entry took: what has no place of its own goes to the private paths.
bool CarryLeftovers(const MetadataContainer& source, MetadataContainer& target) {
  bool carried = true;
  VisitTexts(source, "/", [&](const String& path, const String& text) {
    const bool isHidden =
        path.Find(kParserInfo) != String::kNotFound || target.Find(path) != nullptr;
    const bool isPut = !isHidden && PutText(target, path, text);
    carried = (isPut || PutText(target, String("/private") + path, text)) && carried;
  });
  return carried;
}

void LogTarget(const MetadataContainer& target) {
  MetadataParseLog& log = MetadataParseLog::Instance();
  if (!log.IsOn(MetadataParseLog::kTranslated)) return;
  const std::string rule = std::string(84, '=') + "\n";
  std::ostringstream out;
  out << rule
      << "*** Translating string collection, using the mdf file, into data type collection ***\n"
      << rule << target.Describe("/").ToUTF8();
  log.Write(MetadataParseLog::kTranslated, out);
}

/// Turns the outcome of ConvertText into the answer of an entry.
bool Settle(Conversion outcome, const MdfEntry& entry) {
  if (outcome == Conversion::kStaysText) {
    MetadataParseLog::Instance().Write(MetadataParseLog::kErrors,
                                       "Mdf Translate - No such value, kept as text: (%s) \n",
                                       entry.src.ToUTF8().c_str());
  }
  return outcome != Conversion::kFailed;
}

}  // namespace

bool FindText(const MetadataContainer& collection, const String& path, String& text) {
  const MetadataObject* const found = collection.Find(path);
  return found != nullptr && found->Get(text, 0);
}

bool MetadataDefFileTranslator::TranslateAll(const std::vector<MdfEntry>& entries,
                                             MetadataContainer* source, MetadataContainer* target,
                                             const MdfFormat* format) {
  if (source == nullptr || target == nullptr || format == nullptr) return false;
  MetadataParseLog& log = MetadataParseLog::Instance();
  current_ = nullptr;
  const auto line = [&] { return current_ != nullptr ? current_->src.ToUTF8() : std::string(); };
  try {
    if (TranslateEach(entries, *source, *target, *format)) {
      LogTarget(*target);
      return true;
    }
    log.Write(MetadataParseLog::kErrors, "Mdf Translate - Error: (%s) Line: (%s) \n",
              "Failed to translate.", line().c_str());
    SetFault("the metadata at " + line() + " can't be translated");
  } catch (...) {
    log.Write(MetadataParseLog::kErrors,
              "Mdf Translate - Error: unknown exception caught.  Line: (%s) \n", line().c_str());
    SetFault("metadata could not be translated: " + DescribeException());
  }
  return false;
}

bool MetadataDefFileTranslator::TranslateEach(const std::vector<MdfEntry>& entries,
                                              MetadataContainer& source, MetadataContainer& target,
                                              const MdfFormat& format) {
  for (const MdfEntry& entry : entries) {
    if (format.blankLists && entry.cnt != 1) RewriteBlankList(entry, source, format);
  }
  for (const MdfEntry& entry : entries) {
    current_ = &entry;
    if (!Translate(entry, source, target, format)) return false;
  }
  return CarryLeftovers(source, target);
}

bool MetadataDefFileTranslator::Translate(const MdfEntry& entry, MetadataContainer& source,
                                          MetadataContainer& target, const MdfFormat& format) {
  const bool isRepeated = View(entry.src).find(kRepeat) != std::u16string_view::npos;
  return isRepeated ? TranslateRepeated(entry, source, target, format)
                    : TranslateSingle(entry, source, target, format);
}

bool MetadataDefFileTranslator::TranslateSingle(const MdfEntry& entry, MetadataContainer& source,
                                                MetadataContainer& target,
                                                const MdfFormat& format) {
  String text;
  if (!FindText(source, entry.src, text)) return true;
  const Conversion outcome = ConvertText(View(text), entry, format, target);
  if (outcome == Conversion::kDone) source.Remove(entry.src);
  return Settle(outcome, entry);
}

bool MetadataDefFileTranslator::TranslateRepeated(const MdfEntry& entry, MetadataContainer& source,
                                                  MetadataContainer& target,
                                                  const MdfFormat& format) {
  const std::u16string_view src = View(entry.src);
  const std::size_t mark = src.find(kRepeat);
  const String head = ToString(src.substr(0, mark));
  const String tail = ToString(src.substr(mark + 1));
  std::vector<String> taken;
  std::u16string list(1, format.sm);
  for (std::uint64_t number = entry.idx;; ++number) {
    const String path = head + String::Format("%u", number) + tail;
    String text;
    if (!FindText(source, path, text)) break;
    if (!taken.empty()) list.append(1, format.vsep).append(u" ");
    list.append(View(text));
    taken.push_back(path);
  }
  if (taken.empty()) return true;
  const Conversion outcome = ConvertText(list + format.em, entry, format, target);
  if (outcome == Conversion::kDone) {
    for (const String& path : taken) source.Remove(path);
  }
  return Settle(outcome, entry);
}

}  // namespace lumo
