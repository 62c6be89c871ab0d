#include "commands/strict_checks.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <string_view>

#include "foundation/near_name.h"
#include "foundation/text_form.h"

namespace lumo {
namespace {

using Tokens = std::vector<std::string_view>;

constexpr std::string_view kBlanks = " \t\r\n";

Tokens SplitAtBlanks(std::string_view text) {
  Tokens tokens;
  while (!(text = Trimmed(text)).empty()) {
    const std::size_t end = std::min(text.find_first_of(kBlanks), text.size());
    tokens.push_back(text.substr(0, end));
    text.remove_prefix(end);
  }
  return tokens;
}

/// Commands count in 32 bits, from 0.
bool IsInteger(std::string_view token) {
  std::uint64_t value = 0;
  if (token.starts_with('+')) token.remove_prefix(1);
  const auto [end, fault] = std::from_chars(token.data(), token.data() + token.size(), value);
  return fault == std::errc() && end == token.data() + token.size() &&
         value <= std::numeric_limits<std::uint32_t>::max();
}

bool IsNumber(std::string_view token) {
  if (token == "nan" || token == "inf" || token == "-inf" || token == "-nan") return true;
  if (token.starts_with('+') && !token.starts_with("+-")) token.remove_prefix(1);
  const bool isPlain = token.find_first_not_of("0123456789+-.eE") == token.npos;
  double value = 0;
  const auto [end, fault] = std::from_chars(token.data(), token.data() + token.size(), value);
  return isPlain && fault == std::errc() && end == token.data() + token.size();
}

bool IsBoolean(std::string_view token) {
  return token == "0" || token == "1";
}

using IsElement = bool (*)(std::string_view token);

bool AreAll(const Tokens& tokens, IsElement fits) {
  return std::all_of(tokens.begin(), tokens.end(), fits);
}

/// The elements of "rank:extents [elements]", and how many the extents call for; none when the text
/// has another form.
std::optional<std::string_view> ElementsOf(std::string_view text, std::uint64_t& count) {
  text = Trimmed(text);
  const std::size_t colon = text.find(':');
  const std::size_t open = text.find('[');
  if (colon == text.npos || open == text.npos || open < colon || !text.ends_with(']')) return {};
  unsigned rank = 0;
  const auto [end, fault] = std::from_chars(text.data(), text.data() + colon, rank);
  const Tokens extents = SplitAtBlanks(text.substr(colon + 1, open - colon - 1));
  if (fault != std::errc() || end != text.data() + colon || rank != extents.size() ||
      !AreAll(extents, IsInteger)) {
    return {};
  }
  count = rank == 0 ? 0 : 1;
  for (const std::string_view extent : extents) {
    std::uint64_t size = 0;
    std::from_chars(extent.data(), extent.data() + extent.size(), size);
    if (size != 0 && count > std::numeric_limits<std::uint32_t>::max() / size) return {};
    count *= size;
  }
  return text.substr(open + 1, text.size() - open - 2);
}

bool IsArray(std::string_view text, IsElement fits) {
  std::uint64_t count = 0;
  const auto elements = ElementsOf(text, count);
  if (!elements) return false;
  const Tokens tokens = SplitAtBlanks(*elements);
  return tokens.size() == count && AreAll(tokens, fits);
}

bool IsURI(std::string_view text) {
  text = Trimmed(text);
  return text.starts_with('[') && text.find(']') == text.size() - 1;
}

bool IsURIArray(std::string_view text) {
  std::uint64_t count = 0;
  auto elements = ElementsOf(text, count);
  if (!elements) return false;
  std::uint64_t found = 0;
  for (std::string_view rest = Trimmed(*elements); !rest.empty(); ++found) {
    const std::size_t end = rest.find(']');
    if (!rest.starts_with('[') || end == rest.npos) return false;
    rest = Trimmed(rest.substr(end + 1));
  }
  return found == count;
}

bool IsRectangle(std::string_view text) {
  const Tokens tokens = SplitAtBlanks(text);
  return tokens.size() == 4 && AreAll(tokens, IsInteger);
}

bool AreTiles(std::string_view text) {
  Tokens tokens = SplitAtBlanks(text);
  if (tokens.size() != 8) return false;
  const std::string_view mode = tokens.back();
  tokens.pop_back();
  return AreAll(tokens, IsInteger) && (mode == "Invariable" || mode == "Variable");
}

bool IsByte(std::string_view token) {
  std::uint8_t value = 0;
  const auto [end, fault] = std::from_chars(token.data(), token.data() + token.size(), value);
  return fault == std::errc() && end == token.data() + token.size();
}

/// "name red green blue alpha null".
bool IsColor(std::string_view text) {
  Tokens tokens = SplitAtBlanks(text);
  if (tokens.size() != 6 || !IsBoolean(tokens.back())) return false;
  return AreAll(Tokens(tokens.begin() + 1, tokens.end() - 1), IsByte);
}

bool IsPalette(std::string_view text) {
  text = Trimmed(text);
  const std::size_t open = text.find('[');
  if (open == text.npos || !text.ends_with(']')) return false;
  const std::string_view count = Trimmed(text.substr(0, open));
  if (!IsInteger(count)) return false;
  std::uint64_t colors = 0;
  std::string_view rest = Trimmed(text.substr(open + 1, text.size() - open - 2));
  for (; !rest.empty(); ++colors) {
    const std::size_t end = rest.find(')');
    if (!rest.starts_with('(') || end == rest.npos || !IsColor(rest.substr(1, end - 1)))
      return false;
    rest = Trimmed(rest.substr(end + 1));
  }
  return std::to_string(colors) == count;
}

bool Fits(const InputDeclaration& input, std::string_view text) {
  switch (input.kind) {
    case ValueKind::kURI:
      return IsURI(text);
    case ValueKind::kBoolean:
      return IsBoolean(Trimmed(text));
    case ValueKind::kInteger:
      return IsInteger(Trimmed(text));
    case ValueKind::kNumber:
      return IsNumber(Trimmed(text));
    case ValueKind::kIntegerArray:
      return IsArray(text, IsInteger);
    case ValueKind::kNumberArray:
      return IsArray(text, IsNumber);
    case ValueKind::kBooleanArray:
      return IsArray(text, IsBoolean);
    case ValueKind::kRectangle:
      return IsRectangle(text);
    case ValueKind::kTiles:
      return AreTiles(text);
    case ValueKind::kPalette:
      return IsPalette(text);
    case ValueKind::kURIArray:
      return IsURIArray(text);
    case ValueKind::kWord:
    case ValueKind::kText:
    case ValueKind::kTextList:
    case ValueKind::kGeoRef:  // the command itself refuses a text that makes none
    case ValueKind::kPaletteArray:
      return true;
  }
  return true;
}

constexpr std::size_t kShown = 80;  // bytes of a text

std::string Joined(const std::vector<std::string>& names) {
  std::string list;
  for (const std::string& name : names) list.append(list.empty() ? "" : ", ").append(name);
  return list;
}

std::string Quoted(std::string_view text) {
  return std::string("\"").append(Printable(text, kShown)).append("\"");
}

std::string MisfitOfWord(const InputDeclaration& input, std::string_view text) {
  if (input.words == nullptr) return {};
  std::vector<std::string> words;
  for (const char* const word : input.words()) words.emplace_back(word);
  const std::string word(Trimmed(text));
  if (std::find(words.begin(), words.end(), word) != words.end()) return {};
  return std::string("input ") + input.name + ": " + Quoted(word) + " is none of " + Joined(words) +
         DidYouMean(word, words);
}

std::string MisfitOfValue(const InputDeclaration& input, std::string_view text) {
  if (input.kind == ValueKind::kWord) return MisfitOfWord(input, text);
  if (Fits(input, text)) return {};
  const ValueKindText kind = Describe(input.kind);
  return std::string("input ") + input.name + ": " + Quoted(text) + " is no " + kind.name + " (" +
         kind.form + ")";
}

template <typename Declared>
std::string UnknownName(const char* what, const String& name, const std::vector<Declared>& known) {
  std::vector<std::string> names;
  for (const Declared& entry : known) names.emplace_back(entry.name);
  const std::string text = name.ToUTF8();
  if (std::find(names.begin(), names.end(), text) != names.end()) return {};
  std::string help = DidYouMean(text, names);
  if (help.empty() && !names.empty()) help = "; there are " + Joined(names);
  return std::string("there is no ") + what + " " + Printable(text, kShown) + help;
}

}  // namespace

std::span<const EnumWord<JobChecks>> WordsOf(JobChecks) {
  static constexpr EnumWord<JobChecks> kWords[] = {{"Told", JobChecks::kTold},
                                                   {"Strict", JobChecks::kStrict}};
  return kWords;
}

String FindMisfit(const CommandDeclaration& declaration, const ParameterMap& inputs,
                  const Map<String, String>& outputs) {
  for (const auto& [name, value] : inputs) {
    const std::string misfit = UnknownName("input", name, declaration.inputs);
    if (!misfit.empty()) return String(misfit);
  }
  for (const auto& [name, variable] : outputs) {
    const std::string misfit = UnknownName("output", name, declaration.outputs);
    if (!misfit.empty()) return String(misfit);
    const std::string target = variable.ToUTF8();
    if (!target.empty() && !target.starts_with('$')) {
      return String("output " + name.ToUTF8() + ": " + Quoted(target) +
                    " is no variable, which begins with $");
    }
  }
  for (const InputDeclaration& input : declaration.inputs) {
    const String* const text = FindText(inputs.Find(input.name).object);
    if (text == nullptr) continue;
    const std::string misfit = MisfitOfValue(input, text->ToUTF8());
    if (!misfit.empty()) return String(misfit);
  }
  return {};
}

}  // namespace lumo
