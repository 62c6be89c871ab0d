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
  }
  return {"", ""};
}

}  // namespace lumo
