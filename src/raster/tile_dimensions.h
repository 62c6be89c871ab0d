#pragma once

#include <iosfwd>

#include "platform/export.h"

namespace lumo {

/// The size of the tiles of an iterator, and of the borders around them. Passed by value. All zero
/// means no preference.
///
/// Its text form is the first seven numbers, each followed by a blank, then "Invariable" or
/// "Variable" for borderClamp 0 or 1.
struct VEXG_EXPORT TileDimensions {
  unsigned width = 0;         ///< samples, without borders
  unsigned height = 0;        ///< lines, without borders
  unsigned bands = 0;         ///< 0: all bands of the raster
  unsigned borderLeft = 0;    ///< columns in front of the tile
  unsigned borderRight = 0;   ///< columns behind it
  unsigned borderTop = 0;     ///< lines above it
  unsigned borderBottom = 0;  ///< lines below it
  unsigned borderClamp = 0;   ///< 1: borders end at the raster's edges; 0: they stay and are padded

  bool HasBorders() const { return (borderLeft | borderRight | borderTop | borderBottom) != 0; }
  friend bool operator==(const TileDimensions&, const TileDimensions&) = default;
};

VEXG_EXPORT std::ostream& operator<<(std::ostream& out, const TileDimensions& dimensions);
/// A text that breaks off fails the stream and leaves all zero.
VEXG_EXPORT std::istream& operator>>(std::istream& in, TileDimensions& dimensions);

}  // namespace lumo
