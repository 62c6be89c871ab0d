#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "foundation/string.h"

// Pieces that the readers of metadata texts share. The texts are UTF-16; blanks are blanks and
// tabs, and case means that of ASCII letters.

namespace lumo {

/// Limit on a definition file and on each file that is read for its metadata.
inline constexpr std::uint64_t kMaxMetadataBytes = 16U << 20;

/// Reads a whole file of at most kMaxMetadataBytes.
/// @param path   UTF-8.
/// @param fault  [out] "path: what", for a file that can't be read, is none, or is too large.
VEXG_EXPORT bool ReadMetadataFile(const std::string& path, std::string& bytes, std::string& fault);

/// UTF-8 bytes, with or without a mark of byte order at the start, as text.
std::u16string DecodeMetadataText(std::string_view bytes);

/// The text as a String.
String ToString(std::u16string_view text);
/// The units of a String, as long as it lives unchanged.
std::u16string_view View(const String& text);

/// Blanks and the ends of lines.
inline constexpr std::u16string_view kBlanks = u" \t\r\n";
/// Stands in a source of a definition file for the number of a repeated group.
inline constexpr char16_t kRepeat = u'#';

/// `text` without the characters of `marks` at both ends.
std::u16string_view Trimmed(std::u16string_view text, std::u16string_view marks = u" \t");

/// The text with a to z in upper case.
std::u16string ToUpper(std::u16string_view text);
/// The text with A to Z in lower case.
std::u16string ToLower(std::u16string_view text);

/// "/a/b/" for any way of writing that path.
std::u16string NormalPath(std::u16string_view path);

/// Goes over the lines of a text, which end at a line feed, a carriage return, the two together, or
/// the end of the text.
class TextLines {
 public:
  explicit TextLines(std::u16string_view text) : rest_(text) {}

  /// The next line without its end. False when there is none.
  bool Next(std::u16string_view& line);

  unsigned Number() const { return number_; }  ///< of the line given last, from 1

 private:
  std::u16string_view rest_;
  unsigned number_ = 0;
};

/// Reads the unsigned number at the start of `text`, whose prefix gives the base: 0x sixteen, 0
/// eight, else ten; a sign in front is taken as the C library takes it. The rest is not looked at.
/// @return where the number ends; 0 when there is none, or none that 64 bits hold.
std::size_t ReadUnsigned(std::u16string_view text, std::uint64_t& value);

/// Reads the number at the start of `text` as the C library does in the "C" locale, hexadecimal
/// numbers left out: digits with a point and an exponent, "inf" or "nan".
/// @return where the number ends; 0 when there is none.
std::size_t ReadDouble(std::u16string_view text, double& value);

}  // namespace lumo
