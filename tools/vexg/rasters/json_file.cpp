#include "rasters/json_file.h"

#include <algorithm>
#include <cmath>

#include <fmt/format.h>

#include "foundation/json_lines.h"
#include "foundation/near_name.h"
#include "jobs/document.h"
#include "verb.h"

namespace lumo::host {
JsonField JsonField::Below(const Json& json, Step step) const {
  std::vector<Step> steps = steps_;
  steps.push_back(std::move(step));
  return {source_, json, std::move(steps)};
}

std::string JsonField::Where() const {
  std::string path, pointer;
  for (const Step& step : steps_) {
    pointer += fmt::format("/{}", step.isIndex ? std::to_string(step.index) : step.name);
    if (step.isIndex) {
      path += fmt::format("[{}]", step.index);
    } else {
      if (!path.empty()) path += '.';
      path += Printable(step.name);
    }
  }
  return fmt::format("{}: line {}{}{}", source_->name, LineOfJson(source_->text, pointer),
                     path.empty() ? "" : ": ", path);
}

void JsonField::Refuse(const std::string& why) const {
  throw HostError(kExitUsage, Where() + ": " + why);
}

JsonField JsonField::Get(const char* name) const {
  if (!Has(name)) Refuse(fmt::format("\"{}\" is missing", name));
  return Below(json_->at(name), {name, 0, false});
}

std::vector<std::pair<std::string, JsonField>> JsonField::Members() const {
  if (!json_->is_object()) Refuse("an object is expected");
  std::vector<std::pair<std::string, JsonField>> all;
  for (const auto& [key, value] : json_->items()) {
    all.emplace_back(key, Below(value, {key, 0, false}));
  }
  return all;
}

std::vector<JsonField> JsonField::List() const {
  if (!json_->is_array() || json_->empty()) Refuse("a list of one or more is expected");
  std::vector<JsonField> all;
  for (std::size_t i = 0; i < json_->size(); ++i) all.push_back(Below((*json_)[i], {"", i, true}));
  return all;
}

std::string JsonField::Text() const {
  if (!json_->is_string()) Refuse("a text is expected");
  return json_->get<std::string>();
}

bool JsonField::Flag() const {
  if (!json_->is_boolean()) Refuse("true or false is expected");
  return json_->get<bool>();
}

double JsonField::Number() const {
  if (!json_->is_number()) Refuse("a number is expected");
  return json_->get<double>();
}

unsigned JsonField::Whole(unsigned least, unsigned most) const {
  const double value = Number();
  if (!(value >= least && value <= most) || value != std::trunc(value)) {
    Refuse(fmt::format("a whole number from {} to {} is expected", least, most));
  }
  return static_cast<unsigned>(value);
}

std::string JsonField::OneOf(std::initializer_list<const char*> words) const {
  const std::string text = Text();
  if (std::find(words.begin(), words.end(), text) == words.end()) {
    Refuse(fmt::format("it is {}", fmt::join(words, " or ")));
  }
  return text;
}

Color JsonField::AsColor() const {
  const std::string text = Text();
  const bool isHex = text.size() == 7 && text[0] == '#' &&
                     text.find_first_not_of("0123456789abcdefABCDEF", 1) == text.npos;
  if (!isHex) {
    const Color named = FindNamedColor(String(text));
    if (named.isNull) Refuse("a colour is #rrggbb, or a name such as green");
    return named;
  }
  const auto part = [&](std::size_t at) {
    return static_cast<std::uint8_t>(std::stoul(text.substr(at, 2), nullptr, 16));
  };
  return {String("class"), part(1), part(3), part(5)};
}

void JsonField::Allow(std::initializer_list<const char*> names) const {
  for (const auto& [key, field] : Members()) {
    const std::string& name = key;
    const bool isKnown =
        std::any_of(names.begin(), names.end(), [&](const char* known) { return name == known; });
    if (isKnown) continue;
    field.Refuse(fmt::format("there is no \"{}\" here{}", Printable(name),
                             DidYouMean(name, {names.begin(), names.end()})));
  }
}

JsonFile::JsonFile(const std::string& file) {
  const auto source = std::make_shared<JsonField::Source>();
  source->name = file;
  source->text = ReadFile(file);
  try {
    source->json = Json::parse(source->text);
  } catch (const nlohmann::json::parse_error&) {
    throw HostError(kExitUsage,
                    fmt::format("{}: line {} is no JSON", file, LineOfJson(source->text, "")));
  }
  source_ = source;
}

}  // namespace lumo::host
