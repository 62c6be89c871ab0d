#include "foundation/string.h"

#include <algorithm>
#include <cstring>
#include <cwctype>
#include <memory>
#include <optional>
#include <stdexcept>
#include <utility>

#include "platform/unicode.h"

namespace lumo {
namespace {

char16_t FoldCase(char16_t unit) {
  return static_cast<char16_t>(std::towlower(static_cast<std::wint_t>(unit)));
}

/// The parts of a printf text with one integer conversion.
struct IntegerFormat {
  std::string flags;  // everything up to the length modifier, the text before it included
  char conversion = 'd';
  std::string tail;
};

/// Takes `format` apart; nothing unless it holds exactly one conversion of an integer.
std::optional<IntegerFormat> ParseIntegerFormat(std::string_view format) {
  IntegerFormat out;
  bool found = false;
  for (std::size_t i = 0; i < format.size(); ++i) {
    std::string& text = found ? out.tail : out.flags;
    text.push_back(format[i]);
    if (format[i] != '%') continue;
    if (i + 1 < format.size() && format[i + 1] == '%') {
      text.push_back(format[++i]);
      continue;
    }
    if (found) return std::nullopt;
    found = true;
    std::size_t end = format.find_first_not_of("-+ #0123456789.", i + 1);
    if (end == format.npos) return std::nullopt;
    out.flags.append(format.substr(i + 1, end - i - 1));
    end = format.find_first_not_of("hljztL", end);
    if (end == format.npos || std::strchr("diuoxX", format[end]) == nullptr) return std::nullopt;
    out.conversion = format[end];
    i = end;
  }
  return found ? std::optional(out) : std::nullopt;
}

}  // namespace

String::String(const char* utf8) {
  if (utf8 != nullptr) Adopt(platform::Utf8ToUtf16(utf8));
}

String::String(const char16_t* units) {
  if (units != nullptr) Adopt(units);
}

String::String(const std::string& utf8) {
  if (!utf8.empty()) Adopt(platform::Utf8ToUtf16(utf8.c_str()));
}

String::String(const char16_t* units, std::size_t count) {
  if (units != nullptr) Adopt({units, count});
}

String::String(const String& other) {
  if (other.data_ != nullptr) Adopt(other.View());
}

String::String(String&& other) noexcept {
  *this = std::move(other);
}

String::~String() {
  DropNarrow();
  delete[] data_;
}

String& String::operator=(const String& other) {
  if (this == &other) return *this;
  return *this = String(other);
}

String& String::operator=(String&& other) noexcept {
  if (this == &other) return *this;
  DropNarrow();
  other.DropNarrow();
  delete[] data_;
  data_ = std::exchange(other.data_, nullptr);
  length_ = std::exchange(other.length_, 0);
  return *this;
}

void String::SetANSI(const char* bytes) {
  *this = String(bytes);
}

String& String::operator+=(const String& other) {
  if (other.data_ == nullptr) {
    DropNarrow();
    return *this;
  }
  std::u16string joined(View());
  joined.append(other.View());
  String result;
  result.Adopt(joined);
  return *this = std::move(result);
}

std::string String::ToUTF8() const {
  const char* text = GetUTF8();
  return text != nullptr ? std::string(text) : std::string();
}

unsigned String::Find(const String& text) const {
  if (data_ == nullptr || text.data_ == nullptr) return kNotFound;
  const std::size_t at = View().find(text.View());
  return at == std::u16string_view::npos ? kNotFound : static_cast<unsigned>(at);
}

String String::Left(unsigned count) const {
  if (count == 0 || count > length_) return *this;
  return String(data_, count);
}

String String::Mid(unsigned start) const {
  if (data_ == nullptr) return {};
  start = std::min(start, length_);
  return String(data_ + start, length_ - start);
}

int String::CompareNoCase(const String& other) const {
  if (data_ == nullptr || other.data_ == nullptr) {
    return static_cast<int>(data_ != nullptr) - static_cast<int>(other.data_ != nullptr);
  }
  const unsigned shorter = std::min(length_, other.length_);
  for (unsigned i = 0; i < shorter; ++i) {
    const int difference = FoldCase(data_[i]) - FoldCase(other.data_[i]);
    if (difference != 0) return difference;
  }
  return length_ < other.length_ ? -1 : static_cast<int>(length_ > other.length_);
}

bool operator==(const String& a, const String& b) {
  if (a.data_ == nullptr || b.data_ == nullptr) return a.data_ == b.data_;
  return a.View() == b.View();
}

bool operator<(const String& a, const String& b) {
  if (a.data_ == nullptr || b.data_ == nullptr) return a.data_ == nullptr && b.data_ != nullptr;
  return a.View() < b.View();
}

String operator+(const String& a, const String& b) {
  String result(a);
  result += b;
  return result;
}

void String::Adopt(std::u16string_view units) {
  if (units.size() >= kNotFound) throw std::length_error("string too long");
  data_ = new char16_t[units.size() + 1];
  std::copy(units.begin(), units.end(), data_);
  data_[units.size()] = 0;
  length_ = static_cast<unsigned>(units.size());
}

void String::DropNarrow() {
  delete[] ansi_.exchange(nullptr, std::memory_order_relaxed);
  delete[] utf8_.exchange(nullptr, std::memory_order_relaxed);
}

// Two readers may make the copy at once; the first to store it wins and the other drops its own.
const char* String::Narrow(std::atomic<char*>& copy) const {
  if (data_ == nullptr) return nullptr;
  char* kept = copy.load(std::memory_order_acquire);
  if (kept != nullptr) return kept;
  const std::string narrow = platform::Utf16ToUtf8(View());
  auto made = std::make_unique<char[]>(narrow.size() + 1);
  std::memcpy(made.get(), narrow.c_str(), narrow.size() + 1);
  if (copy.compare_exchange_strong(kept, made.get(), std::memory_order_acq_rel)) {
    return made.release();
  }
  return kept;
}

String String::FormatNumber(const char* format, bool isSigned, std::int64_t signedValue,
                            std::uint64_t unsignedValue) {
  if (format == nullptr || *format == 0) format = isSigned ? "%ld" : "%lu";
  const auto parsed = ParseIntegerFormat(format);
  if (!parsed) return {};
  const bool printSigned = parsed->conversion == 'd' || parsed->conversion == 'i';
  const std::string exact = parsed->flags + "ll" + parsed->conversion + parsed->tail;
  std::string text(std::strlen(format) + 16, '\0');
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
  if (printSigned) {
    const auto value =
        isSigned ? static_cast<long long>(signedValue) : static_cast<long long>(unsignedValue);
    std::snprintf(text.data(), text.size(), exact.c_str(), value);
  } else {
    std::snprintf(text.data(), text.size(), exact.c_str(),
                  static_cast<unsigned long long>(unsignedValue));
  }
#pragma GCC diagnostic pop
  return String(text.c_str());
}

}  // namespace lumo
