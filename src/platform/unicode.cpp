#include "platform/unicode.h"

#include <cstddef>

namespace lumo::platform {
namespace {

constexpr char32_t kReplacement = 0xFFFD;

constexpr bool IsContinuation(unsigned char byte) {
  return (byte & 0xC0) == 0x80;
}
constexpr bool IsSurrogate(char32_t point) {
  return point >= 0xD800 && point <= 0xDFFF;
}

/// Takes the code point at the head of `bytes`, or one byte as U+FFFD, off `bytes`.
char32_t TakeUtf8(std::string_view& bytes) {
  static constexpr char32_t kSmallest[] = {0, 0, 0x80, 0x800, 0x10000};
  const auto lead = static_cast<unsigned char>(bytes[0]);
  const std::size_t length = lead < 0x80             ? 1
                             : (lead & 0xE0) == 0xC0 ? 2
                             : (lead & 0xF0) == 0xE0 ? 3
                             : (lead & 0xF8) == 0xF0 ? 4
                                                     : 0;
  char32_t point = length == 1 ? lead : lead & (0x7F >> length);
  bool good = length != 0 && length <= bytes.size();
  for (std::size_t i = 1; good && i < length; ++i) {
    const auto byte = static_cast<unsigned char>(bytes[i]);
    good = IsContinuation(byte);
    point = (point << 6) | (byte & 0x3F);
  }
  good = good && point >= kSmallest[length] && point <= 0x10FFFF && !IsSurrogate(point);
  bytes.remove_prefix(good ? length : 1);
  return good ? point : kReplacement;
}

/// Takes the code point at the head of `units`, or a lone surrogate as U+FFFD, off `units`.
char32_t TakeUtf16(std::u16string_view& units) {
  const char32_t first = units[0];
  const bool pair = first >= 0xD800 && first <= 0xDBFF && units.size() > 1 && units[1] >= 0xDC00 &&
                    units[1] <= 0xDFFF;
  const char32_t second = pair ? units[1] : 0;
  units.remove_prefix(pair ? 2 : 1);
  if (pair) return 0x10000 + ((first - 0xD800) << 10) + (second - 0xDC00);
  return IsSurrogate(first) ? kReplacement : first;
}

void AppendUtf8(std::string& out, char32_t point) {
  const auto tail = [&](int shift) {
    out.push_back(static_cast<char>(0x80 | ((point >> shift) & 0x3F)));
  };
  if (point < 0x80) {
    out.push_back(static_cast<char>(point));
  } else if (point < 0x800) {
    out.push_back(static_cast<char>(0xC0 | (point >> 6)));
    tail(0);
  } else if (point < 0x10000) {
    out.push_back(static_cast<char>(0xE0 | (point >> 12)));
    tail(6);
    tail(0);
  } else {
    out.push_back(static_cast<char>(0xF0 | (point >> 18)));
    tail(12);
    tail(6);
    tail(0);
  }
}

}  // namespace

std::u16string Utf8ToUtf16(std::string_view bytes) {
  std::u16string out;
  out.reserve(bytes.size());
  while (!bytes.empty()) {
    const char32_t point = TakeUtf8(bytes);
    if (point < 0x10000) {
      out.push_back(static_cast<char16_t>(point));
    } else {
      out.push_back(static_cast<char16_t>(0xD800 + ((point - 0x10000) >> 10)));
      out.push_back(static_cast<char16_t>(0xDC00 + (point & 0x3FF)));
    }
  }
  return out;
}

std::string Utf16ToUtf8(std::u16string_view units) {
  std::string out;
  out.reserve(units.size());
  while (!units.empty()) AppendUtf8(out, TakeUtf16(units));
  return out;
}

}  // namespace lumo::platform
