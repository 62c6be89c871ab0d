#include "options/option_values.h"

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
#include "foundation/text_case.h"
#include "foundation/text_form.h"
#include "raster/pixel_types.h"
#include "verb.h"

namespace lumo::host {
namespace {

using Strings = std::vector<std::string>;

/// The one of `words` that differs in its case at most; none otherwise.
std::optional<std::string> FindWord(const Strings& words, const std::string& text) {
  for (const std::string& word : words) {
    if (LowerCase(word) == LowerCase(text)) return word;
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
  const auto at = kNames.find(LowerCase(text));
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
  const auto at = kNames.find(LowerCase(text));
  return at != kNames.end() ? at->second : text;
}

std::string NoneOf(const std::string& text, const Strings& words) {
  return fmt::format("\"{}\" is none of {}{}", text, fmt::join(words, ", "),
                     DidYouMean(text, words));
}

/// Takes one of the words, or a name that `translate` turns into one.
ValueRule WordRule(Strings words, std::string (*translate)(const std::string&)) {
  return {[words, translate](std::string& text) {
            std::optional<std::string> word = FindWord(words, text);
            if (!word) word = FindWord(words, translate(text));
            if (!word) return NoneOf(text, words);
            text = *word;
            return std::string();
          },
          words,
          {}};
}

}  // namespace

ValueRule OneOf(const Strings& words) {
  return WordRule(words, &Translate);
}

ValueRule NumberWithUnit(const Strings& units) {
  return {[units](std::string& text) {
            Quantity quantity;
            if (!ReadQuantity(text, quantity)) return fmt::format("\"{}\" is no number", text);
            if (!quantity.unit.empty() && !FindWord(units, quantity.unit)) {
              return fmt::format("\"{}\": the unit is {}", text, units.front());
            }
            text = fmt::format("{}", quantity.value);
            return std::string();
          },
          {},
          units.front()};
}

ValueRule PixelTypeName() {
  Strings words;
  for (unsigned code = 0; code < 100; ++code) {
    if (DataTypeBytes(code) != 0) words.push_back(DataTypeName(code).ToUTF8());
  }
  return WordRule(std::move(words), &TranslateType);
}

ValueRule EightTypeName() {
  Strings words;
  for (unsigned code = 0; code < 100; ++code) {
    if (DispatchType(EightTypes{}, code, []<typename T>() { return true; })) {
      words.push_back(DataTypeName(code).ToUTF8());
    }
  }
  return WordRule(std::move(words), &TranslateType);
}

ValueRule CoordSysName() {
  return {[](std::string& text) {
            std::error_code ignored;
            const bool isCode = text.size() >= 4 && text.size() <= 6 &&
                                text.find_first_not_of("0123456789") == std::string::npos;
            if (isCode && !std::filesystem::exists(text, ignored)) text = "EPSG:" + text;
            return std::string();
          },
          {},
          {}};
}

bool ReadQuantity(const std::string& text, Quantity& quantity) {
  const std::string trimmed(Trimmed(text));
  const char* first = trimmed.data();
  const char* const last = first + trimmed.size();
  if (first != last && *first == '+') ++first;
  const auto [end, fault] = std::from_chars(first, last, quantity.value);
  if (fault != std::errc()) return false;
  quantity.unit = LowerCase(std::string(Trimmed({end, last})));
  // "nan", "inf" are read with the number; a unit is letters, or a sign of degrees.
  return std::all_of(quantity.unit.begin(), quantity.unit.end(), [](char c) {
    return (c >= 'a' && c <= 'z') || static_cast<unsigned char>(c) >= 0x80;
  });
}

Strings SplitList(const std::string& list) {
  Strings elements;
  std::size_t begin = 0;
  for (std::size_t comma = list.find(','); comma != list.npos; comma = list.find(',', begin)) {
    elements.push_back(list.substr(begin, comma - begin));
    begin = comma + 1;
  }
  elements.push_back(list.substr(begin));
  return elements;
}

std::string FormatKey(const std::string& option, const std::string& text) {
  Strings keys;
  for (std::uint32_t row = 0; row < FormatCount(); ++row) {
    keys.push_back(GetFormat(row).name.ToUTF8());
  }
  if (std::find(keys.begin(), keys.end(), text) != keys.end()) return text;
  if (const std::optional<std::string> key = FindWord(keys, text)) return *key;
  for (std::uint32_t row = 0; row < FormatCount(); ++row) {
    const FormatRecord& record = GetFormat(row);
    if (record.driver.GetLength() != 0 && LowerCase(record.driver.ToUTF8()) == LowerCase(text)) {
      return record.name.ToUTF8();
    }
  }
  throw HostError(kExitUsage, option + ": there is no format \"" + text + "\"" +
                                  DidYouMean(text, keys) + "; see vexg formats");
}

}  // namespace lumo::host
