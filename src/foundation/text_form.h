#pragma once

#include <iosfwd>
#include <sstream>
#include <string_view>
#include <type_traits>

#include "foundation/string.h"

namespace lumo {

// The narrow text forms of values, as job and result documents carry them. All decode UTF-8 and
// use the classic locale, whatever the host has set.

/// The part of a text without blanks, tabs, carriage returns and line feeds at both ends.
VEXG_EXPORT std::string_view Trimmed(std::string_view text);

/// Reads the whole form: every character to the end of the stream, with blanks, carriage returns,
/// line feeds and tabs taken off both ends.
VEXG_EXPORT String ReadWholeText(std::istream& in);

/// Reads the word form: skips white space and takes the characters up to the next white space.
VEXG_EXPORT String ReadWordText(std::istream& in);

/// Reads the bracketed form: skips to the first "[", takes everything up to the next "]" without
/// trimming, and skips that. A stream that ends before "[" gives no text.
VEXG_EXPORT String ReadBracketedText(std::istream& in);

/// Writes the bracketed form: "[" text "] ".
VEXG_EXPORT void WriteBracketedText(std::ostream& out, const String& text);

/// An identifier in the bracketed form, as the elements of an array have it.
inline std::ostream& operator<<(std::ostream& out, const URI& uri) {
  WriteBracketedText(out, uri);
  return out;
}
/// Reads the bracketed form.
inline std::istream& operator>>(std::istream& in, URI& uri) {
  uri = URI(ReadBracketedText(in));
  return in;
}

/// Skips characters up to and past the next `mark`; a stream that ends stops the skip.
VEXG_EXPORT void SkipPast(std::istream& in, char mark);

/// A stream over the UTF-8 form of `text`, in the classic locale.
VEXG_EXPORT std::istringstream MakeTextReader(const String& text);

/// An empty stream to write a text form into, in the classic locale.
VEXG_EXPORT std::ostringstream MakeTextWriter();

namespace detail {
/// Reads a number as ReadNumber does for floating types.
template <typename T>
VEXG_EXPORT bool ReadFloating(std::istream& in, T& value);
/// Writes a number as WriteNumber does for floating types.
template <typename T>
VEXG_EXPORT void WriteFloating(std::ostream& out, T value);
}  // namespace detail

/// Reads one number by the stream's own number reading. Integers of 8 bits are numbers here, not
/// characters; "nan", "inf" and "-inf" are read for floating types, in the form that the stream
/// writes them.
/// @return false, with `value` 0 and the stream failed, when there is no number or it does not fit.
template <typename T>
bool ReadNumber(std::istream& in, T& value) {
  value = T();
  if constexpr (std::is_floating_point_v<T>) {
    return detail::ReadFloating(in, value);
  } else if constexpr (sizeof(T) == 1 && !std::is_same_v<T, bool>) {
    int wide = 0;
    if (!(in >> wide)) return false;
    value = static_cast<T>(wide);
    if (static_cast<int>(value) == wide) return true;
    value = T();
    in.setstate(std::ios::failbit);
    return false;
  } else {
    if (in >> value) return true;
    value = T();
    return false;
  }
}

/// Writes one number in the stream's form; integers of 8 bits as numbers. A floating value gets, in
/// the stream's default notation, the fewest digits that read back to the same value, unless the
/// stream has a precision or a notation of its own.
template <typename T>
void WriteNumber(std::ostream& out, T value) {
  if constexpr (std::is_floating_point_v<T>) {
    detail::WriteFloating(out, value);
  } else if constexpr (sizeof(T) == 1 && !std::is_same_v<T, bool>) {
    out << static_cast<int>(value);
  } else {
    out << value;
  }
}

}  // namespace lumo
