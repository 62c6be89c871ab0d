#include "commands/variable_text.h"

#include <algorithm>
#include <cctype>
#include <string_view>

#include "foundation/text_form.h"

namespace lumo {
namespace {

bool IsVariablePart(char c) {
  return std::isalnum(static_cast<unsigned char>(c)) != 0 || c == '_';
}

/// Reads the variable at the $ at `at`; gives its name with the $, and moves behind it. Empty for
/// a $ that names none.
std::string TakeVariable(std::string_view text, std::size_t& at) {
  std::size_t end = at + 1;
  if (end < text.size() && text[end] == '{') {
    const std::size_t close = text.find('}', end);
    if (close == text.npos) return {};
    const std::string name = std::string("$").append(text.substr(end + 1, close - end - 1));
    at = close + 1;
    return name;
  }
  while (end < text.size() && IsVariablePart(text[end])) ++end;
  if (end == at + 1) return {};
  const std::string name(text.substr(at, end - at));
  at = end;
  return name;
}

/// Walks a text: `plain` takes each character, `variable` the name of each variable.
template <typename Plain, typename Variable>
void Walk(std::string_view text, Plain&& plain, Variable&& variable) {
  for (std::size_t at = 0; at < text.size();) {
    if (text.substr(at, 2) == "$$") {
      plain('$');
      at += 2;
      continue;
    }
    const std::string name = text[at] == '$' ? TakeVariable(text, at) : std::string();
    if (!name.empty()) {
      variable(name);
    } else {
      plain(text[at++]);
    }
  }
}

bool IsArray(ValueKind kind) {
  return kind == ValueKind::kIntegerArray || kind == ValueKind::kNumberArray ||
         kind == ValueKind::kBooleanArray || kind == ValueKind::kURIArray;
}

/// The array of the elements in a list, which are separated by blanks; a URI ends with its bracket.
std::string MakeArray(const std::string& list) {
  std::string elements;
  unsigned count = 0;
  for (std::string_view rest = Trimmed(list); !rest.empty(); ++count) {
    const bool isURI = rest[0] == '[';
    const std::size_t end = isURI ? rest.find(']') : rest.find_first_of(" \t\r\n");
    const std::size_t length = end == std::string::npos ? rest.size() : end + (isURI ? 1 : 0);
    elements.append(rest.substr(0, length)) += " ";
    rest = Trimmed(rest.substr(length));
  }
  return std::string("1:").append(std::to_string(count)).append(" [").append(elements) + "] ";
}

}  // namespace

void ForEachVariable(const String& text, const std::function<void(const String& variable)>& visit) {
  Walk(
      text.ToUTF8(), [](char) {}, [&](const std::string& name) { visit(String(name)); });
}

bool ExpandVariables(const String& text, ValueKind kind, const VariableReader& read,
                     String& expanded) {
  const std::string given = text.ToUTF8();
  std::string made;
  bool isWhole = true;
  Walk(
      given, [&](char c) { made += c; },
      [&](const std::string& name) {
        String value;
        isWhole = read(String(name), value) && isWhole;
        made += IsArray(kind) ? value.ToUTF8() : std::string(Trimmed(value.ToUTF8()));
      });
  if (!isWhole) return false;
  // "1:2 [...": an array as it stands.
  const bool isList = IsArray(kind) && given.find(':') > given.find_first_of("[$");
  expanded = String(isList ? MakeArray(made) : made);
  return true;
}

}  // namespace lumo
