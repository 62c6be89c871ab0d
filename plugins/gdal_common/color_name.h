#pragma once

#include <cstdint>
#include <cstdio>

#include "foundation/color.h"

namespace lumo::gdal {

/// The name of a colour of a file: its own when it has one in the table, else its numbers.
inline String ColorNameOf(std::uint8_t r, std::uint8_t g, std::uint8_t b, std::uint8_t a) {
  const std::uint32_t value =
      r | std::uint32_t{g} << 8 | std::uint32_t{b} << 16 | std::uint32_t{a} << 24;
  for (const NamedColor& color : kNamedColors) {
    if (color.value == value && !color.isNull) return color.name;
  }
  char text[8];
  std::snprintf(text, sizeof text, "#%02x%02x%02x", r, g, b);
  return text;
}

}  // namespace lumo::gdal
