#include "foundation/json_lines.h"

#include <iterator>
#include <vector>

#include <nlohmann/json.hpp>

namespace lumo {
namespace {

using Json = nlohmann::ordered_json;

/// A text that counts the lines which a parser has come through.
class CountingText {
 public:
  using value_type = char;
  using difference_type = std::ptrdiff_t;
  using pointer = const char*;
  using reference = const char&;
  using iterator_category = std::input_iterator_tag;

  CountingText(const char* at, unsigned* line) : at_(at), line_(line) {}
  const char& operator*() const { return *at_; }
  CountingText& operator++() {
    if (*at_ == '\n') ++*line_;
    ++at_;
    return *this;
  }
  CountingText operator++(int) {
    const CountingText before = *this;
    ++*this;
    return before;
  }
  friend bool operator==(const CountingText& a, const CountingText& b) { return a.at_ == b.at_; }

 private:
  const char* at_;
  unsigned* line_;
};

/// The place of a parser in a JSON text, as a pointer.
class PlaceInJson {
 public:
  /// Takes an event in. True at the first sight of the field with the pointer.
  bool Take(Json::parse_event_t event, const Json& parsed, const std::string& wanted) {
    using Event = Json::parse_event_t;
    switch (event) {
      case Event::key:
        steps_.back().key = parsed.get<std::string>();
        return Text() == wanted;
      case Event::object_start:
      case Event::array_start: {
        const bool isIt = Text() == wanted;
        steps_.push_back({event == Event::array_start, 0, {}});
        return isIt;
      }
      case Event::object_end:
      case Event::array_end:
        steps_.pop_back();
        Next();
        return false;
      default: {
        const bool isIt = Text() == wanted;
        Next();
        return isIt;
      }
    }
  }

 private:
  struct Step {
    bool isArray;
    unsigned index;
    std::string key;
  };

  std::string Text() const {
    std::string text;
    for (const Step& step : steps_) {
      text.append("/").append(step.isArray ? std::to_string(step.index) : step.key);
    }
    return text;
  }
  void Next() {
    if (!steps_.empty()) ++steps_.back().index;
  }

  std::vector<Step> steps_;
};

}  // namespace

unsigned LineOfJson(const std::string& text, const std::string& pointer) {
  unsigned line = 1, found = 1;
  bool isFound = pointer.empty();
  PlaceInJson place;
  try {
    const auto look = [&](int /*depth*/, Json::parse_event_t event, Json& parsed) {
      if (!isFound && place.Take(event, parsed, pointer)) {
        isFound = true;
        found = line;
      }
      return true;
    };
    const char* const begin = text.data();
    const Json whole =
        Json::parse(CountingText(begin, &line), CountingText(begin + text.size(), &line), look);
    if (whole.is_discarded()) return line;
  } catch (const Json::exception&) {
    return line;
  }
  return found;
}

}  // namespace lumo
