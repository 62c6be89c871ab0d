#include "foundation/near_name.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <numeric>

#include "foundation/text_case.h"

namespace lumo {
namespace {

/// The number of letters to change, add, leave out or swap with their neighbour to make one of the
/// other (the restricted Damerau-Levenshtein distance).
std::size_t Distance(const std::string& a, const std::string& b) {
  std::array<std::vector<std::size_t>, 3> rows;  // the row before last, the last, this one
  for (auto& row : rows) row.resize(b.size() + 1);
  std::iota(rows[2].begin(), rows[2].end(), std::size_t{0});
  for (std::size_t i = 1; i <= a.size(); ++i) {
    std::rotate(rows.begin(), rows.begin() + 1, rows.end());
    auto& [before, last, row] = rows;
    row[0] = i;
    for (std::size_t j = 1; j <= b.size(); ++j) {
      const bool isSame = a[i - 1] == b[j - 1];
      row[j] = std::min({last[j] + 1, row[j - 1] + 1, last[j - 1] + (isSame ? 0 : 1)});
      const bool isSwap = i > 1 && j > 1 && a[i - 1] == b[j - 2] && a[i - 2] == b[j - 1];
      if (isSwap) row[j] = std::min(row[j], before[j - 2] + 1);
    }
  }
  return rows[2][b.size()];
}

/// Length of the character of UTF-8 at the start of `text`; 0 for a control character and for
/// bytes that are none.
std::size_t PrintableLength(std::string_view text) {
  const auto byte = [&](std::size_t i) { return static_cast<unsigned char>(text[i]); };
  const unsigned char first = byte(0);
  if (first < 0x80) return first >= 0x20 && first != 0x7F ? 1 : 0;
  const std::size_t length = first >= 0xF0 ? 4 : first >= 0xE0 ? 3 : first >= 0xC2 ? 2 : 0;
  if (length == 0 || first > 0xF4 || length > text.size()) return 0;
  for (std::size_t i = 1; i < length; ++i) {
    if ((byte(i) & 0xC0) != 0x80) return 0;
  }
  const bool isControl = first == 0xC2 && byte(1) < 0xA0;  // of the second set
  const bool isSeparator =
      first == 0xE2 && byte(1) == 0x80 &&  // line ends, and turns of direction
      ((byte(2) >= 0xA8 && byte(2) <= 0xAE) || byte(2) == 0x8E || byte(2) == 0x8F);
  return isControl || isSeparator ? 0 : length;
}

std::string Escaped(char c) {
  if (c == '\n') return "\\n";
  if (c == '\t') return "\\t";
  if (c == '\r') return "\\r";
  char text[8];
  std::snprintf(text, sizeof text, "\\x%02X", static_cast<unsigned>(static_cast<unsigned char>(c)));
  return text;
}

}  // namespace

std::string NearestName(std::string_view name, const std::vector<std::string>& known) {
  constexpr std::size_t kLongest = 200;  // nobody types more
  if (name.empty() || name.size() > kLongest) return {};
  const std::string wanted = LowerCase(name);
  std::size_t best = std::max<std::size_t>(1, (wanted.size() + 2) / 3) + 1;
  if (wanted.size() == 1) best = 1;  // any other letter would be near
  std::string nearest;
  for (const std::string& candidate : known) {
    const auto lengths = std::minmax({wanted.size(), candidate.size()});
    if (lengths.second - lengths.first >= best) continue;  // so many letters to add at least
    const std::size_t distance = Distance(wanted, LowerCase(candidate));
    if (distance >= best || distance >= std::max(wanted.size(), candidate.size())) continue;
    best = distance;
    nearest = candidate;
  }
  return nearest;
}

std::string DidYouMean(std::string_view name, const std::vector<std::string>& known) {
  const std::string nearest = NearestName(name, known);
  return nearest.empty() ? "" : "; did you mean " + nearest + "?";
}

std::string Printable(std::string_view text, std::size_t most) {
  if (most != 0 && text.size() > most) {
    const std::size_t half = most / 2;
    return Printable(text.substr(0, half)) + "..." + Printable(text.substr(text.size() - half));
  }
  std::string shown;
  while (!text.empty()) {
    const std::size_t length = std::max<std::size_t>(PrintableLength(text), 1);
    if (PrintableLength(text) != 0) {
      shown.append(text.substr(0, length));
    } else {
      shown.append(Escaped(text[0]));
    }
    text.remove_prefix(length);
  }
  return shown;
}

}  // namespace lumo
