#pragma once

#include <set>
#include <stdexcept>
#include <string>
#include <vector>

#include <nlohmann/json.hpp>

namespace lumo {

/// Says what is wrong with a field of a JSON text, and where: thrown within one file, and never
/// beyond the function that reads it.
struct JsonMisfit {
  std::string pointer;  ///< JSON pointer (RFC 6901) of the field
  std::string what;
};

/// Reads the fields of a JSON object one by one, and refuses those that nobody has asked for.
///
///     JsonFields fields(json, "");
///     const auto side = fields.Get<unsigned>("side");
///     const auto name = fields.GetOr<std::string>("name", "none");
///     fields.Finish();  // throws JsonMisfit for any other field
class JsonFields {
 public:
  /// @param pointer  of the object in the whole text.
  JsonFields(const nlohmann::ordered_json& object, std::string pointer);

  bool Has(const char* name) const { return object_.contains(name); }
  /// The field as it stands; throws JsonMisfit where it is absent.
  const nlohmann::ordered_json& At(const char* name);
  /// The pointer of a field.
  std::string PointerOf(const std::string& name) const { return pointer_ + "/" + name; }

  /// The value of a field that has to be there.
  template <typename T>
  T Get(const char* name) {
    return As<T>(At(name), PointerOf(name));
  }
  /// The value of a field, or another where it is absent or null.
  template <typename T>
  T GetOr(const char* name, const T& otherwise) {
    asked_.insert(name);
    const bool isThere = Has(name) && !object_[name].is_null();
    return isThere ? As<T>(object_[name], PointerOf(name)) : otherwise;
  }
  /// Throws JsonMisfit for a field that has not been asked for.
  void Finish() const;

  /// A JSON value as a T, whole numbers without a fraction or a sign that T hasn't.
  template <typename T>
  static T As(const nlohmann::ordered_json& json, const std::string& pointer) {
    if constexpr (std::is_same_v<T, std::string>) {
      if (json.is_string()) return json.template get<std::string>();
      throw JsonMisfit{pointer, "has to be a text"};
    } else if constexpr (std::is_same_v<T, bool>) {
      if (json.is_boolean()) return json.template get<bool>();
      throw JsonMisfit{pointer, "has to be true or false"};
    } else if constexpr (std::is_same_v<T, double>) {
      return Number(json, pointer);
    } else {
      static_assert(std::is_same_v<T, unsigned>);
      constexpr std::uint64_t kMost = 0x7FFFFFFF;
      if (json.is_number_unsigned() && json.template get<std::uint64_t>() <= kMost) {
        return json.template get<unsigned>();
      }
      throw JsonMisfit{pointer, "has to be a whole number of 0 or more"};
    }
  }
  /// A number, or one of the texts "nan", "inf" and "-inf", for which JSON has no number.
  static double Number(const nlohmann::ordered_json& json, const std::string& pointer);
  /// `count` numbers in a list.
  static std::vector<double> Numbers(const nlohmann::ordered_json& json, const std::string& pointer,
                                     std::size_t count);
  /// The JSON form of a number, as Number reads it.
  static nlohmann::ordered_json FromNumber(double value);

 private:
  const nlohmann::ordered_json& object_;
  const std::string pointer_;
  std::set<std::string> asked_;
};

/// Parses a JSON text. Throws JsonMisfit, whose pointer is empty, for one that is none, with the
/// line in the words.
nlohmann::ordered_json ParseJson(const std::string& text);

/// Writes a JSON value with a field a line, and lists of plain values on one.
std::string WriteJson(const nlohmann::ordered_json& json);

}  // namespace lumo
