#pragma once

#include <cstdint>
#include <iosfwd>
#include <map>

#include "foundation/pointer.h"

namespace lumo {

/// One row of the table of named colours.
struct NamedColor {
  /// Its name, in lower case.
  const char* name;
  std::uint32_t value;  ///< red in the lowest byte, then green, blue and alpha
  bool isNull;
};

/// Rows of the table of named colours.
inline constexpr unsigned kNamedColorCount = 146;

/// The named colours in their fixed order; the last is "null", the only one with the null flag.
VEXG_EXPORT extern const NamedColor kNamedColors[kNamedColorCount];

/// A named colour with alpha. Its text form is the name, then red, green, blue, alpha and the null
/// flag as decimal numbers, each after a blank: "red 255 0 0 255 0".
class VEXG_EXPORT Color {
 public:
  using PointerRoot = Color;

  /// The colour "null": all components 0 and the null flag set.
  Color();
  /// A colour that is not "null". The name is free: nothing looks the components up in the table.
  /// @param red,green,blue,alpha  0 to 255; an alpha of 255 is opaque.
  Color(const String& colorName, std::uint8_t red, std::uint8_t green, std::uint8_t blue,
        std::uint8_t alpha = 255);
  Color(const Color&) = default;
  Color& operator=(const Color&) = default;
  virtual ~Color() = default;

  String name;         ///< one word: the text form ends it at a blank
  std::uint8_t r = 0;  ///< red
  std::uint8_t g = 0;  ///< green
  std::uint8_t b = 0;  ///< blue
  std::uint8_t a = 0;  ///< alpha, 255 opaque
  bool isNull = true;  ///< stands for no colour
};

using ColorPtr = Pointer<Color>;

/// The table's colour of that name, compared exactly; the colour "null" for a name not in it.
VEXG_EXPORT Color FindNamedColor(const String& name);

/// Writes the text form of a colour, without a blank behind it.
VEXG_EXPORT std::ostream& operator<<(std::ostream& out, const Color& color);
/// Reads the text form. A component that is no number from 0 to 255 becomes 0 and fails the stream.
VEXG_EXPORT std::istream& operator>>(std::istream& in, Color& color);

/// The colour table of a band. Its text form is the count, " [", then "(" colour ") " for each
/// index from 0, then "] ".
///
/// A copy has colours of its own. Threads: many readers through GetCount, else one user.
class VEXG_EXPORT Palette {
 public:
  using PointerRoot = Palette;

  Palette() = default;
  Palette(const Palette& other);
  Palette& operator=(const Palette& other);
  virtual ~Palette() = default;

  /// The colour at `index`; the colour "null" is stored there first when it is missing.
  ColorPtr At(unsigned index);

  /// Copies `color` into the one that stands at `index`, which its other holders see, or stores a
  /// new one. The count stays.
  void Set(unsigned index, const Color& color);

  /// Stores a copy at the index GetCount() and adds 1 to it.
  void Append(const Color& color);

  /// How many colours were appended.
  unsigned GetCount() const { return count_; }

 private:
  friend VEXG_EXPORT std::ostream& operator<<(std::ostream& out, const Palette& palette);

  std::map<unsigned, ColorPtr> colors_;
  unsigned count_ = 0;
};

using PalettePtr = Pointer<Palette>;

/// Writes the text form; an index below the count without a colour is written as "null".
VEXG_EXPORT std::ostream& operator<<(std::ostream& out, const Palette& palette);

/// Reads what operator<< writes into an emptied palette. A text that breaks off gives colours
/// without a name for the rest of its count; a count over 65536 fails the stream.
VEXG_EXPORT std::istream& operator>>(std::istream& in, Palette& palette);

}  // namespace lumo
