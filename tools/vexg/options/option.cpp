#include "options/option.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <type_traits>

#include <fmt/format.h>

#include "options/option_values.h"

namespace lumo::host {
namespace {

template <typename T>
inline constexpr bool kIsList =
    std::is_same_v<T, std::vector<std::string>> || std::is_same_v<T, std::vector<double>>;

template <typename T>
inline constexpr bool kIsOptional = false;
template <typename T>
inline constexpr bool kIsOptional<std::optional<T>> = true;

std::string Read(const std::string& text, std::string& to) {
  to = text;
  return {};
}

std::string Read(const std::string& text, double& to) {
  Quantity quantity;
  if (!ReadQuantity(text, quantity) || !quantity.unit.empty()) {
    return fmt::format("\"{}\" is no number", text);
  }
  to = quantity.value;
  return {};
}

template <typename T>
requires std::is_unsigned_v<T> std::string Read(const std::string& text, T& to) {
  const char* const first = text.data() + (text.starts_with('+') ? 1 : 0);
  const char* const last = text.data() + text.size();
  const auto [end, fault] = std::from_chars(first, last, to);
  if (fault == std::errc::result_out_of_range) return fmt::format("\"{}\" is too large", text);
  if (fault != std::errc() || end != last) {
    return fmt::format("\"{}\" is no whole number from 0 on", text);
  }
  return {};
}

template <typename T>
std::string Read(const std::string& text, std::optional<T>& to) {
  return Read(text, to.emplace());
}

/// Reads the values of one option into its variable.
template <typename T>
std::string ReadAll(const std::vector<std::string>& values, T& to) {
  if constexpr (kIsList<T>) {
    T all;
    for (const std::string& value : values) {
      if constexpr (std::is_same_v<T, std::vector<double>>) {
        for (const std::string& element : SplitList(value)) {
          if (std::string fault = Read(element, all.emplace_back()); !fault.empty()) return fault;
        }
      } else {
        all.push_back(value);
      }
    }
    to = std::move(all);
    return {};
  } else {
    return Read(values.back(), to);
  }
}

template <typename T>
std::string TextOf(const T& value) {
  if constexpr (kIsList<T>) {
    std::string text;
    for (const auto& element : value) {
      if (!text.empty()) text += ',';
      text += TextOf(element);
    }
    return text;
  } else if constexpr (kIsOptional<T>) {
    return value ? TextOf(*value) : std::string();
  } else {
    return fmt::format("{}", value);
  }
}

template <typename T>
constexpr OptionType TypeOf(const T&) {
  return std::is_same_v<T, bool>     ? OptionType::kFlag
         : std::is_same_v<T, double> ? OptionType::kNumber
         : std::is_unsigned_v<T>     ? OptionType::kWhole
                                     : OptionType::kText;
}
template <typename T>
requires kIsOptional<T> || kIsList<T>
constexpr OptionType TypeOf(const T&) {
  return TypeOf(typename T::value_type());
}

}  // namespace

const char* NameOf(OptionType type) {
  constexpr std::array kNames{"flag", "text", "word", "whole number", "number", "file"};
  return kNames[static_cast<std::size_t>(type)];
}

Option Option::Required() {
  spec_.isRequired = true;
  return *this;
}

Option Option::Shows(const char* shown) {
  spec_.shown = shown;
  spec_.isList = spec_.shown.find(',') != std::string::npos;
  return *this;
}

Option Option::IsFile(const char* shown) {
  spec_.type = OptionType::kFile;
  return Shows(shown);
}

Option Option::Within(std::uint64_t least, std::uint64_t most) {
  spec_.least = least;
  spec_.most = most;
  return Takes({[least, most](std::string& text) {
                  std::uint64_t value = 0;
                  const std::string fault = Read(text, value);
                  if (!fault.empty() || (value >= least && value <= most)) return fault;
                  return fmt::format("{} is not in {} to {}", text, least, most);
                },
                {},
                {}});
}

Option Option::Example(const char* value) {
  spec_.example = value;
  return *this;
}

Option Option::Takes(ValueRule rule) {
  if (!rule.choices.empty()) spec_.type = OptionType::kWord;
  spec_.choices = std::move(rule.choices);
  if (!rule.unit.empty()) spec_.unit = std::move(rule.unit);
  spec_.take = [read = std::move(rule.read),
                take = std::move(spec_.take)](const std::vector<std::string>& values) {
    std::vector<std::string> inForm = values;
    for (std::string& value : inForm) {
      if (std::string fault = read(value); !fault.empty()) return fault;
    }
    return take(inForm);
  };
  return *this;
}

Option Option::ShowsDefault() {
  spec_.defaultText = default_;
  return *this;
}

template <typename T>
Option OptionSet::Add(const char* names, T& to, const std::string& help) {
  OptionSpec& spec = options_.emplace_back();
  spec.names = SplitList(names);
  spec.type = TypeOf(to);
  spec.help = help;
  spec.isRepeatable = kIsList<T>;
  spec.take = [&to](const std::vector<std::string>& values) {
    if constexpr (std::is_same_v<T, bool>) {
      to = true;
      return std::string();
    } else {
      return ReadAll(values, to);
    }
  };
  return {spec, TextOf(to)};
}

template Option OptionSet::Add(const char*, bool&, const std::string&);
template Option OptionSet::Add(const char*, std::string&, const std::string&);
template Option OptionSet::Add(const char*, unsigned&, const std::string&);
template Option OptionSet::Add(const char*, std::uint64_t&, const std::string&);
template Option OptionSet::Add(const char*, double&, const std::string&);
template Option OptionSet::Add(const char*, std::optional<unsigned>&, const std::string&);
template Option OptionSet::Add(const char*, std::optional<double>&, const std::string&);
template Option OptionSet::Add(const char*, std::vector<std::string>&, const std::string&);
template Option OptionSet::Add(const char*, std::vector<double>&, const std::string&);

const OptionSpec* OptionSet::Find(const std::string& name) const {
  for (const OptionSpec& option : options_) {
    if (std::find(option.names.begin(), option.names.end(), name) != option.names.end()) {
      return &option;
    }
  }
  return nullptr;
}

}  // namespace lumo::host
