#include "option_values.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <filesystem>
#include <map>
#include <optional>

#include <fmt/format.h>
#include <fmt/ranges.h>

#include "data/format_table.h"
#include "foundation/near_name.h"
#include "raster/pixel_types.h"
#include "verb.h"

namespace lumo::host {
namespace {

using Strings = std::vector<std::string>;

std::string Lower(const std::string& text) {
  return CLI::detail::to_lower(text);
}

/// The one of `words` that differs in its case at most; none otherwise.
std::optional<std::string> FindWord(const Strings& words, const std::string& text) {
  for (const std::string& word : words) {
    if (Lower(word) == Lower(text)) return word;
  }
  return {};
}

/// Names that other programs have for words of ours.
std::string Translate(const std::string& text) {
  static const std::map<std::string, std::string> kNames{{"bilinear", "linear"},
                                                         {"bicubic", "cubic"},
                                                         {"cubicconvolution", "cubic"},
                                                         {"cubic_convolution", "cubic"},
                                                         {"near", "nearest"},
                                                         {"nearestneighbor", "nearest"},
                                                         {"nearestneighbour", "nearest"},
                                                         {"nearest_neighbor", "nearest"},
                                                         {"nearest_neighbour", "nearest"},
                                                         {"nn", "nearest"},
                                                         {"mode", "majority"},
                                                         {"pixel", "bip"},
                                                         {"line", "bil"},
                                                         {"band", "bsq"},
                                                         {"exact", "rigorous"},
                                                         {"approximate", "polynomial"}};
  const auto at = kNames.find(Lower(text));
  return at != kNames.end() ? at->second : text;
}

std::string TranslateType(const std::string& text) {
  static const std::map<std::string, std::string> kNames{{"float32", "Single"},
                                                         {"float", "Single"},
                                                         {"f4", "Single"},
                                                         {"float64", "Double"},
                                                         {"f8", "Double"},
                                                         {"uint8", "Byte"},
                                                         {"u1", "Byte"},
                                                         {"int8", "Char"},
                                                         {"sbyte", "Char"},
                                                         {"short", "Int16"},
                                                         {"ushort", "UInt16"},
                                                         {"i2", "Int16"},
                                                         {"u2", "UInt16"},
                                                         {"i4", "Int32"},
                                                         {"u4", "UInt32"},
                                                         {"cfloat32", "ComplexSingle"},
                                                         {"complex64", "ComplexSingle"},
                                                         {"cfloat64", "ComplexDouble"},
                                                         {"complex128", "ComplexDouble"}};
  const auto at = kNames.find(Lower(text));
  return at != kNames.end() ? at->second : text;
}

std::string NoneOf(const std::string& text, const Strings& words) {
  return fmt::format("\"{}\" is none of {}{}", text, fmt::join(words, ", "),
                     DidYouMean(text, words));
}

bool IsNumber(const std::string& text) {
  Quantity quantity;
  return ReadQuantity(text, quantity) && quantity.unit.empty();
}

/// True for options whose value is a list, as their help shows it.
bool IsList(const CLI::Option& option) {
  return option.get_type_name().find(',') != std::string::npos;
}

const CLI::Option* FindOption(const CLI::App& app, const std::string& name) {
  for (const CLI::Option* option : app.get_options()) {
    if (option->check_name(name)) return option;
  }
  for (const CLI::App* group :
       app.get_subcommands([](const CLI::App* sub) { return sub->get_name().empty(); })) {
    if (const CLI::Option* const found = FindOption(*group, name)) return found;
  }
  return nullptr;
}

void AddOptionNames(const CLI::App& app, Strings& names) {
  for (const CLI::Option* option : app.get_options()) {
    for (const std::string& name : option->get_lnames()) names.push_back("--" + name);
  }
  for (const CLI::App* group :
       app.get_subcommands([](const CLI::App* sub) { return sub->get_name().empty(); })) {
    AddOptionNames(*group, names);
  }
}

/// The verb of a command line, and where it stands; null for none.
const CLI::App* FindVerb(const CLI::App& app, const Strings& arguments, std::size_t& at) {
  for (at = 0; at < arguments.size(); ++at) {
    if (arguments[at] == "--load") {
      ++at;
    } else if (!arguments[at].starts_with('-')) {
      try {
        return app.get_subcommand(arguments[at]);
      } catch (const CLI::OptionNotFound&) {
        return nullptr;
      }
    }
  }
  return nullptr;
}

/// A list with commas alone between its elements.
std::string WithCommas(const std::string& text) {
  std::string joined;
  bool isBetween = false;
  for (const char c : text) {
    if (c == ' ' || c == '\t' || c == ',') {
      isBetween = !joined.empty();
      continue;
    }
    if (isBetween) joined += ',';
    isBetween = false;
    joined += c;
  }
  return joined;
}

/// True when every element of the list is a number.
bool HoldsNumbers(const std::string& text) {
  const Strings parts = CLI::detail::split(WithCommas(text), ',');
  return !text.empty() && std::all_of(parts.begin(), parts.end(), IsNumber);
}

}  // namespace

CLI::Validator OneOf(const Strings& words) {
  return CLI::Validator(
      [words](std::string& text) {
        std::optional<std::string> word = FindWord(words, text);
        if (!word) word = FindWord(words, Translate(text));
        if (!word) return NoneOf(text, words);
        text = *word;
        return std::string();
      },
      fmt::format("{{{}}}", fmt::join(words, ",")));
}

CLI::Validator NumberWithUnit(const Strings& units) {
  return CLI::Validator(
      [units](std::string& text) {
        Quantity quantity;
        if (!ReadQuantity(text, quantity)) return fmt::format("\"{}\" is no number", text);
        if (!quantity.unit.empty() && !FindWord(units, quantity.unit)) {
          return fmt::format("\"{}\": the unit is {}", text,
                             units.empty() ? std::string("none") : units.front());
        }
        text = fmt::format("{}", quantity.value);
        return std::string();
      },
      "");
}

CLI::Validator PixelTypeName() {
  return CLI::Validator(
      [](std::string& text) {
        Strings words;
        for (unsigned code = 0; code < 100; ++code) {
          if (DataTypeBytes(code) != 0) words.push_back(DataTypeName(code).ToUTF8());
        }
        std::optional<std::string> word = FindWord(words, text);
        if (!word) word = FindWord(words, TranslateType(text));
        if (!word) return NoneOf(text, words);
        text = *word;
        return std::string();
      },
      "");
}

CLI::Validator CoordSysName() {
  return CLI::Validator(
      [](std::string& text) {
        std::error_code ignored;
        const bool isCode = text.size() >= 4 && text.size() <= 6 &&
                            text.find_first_not_of("0123456789") == std::string::npos;
        if (isCode && !std::filesystem::exists(text, ignored)) text = "EPSG:" + text;
        return std::string();
      },
      "");
}

bool ReadQuantity(const std::string& text, Quantity& quantity) {
  const std::string trimmed = CLI::detail::trim_copy(text);
  const char* first = trimmed.data();
  const char* const last = first + trimmed.size();
  if (first != last && *first == '+') ++first;
  const auto [end, fault] = std::from_chars(first, last, quantity.value);
  if (fault != std::errc()) return false;
  quantity.unit = Lower(CLI::detail::trim_copy(std::string(end, last)));
  // "nan", "inf" are read with the number; a unit is letters, or a sign of degrees.
  return std::all_of(quantity.unit.begin(), quantity.unit.end(), [](char c) {
    return (c >= 'a' && c <= 'z') || static_cast<unsigned char>(c) >= 0x80;
  });
}

std::string FormatKey(const std::string& option, const std::string& text) {
  Strings keys;
  for (const FormatRecord& record : gCdfFormatRecords) keys.push_back(record.name.ToUTF8());
  if (std::find(keys.begin(), keys.end(), text) != keys.end()) return text;
  if (const std::optional<std::string> key = FindWord(keys, text)) return *key;
  for (const FormatRecord& record : gCdfFormatRecords) {
    if (record.driver.GetLength() != 0 && Lower(record.driver.ToUTF8()) == Lower(text)) {
      return record.name.ToUTF8();
    }
  }
  throw HostError(kExitUsage, option + ": there is no format \"" + text + "\"" +
                                  DidYouMean(text, keys) + "; see vexg formats");
}

Strings JoinLists(const CLI::App& app, Strings arguments) {
  std::size_t verbAt = 0;
  const CLI::App* const verb = FindVerb(app, arguments, verbAt);
  if (verb == nullptr) return arguments;
  Strings joined(arguments.begin(), arguments.begin() + static_cast<std::ptrdiff_t>(verbAt) + 1);
  for (std::size_t i = verbAt + 1; i < arguments.size(); ++i) {
    const std::string& argument = arguments[i];
    if (argument == "--") {
      joined.insert(joined.end(), arguments.begin() + static_cast<std::ptrdiff_t>(i),
                    arguments.end());
      break;
    }
    const std::size_t equals = argument.find('=');
    const std::string name = argument.substr(0, equals);
    const CLI::Option* const option = name.starts_with("--") ? FindOption(*verb, name) : nullptr;
    joined.push_back(argument);
    if (option == nullptr || !IsList(*option)) continue;
    std::string list;
    if (equals != std::string::npos) {
      list = argument.substr(equals + 1);
    } else if (i + 1 < arguments.size()) {
      list = arguments[++i];
    }
    if (!HoldsNumbers(list)) {
      if (equals == std::string::npos && !list.empty()) joined.push_back(list);
      continue;
    }
    while (i + 1 < arguments.size() && HoldsNumbers(arguments[i + 1])) {
      list += "," + arguments[++i];
    }
    joined.back() = name + "=" + WithCommas(list);
  }
  return joined;
}

std::string DescribeBadLine(const CLI::App& app, const Strings& arguments,
                            const CLI::ParseError& error) {
  std::size_t verbAt = 0;
  const CLI::App* const verb = FindVerb(app, arguments, verbAt);
  std::string text = error.what();
  if (verb == nullptr && verbAt < arguments.size()) {
    Strings verbs;
    for (const CLI::App* known : app.get_subcommands([](const CLI::App*) { return true; })) {
      verbs.push_back(known->get_name());
    }
    text = "there is no verb " + arguments[verbAt] + DidYouMean(arguments[verbAt], verbs);
  } else if (verb != nullptr) {
    Strings known;
    AddOptionNames(*verb, known);
    AddOptionNames(app, known);
    for (std::size_t i = verbAt + 1; i < arguments.size() && arguments[i] != "--"; ++i) {
      const std::string name = arguments[i].substr(0, arguments[i].find('='));
      if (!name.starts_with("--")) continue;
      if (std::find(known.begin(), known.end(), name) != known.end()) continue;
      text = verb->get_name() + " has no option " + name + DidYouMean(name, known);
      break;
    }
  }
  std::replace(text.begin(), text.end(), '\n', ' ');
  return text + "; see vexg " + (verb != nullptr ? verb->get_name() + " --help" : "--help");
}

}  // namespace lumo::host
