#include "commands/declaration.h"

namespace lumo {

ValueKindText Describe(ValueKind kind) {
  switch (kind) {
    case ValueKind::kText:
      return {"text", "any text"};
    case ValueKind::kURI:
      return {"URI", "[text] and a blank"};
    case ValueKind::kBoolean:
      return {"boolean", "0 or 1"};
    case ValueKind::kInteger:
      return {"integer", "decimal digits"};
    case ValueKind::kNumber:
      return {"number", "decimal, with a point or an exponent"};
    case ValueKind::kWord:
      return {"word", "one of the words named"};
    case ValueKind::kTextList:
      return {"text list", "texts joined by |"};
    case ValueKind::kIntegerArray:
      return {"integer array", "rank:extents [elements] and a blank"};
    case ValueKind::kNumberArray:
      return {"number array", "rank:extents [elements] and a blank"};
    case ValueKind::kRectangle:
      return {"rectangle", "left top right bottom, inclusive"};
    case ValueKind::kPalette:
      return {"palette", "count [(name r g b a null) ...] and a blank"};
    case ValueKind::kBooleanArray:
      return {"boolean array", "rank:extents [0s and 1s] and a blank"};
    case ValueKind::kTiles:
      return {"tiles", "width height bands left right top bottom, then Invariable or Variable"};
    case ValueKind::kGeoRef:
      return {"geo-reference", "as told in georeferencing.md"};
    case ValueKind::kPaletteArray:
      return {"palette array", "rank:extents [palettes] and a blank"};
    case ValueKind::kURIArray:
      return {"URI array", "rank:extents [[text] [text] ] and a blank"};
  }
  return {"", ""};
}

}  // namespace lumo
