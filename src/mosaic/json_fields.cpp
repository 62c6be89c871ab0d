#include <algorithm>
#include <cmath>

#include <fmt/format.h>

#include "foundation/json_lines.h"
#include "foundation/near_name.h"
#include "mosaic/json_fields_body.h"

namespace lumo {
namespace {

using Json = nlohmann::ordered_json;

std::string Plain(const Json& json) {
  return json.dump(-1, ' ', false, Json::error_handler_t::replace);
}

void Append(const Json& json, std::size_t indent, std::string& text) {
  const bool isPlain =
      std::none_of(json.begin(), json.end(), [](const Json& item) { return item.is_structured(); });
  if (!json.is_structured() || json.empty()) {
    text += Plain(json);
    return;
  }
  if (json.is_array() && isPlain) {
    char before = '[';
    for (const Json& item : json) {
      text += before;
      if (before == ',') text += ' ';
      text += Plain(item);
      before = ',';
    }
    text += ']';
    return;
  }
  text += json.is_object() ? "{" : "[";
  bool isFirst = true;
  for (const auto& [name, value] : json.items()) {
    text.append(isFirst ? "\n" : ",\n").append(indent + 2, ' ');
    if (json.is_object()) text.append(Plain(name)).append(": ");
    Append(value, indent + 2, text);
    isFirst = false;
  }
  text.append("\n").append(indent, ' ').append(json.is_object() ? "}" : "]");
}

}  // namespace

std::string WriteJson(const Json& json) {
  std::string text;
  Append(json, 0, text);
  return text + "\n";
}

JsonFields::JsonFields(const Json& object, std::string pointer)
    : object_(object), pointer_(std::move(pointer)) {
  if (!object_.is_object()) throw JsonMisfit{pointer_, "has to be an object"};
}

const Json& JsonFields::At(const char* name) {
  asked_.insert(name);
  const auto at = object_.find(name);
  if (at == object_.end()) throw JsonMisfit{pointer_, fmt::format("the field {} is missing", name)};
  return *at;
}

void JsonFields::Finish() const {
  for (const auto& [name, value] : object_.items()) {
    if (asked_.count(name) != 0) continue;
    const std::vector<std::string> known(asked_.begin(), asked_.end());
    throw JsonMisfit{PointerOf(name), "there is no such field" + DidYouMean(name, known)};
  }
}

double JsonFields::Number(const Json& json, const std::string& pointer) {
  if (json.is_number()) return json.get<double>();
  const std::string text = json.is_string() ? json.get<std::string>() : std::string();
  if (text == "nan") return std::nan("");
  if (text == "inf" || text == "-inf") return text[0] == '-' ? -HUGE_VAL : HUGE_VAL;
  throw JsonMisfit{pointer, "has to be a number"};
}

std::vector<double> JsonFields::Numbers(const Json& json, const std::string& pointer,
                                        std::size_t count) {
  if (!json.is_array() || json.size() != count) {
    throw JsonMisfit{pointer, fmt::format("has to be a list of {} numbers", count)};
  }
  std::vector<double> numbers;
  for (std::size_t i = 0; i < count; ++i) {
    numbers.push_back(Number(json[i], fmt::format("{}/{}", pointer, i)));
  }
  return numbers;
}

Json JsonFields::FromNumber(double value) {
  if (std::isnan(value)) return "nan";
  if (std::isinf(value)) return value < 0 ? "-inf" : "inf";
  constexpr double kWhole = 9007199254740992.0;  // 2^53
  if (value == std::trunc(value) && std::abs(value) < kWhole) return std::int64_t(value);
  return value;
}

Json ParseJson(const std::string& text) {
  try {
    return Json::parse(text);
  } catch (const Json::parse_error& error) {
    // "[json.exception.parse_error.101] parse error at line 3, column 4: …"
    const std::string what = error.what();
    const std::size_t at = what.find("line ");
    const std::size_t reason = what.find(": ", at);
    const unsigned line = at != what.npos ? static_cast<unsigned>(std::stoul(what.substr(at + 5)))
                                          : LineOfJson(text, "");
    const bool isCutOff = error.byte >= text.size();
    throw JsonMisfit{
        {},
        isCutOff || reason == what.npos
            ? fmt::format("line {}: the file breaks off", line)
            : fmt::format("line {}: {}", line, Printable(what.substr(reason + 2), 120))};
  }
}

}  // namespace lumo
