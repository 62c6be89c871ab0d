#pragma once

#include <span>
#include <string_view>
#include <type_traits>
#include <vector>

#include "foundation/array.h"
#include "foundation/scalar.h"
#include "foundation/text_form.h"

// The text forms of command inputs and outputs. Every value travels as the text of a
// Scalar<String>; what one side formats, the other reads back to the same value.
//
//   String         all of the text, trimmed         bool      0 or 1
//   URI            [text] and a blank               numbers   the stream's form
//   Array<String>  pieces joined by |               Array<T>  rank:extent extent [a b c]
//   enumerations   one word                         others    their operator<< and operator>>

namespace lumo {

/// One word of an enumeration. An enumeration with a text form has a function
/// `std::span<const EnumWord<E>> WordsOf(E)` in its own namespace. Two more functions there are
/// optional: `E UnknownValueOf(E)`, what a word that is not in the list reads as (0 without it),
/// and `const char* UnknownWordOf(E)`, how a value that is not in the list is written (as no text).
template <typename E>
struct EnumWord {
  const char* word;  ///< compared exactly
  E value;
};

/// The words of an enumeration in their order, for the declaration of an input that takes them.
template <typename E>
std::vector<const char*> WordsIn() {
  std::vector<const char*> words;
  for (const EnumWord<E>& entry : WordsOf(E())) words.push_back(entry.word);
  return words;
}

/// The forms of a result that a command gives: the one that has always been given, and the exact
/// one.
enum class Form { kTold, kExact };

/// "Told", "Exact".
VEXG_EXPORT std::span<const EnumWord<Form>> WordsOf(Form);

/// The text of the Scalar<String> at `object`; null when there is none.
VEXG_EXPORT const String* FindText(const ObjectPtr& object);

/// A Scalar<String> that holds `text`.
VEXG_EXPORT ObjectPtr MakeText(const String& text);

namespace detail {

/// The pieces between the bars of a text.
VEXG_EXPORT Array<String> SplitAtBars(const String& text);
/// The pieces with a bar between each two.
VEXG_EXPORT String JoinWithBars(const Array<String>& pieces);

/// Reads the next word as a value of an enumeration.
template <typename E>
E ReadEnumWord(std::istream& in) {
  const std::string text = ReadWordText(in).ToUTF8();
  for (const EnumWord<E>& entry : WordsOf(E())) {
    if (text == entry.word) return entry.value;
  }
  if constexpr (requires { UnknownValueOf(E()); }) {
    return UnknownValueOf(E());
  } else {
    return E();
  }
}

}  // namespace detail

/// Reads a value of type T from its text form. A text that holds no such value gives T(); a word
/// that the enumeration lacks gives its UnknownValueOf. Text behind the value is not looked at.
///
///     const auto rect = ParseValue<SubRect>("0 0 99 49");
///     const auto form = ParseValue<Form>("Exact");
///     const String text = FormatValue(rect);  // "0 0 99 49"
template <typename T>
T ParseValue(const String& text) {
  std::istringstream in = MakeTextReader(text);
  if constexpr (std::is_same_v<T, String>) {
    return ReadWholeText(in);
  } else if constexpr (std::is_same_v<T, URI>) {
    return URI(ReadBracketedText(in));
  } else if constexpr (std::is_same_v<T, Array<String>>) {
    return detail::SplitAtBars(text);
  } else if constexpr (std::is_enum_v<T>) {
    return detail::ReadEnumWord<T>(in);
  } else if constexpr (std::is_arithmetic_v<T>) {
    T value;
    ReadNumber(in, value);
    return value;
  } else {
    T value{};
    in >> value;
    return value;
  }
}

/// The text form of `value`, from which ParseValue makes an equal one.
template <typename T>
String FormatValue(const T& value) {
  std::ostringstream out = MakeTextWriter();
  if constexpr (std::is_same_v<T, String>) {
    return value;
  } else if constexpr (std::is_same_v<T, URI>) {
    WriteBracketedText(out, value);
  } else if constexpr (std::is_same_v<T, Array<String>>) {
    return detail::JoinWithBars(value);
  } else if constexpr (std::is_enum_v<T>) {
    for (const EnumWord<T>& entry : WordsOf(T())) {
      if (entry.value == value) return entry.word;
    }
    if constexpr (requires { UnknownWordOf(T()); }) {
      return UnknownWordOf(T());
    } else {
      return {};
    }
  } else if constexpr (std::is_arithmetic_v<T>) {
    WriteNumber(out, value);
  } else {
    out << value;
  }
  return String(out.str());
}

/// The value in the text at `object`; T() when it isn't a Scalar<String>.
template <typename T>
T ReadValue(const ObjectPtr& object) {
  const String* const text = FindText(object);
  return text != nullptr ? ParseValue<T>(*text) : T();
}

}  // namespace lumo
