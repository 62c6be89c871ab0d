#include "metadata/metadata_text.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <limits>

#include "platform/random_access_file.h"
#include "platform/unicode.h"

namespace lumo {
namespace {

constexpr std::size_t kMaxDigits = 512;  // of a number; longer ones don't exist in practice

/// The ASCII characters at the start of `text`; numbers are made of them.
std::string AsciiStart(std::u16string_view text) {
  std::string start;
  for (const char16_t unit : text.substr(0, kMaxDigits)) {
    if (unit >= 0x80) break;
    start += static_cast<char>(unit);
  }
  return start;
}

std::size_t SkipBlanks(std::string_view text) {
  const std::size_t first = text.find_first_not_of(" \t\r\n");
  return first == text.npos ? text.size() : first;
}

template <typename Change>
std::u16string Changed(std::u16string_view text, Change&& change) {
  std::u16string changed(text);
  std::transform(changed.begin(), changed.end(), changed.begin(), change);
  return changed;
}

/// The value of a number that from_chars found but could not hold: nothing or everything.
double OutOfRange(std::string_view digits) {
  const std::size_t exponent = digits.find_first_of("eE");
  if (exponent != digits.npos) {
    return exponent + 1 < digits.size() && digits[exponent + 1] == '-'
               ? 0.0
               : std::numeric_limits<double>::infinity();
  }
  return digits[0] == '0' || digits[0] == '.' ? 0.0 : std::numeric_limits<double>::infinity();
}

}  // namespace

bool ReadMetadataFile(const std::string& path, std::string& bytes, std::string& fault) {
  const auto file =
      platform::RandomAccessFile::Open(path, platform::RandomAccessFile::Access::kRead, &fault);
  std::uint64_t size = 0;
  if (file == nullptr || !file->GetSize(size, &fault)) return false;
  if (size > kMaxMetadataBytes) {
    fault = path + ": too large for metadata";
    return false;
  }
  bytes.resize(size);
  return size == 0 || file->Read(0, bytes.data(), bytes.size(), &fault);
}

std::u16string DecodeMetadataText(std::string_view bytes) {
  constexpr std::string_view kMark = "\xEF\xBB\xBF";
  if (bytes.starts_with(kMark)) bytes.remove_prefix(kMark.size());
  return platform::Utf8ToUtf16(bytes);
}

String ToString(std::u16string_view text) {
  return text.empty() ? String("") : String(text.data(), text.size());
}

std::u16string_view View(const String& text) {
  return {text.GetData(), text.GetLength()};
}

std::u16string_view Trimmed(std::u16string_view text, std::u16string_view marks) {
  const std::size_t first = text.find_first_not_of(marks);
  if (first == text.npos) return {};
  return text.substr(first, text.find_last_not_of(marks) - first + 1);
}

std::u16string ToUpper(std::u16string_view text) {
  return Changed(text, [](char16_t unit) -> char16_t {
    return unit >= u'a' && unit <= u'z' ? unit - u'a' + u'A' : unit;
  });
}

std::u16string ToLower(std::u16string_view text) {
  return Changed(text, [](char16_t unit) -> char16_t {
    return unit >= u'A' && unit <= u'Z' ? unit - u'A' + u'a' : unit;
  });
}

std::u16string NormalPath(std::u16string_view path) {
  std::u16string normal(u"/");
  for (const char16_t unit : path) {
    if (unit != u'/' || normal.back() != u'/') normal += unit;
  }
  if (normal.back() != u'/') normal += u'/';
  return normal;
}

bool TextLines::Next(std::u16string_view& line) {
  if (rest_.empty()) return false;
  const std::size_t end = std::min(rest_.find_first_of(u"\r\n"), rest_.size());
  line = rest_.substr(0, end);
  const bool isPair = rest_.substr(end).starts_with(u"\r\n");
  rest_.remove_prefix(std::min(end + (isPair ? 2 : 1), rest_.size()));
  ++number_;
  return true;
}

std::size_t ReadUnsigned(std::u16string_view text, std::uint64_t& value) {
  const std::string digits = AsciiStart(text);
  std::size_t at = SkipBlanks(digits);
  const bool isNegative = at < digits.size() && digits[at] == '-';
  if (isNegative || (at < digits.size() && digits[at] == '+')) ++at;
  int base = 10;
  const std::string_view rest = std::string_view(digits).substr(at);
  if (rest.starts_with("0x") || rest.starts_with("0X")) {
    base = 16;
    at += 2;
  } else if (rest.starts_with('0')) {
    base = 8;
  }
  const char* const end = digits.data() + digits.size();
  const auto [next, fault] = std::from_chars(digits.data() + at, end, value, base);
  if (fault == std::errc()) {
    if (isNegative) value = 0 - value;
    return static_cast<std::size_t>(next - digits.data());
  }
  if (fault != std::errc::invalid_argument || base != 16) return 0;
  value = 0;  // "0x" without digits behind: the 0 counts
  return at - 1;
}

std::size_t ReadDouble(std::u16string_view text, double& value) {
  const std::string digits = AsciiStart(text);
  std::size_t at = SkipBlanks(digits);
  const bool hasPlus = at < digits.size() && digits[at] == '+';
  if (hasPlus) ++at;
  if (hasPlus && at < digits.size() && digits[at] == '-') return 0;
  const char* const end = digits.data() + digits.size();
  const auto [next, fault] = std::from_chars(digits.data() + at, end, value);
  if (fault == std::errc::invalid_argument) return 0;
  if (fault == std::errc::result_out_of_range) {
    const bool isNegative = digits[at] == '-';
    const auto length = static_cast<std::size_t>(next - digits.data()) - at;
    const double size =
        OutOfRange(std::string_view(digits).substr(at + isNegative, length - isNegative));
    value = isNegative ? -size : size;
  }
  return static_cast<std::size_t>(next - digits.data());
}

}  // namespace lumo
