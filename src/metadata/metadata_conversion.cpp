#include "metadata/metadata_conversion.h"

#include <algorithm>

#include "metadata/metadata_parse_log.h"
#include "metadata/metadata_text.h"
#include "metadata/metadata_types.h"

namespace lumo {
namespace {

/// Splits a list at its delimiters; the piece behind the last one counts unless it is blank.
std::vector<std::u16string_view> SplitList(std::u16string_view text, const MdfFormat& format) {
  const char16_t delimiters[] = {format.vsep, format.em, 0};
  std::vector<std::u16string_view> tokens;
  for (;;) {
    const std::size_t end = text.find_first_of(delimiters);
    const std::u16string_view token = Trimmed(text.substr(0, end), kBlanks);
    if (end != text.npos || !token.empty()) tokens.push_back(token);
    if (end == text.npos) return tokens;
    text.remove_prefix(end + 1);
  }
}

std::vector<std::u16string_view> TokensOf(std::u16string_view text, const MdfEntry& entry,
                                          const MdfFormat& format) {
  if (!text.empty() && text.front() == format.sm) text.remove_prefix(1);
  const char16_t delimiters[] = {format.vsep, format.em, 0};
  if (entry.cnt == 1 || text.find_first_of(delimiters) == text.npos) return {text};
  return SplitList(text, format);
}

/// True for an integer whose leading 0 makes it octal, and that a digit of 8 or 9 ends. It reads as
/// what stands before that digit.
/// @param read  how much of it was read.
bool IsCutOctal(std::u16string_view token, std::size_t read) {
  const std::u16string_view number = Trimmed(token, kBlanks);
  const std::size_t first = number.find_first_not_of(u"+-");
  return first != number.npos && number[first] == u'0' && read < token.size() &&
         (token[read] == u'8' || token[read] == u'9');
}

template <typename T>
bool ReadElement(std::u16string_view token, T& element) {
  if constexpr (std::is_same_v<T, String>) {
    element = ToString(token);
    return true;
  } else if constexpr (std::is_floating_point_v<T>) {
    double value = 0.0;
    if (ReadDouble(token, value) == 0) return false;
    element = static_cast<T>(value);
    return true;
  } else {
    std::uint64_t value = 0;
    const std::size_t read = ReadUnsigned(token, value);
    if (read == 0) return false;
    element = static_cast<T>(value);
    if (IsCutOctal(token, read)) {
      MetadataParseLog::Instance().Write(
          MetadataParseLog::kErrors, "Mdf Translate - Warning: (%s) is octal up to (%s) \n",
          ToString(token).ToUTF8().c_str(), ToString(token.substr(0, read)).ToUTF8().c_str());
    }
    return true;
  }
}

/// Reads all elements; of numbers none need stand behind the last separator.
template <typename T>
bool ReadElements(std::vector<std::u16string_view> tokens, std::vector<T>& elements) {
  const bool isNumber = !std::is_same_v<T, String>;
  if (isNumber && !tokens.empty() && tokens.back().empty()) tokens.pop_back();
  elements.resize(tokens.size());
  for (std::size_t i = 0; i < tokens.size(); ++i) {
    if (!ReadElement(tokens[i], elements[i])) return false;
  }
  return !tokens.empty();
}

template <typename T>
Conversion StoreElements(std::vector<T> elements, const MdfEntry& entry,
                         MetadataContainer& target) {
  const auto count = static_cast<unsigned>(elements.size());
  const bool is2D = entry.cols != 0 && count > entry.cols;
  if (is2D && count % entry.cols != 0) return Conversion::kStaysText;
  auto value = std::make_unique<MetadataValue<T>>(std::move(elements));
  if (is2D) value->SetDims(count / entry.cols, entry.cols);
  return target.Put(entry.dest, std::move(value)) ? Conversion::kDone : Conversion::kFailed;
}

/// Puts elements into the array that several entries fill; the first of them makes it.
template <typename T>
Conversion StoreShared(const std::vector<T>& elements, const MdfEntry& entry,
                       MetadataContainer& target) {
  std::vector<T> shared(entry.cnt);
  if constexpr (std::is_same_v<T, String>) std::fill(shared.begin(), shared.end(), String(""));
  const MetadataObject* const present = target.Find(entry.dest);
  if (present != nullptr && !present->Get(shared)) return Conversion::kFailed;
  const std::size_t count = std::min<std::size_t>(elements.size(), entry.mton);
  if (entry.mtoi + count > shared.size()) return Conversion::kFailed;
  std::copy_n(elements.begin(), count, shared.begin() + entry.mtoi);
  const bool stored = target.Put(entry.dest, std::make_unique<MetadataValue<T>>(std::move(shared)));
  return stored ? Conversion::kDone : Conversion::kFailed;
}

}  // namespace

Conversion ConvertText(std::u16string_view text, const MdfEntry& entry, const MdfFormat& format,
                       MetadataContainer& target) {
  const std::vector<std::u16string_view> tokens = TokensOf(text, entry, format);
  Conversion outcome = Conversion::kFailed;
  DispatchMetadataType(entry.dt, [&]<typename T>() {
    std::vector<T> elements;
    if (!ReadElements(tokens, elements)) {
      outcome = Conversion::kStaysText;
    } else if (entry.mton != 0) {
      outcome = StoreShared(elements, entry, target);
    } else {
      outcome = StoreElements(std::move(elements), entry, target);
    }
    return true;
  });
  return outcome;
}

}  // namespace lumo
