#pragma once

#include <algorithm>
#include <string>
#include <string_view>

namespace lumo {

/// Gives the text with the letters A to Z in lower case; all other bytes stay, whatever the locale.
/// Bytes of UTF-8 beyond ASCII stay too, so the result is as well-formed as the text.
inline std::string LowerCase(std::string_view text) {
  std::string lower(text);
  std::transform(lower.begin(), lower.end(), lower.begin(), [](char c) {
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
  });
  return lower;
}

}  // namespace lumo
