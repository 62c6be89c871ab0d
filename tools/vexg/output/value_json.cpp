#include "output/value_json.h"

#include <cstdlib>
#include <sstream>
#include <vector>

#include "foundation/color.h"
#include "foundation/sub_rect.h"
#include "raster/tile_dimensions.h"

namespace lumo::host {
namespace {

/// A number with all the digits that it has in text; discarded for a text that is none.
Json NumberOf(const std::string& text) {
  if (text == "nan" || text == "-nan" || text == "inf" || text == "-inf") return {};
  Json number = Json::parse(text, nullptr, false);
  return number.is_number() ? number : Json(Json::value_t::discarded);
}

Json BooleanOf(const std::string& text) {
  if (text == "0" || text == "1") return text == "1";
  return Json::value_t::discarded;
}

/// Parts the elements of an array, in the order of their places, into lists of its last extent, and
/// these into lists of the one before.
Json Nested(std::vector<Json> elements, const std::vector<unsigned>& extents) {
  for (std::size_t i = extents.size(); i-- > 1;) {
    std::vector<Json> rows;
    for (std::size_t at = 0; at < elements.size(); ++at) {
      if (at % extents[i] == 0) rows.push_back(Json::array());
      rows.back().push_back(std::move(elements[at]));
    }
    elements = std::move(rows);
  }
  return elements;
}

/// "rank:extents [elements]", whose elements are words that `of` makes values of.
template <typename Of>
Json ArrayOf(const std::string& text, const Of& of) {
  constexpr unsigned kMostDimensions = 8;
  std::istringstream in(text);
  in.imbue(std::locale::classic());
  unsigned rank = 0;
  char colon = 0, open = 0;
  if (!(in >> rank >> colon) || colon != ':' || rank > kMostDimensions) {
    return Json::value_t::discarded;
  }
  std::vector<unsigned> extents(rank);
  for (unsigned& extent : extents) {
    if (!(in >> extent) || extent == 0) return Json::value_t::discarded;
  }
  if (!(in >> open) || open != '[') return Json::value_t::discarded;
  std::vector<Json> elements;
  for (std::string word; in >> word;) {
    const bool isLast = word.back() == ']';
    if (isLast) word.pop_back();
    if (!word.empty()) {
      elements.push_back(of(word));
      if (elements.back().is_discarded()) return Json::value_t::discarded;
    }
    if (isLast) return Nested(std::move(elements), extents);
  }
  return Json::value_t::discarded;
}

Json AsJson(const Palette& palette) {
  Palette colors = palette;
  Json list = Json::array();
  for (unsigned i = 0; i < colors.GetCount(); ++i) {
    const ColorPtr color = colors.At(i);
    list.push_back({{"name", color->name.ToUTF8()},
                    {"red", color->r},
                    {"green", color->g},
                    {"blue", color->b},
                    {"alpha", color->a},
                    {"isNull", color->isNull}});
  }
  return list;
}

Json AsJson(const SubRect& rect) {
  return {{"left", rect.left}, {"top", rect.top}, {"right", rect.right}, {"bottom", rect.bottom}};
}

Json AsJson(const TileDimensions& tiles) {
  return {{"width", tiles.width},
          {"height", tiles.height},
          {"bands", tiles.bands},
          {"borderLeft", tiles.borderLeft},
          {"borderRight", tiles.borderRight},
          {"borderTop", tiles.borderTop},
          {"borderBottom", tiles.borderBottom},
          {"borderClamp", tiles.borderClamp != 0}};
}

Json AsJson(const URI& uri) {
  return uri.ToUTF8();
}
Json AsJson(const String& text) {
  return text.ToUTF8();
}

template <typename T>
Json ListOf(const Array<T>& values) {
  Json list = Json::array();
  for (const T& value : values) list.push_back(AsJson(value));
  return list;
}

/// Discarded for a text that holds no such value.
Json TryValue(const String& text, ValueKind kind) {
  const std::string narrow = text.ToUTF8();
  switch (kind) {
    case ValueKind::kBoolean:
      return BooleanOf(narrow);
    case ValueKind::kInteger:
    case ValueKind::kNumber:
      return NumberOf(narrow);
    case ValueKind::kIntegerArray:
    case ValueKind::kNumberArray:
      return ArrayOf(narrow, NumberOf);
    case ValueKind::kBooleanArray:
      return ArrayOf(narrow, BooleanOf);
    case ValueKind::kTextList:
      return ListOf(ParseValue<Array<String>>(text));
    case ValueKind::kURI:
      return AsJson(ParseValue<URI>(text));
    case ValueKind::kURIArray:
      return ListOf(ParseValue<Array<URI>>(text));
    case ValueKind::kRectangle:
      return AsJson(ParseValue<SubRect>(text));
    case ValueKind::kTiles:
      return AsJson(ParseValue<TileDimensions>(text));
    case ValueKind::kPalette:
      return AsJson(ParseValue<Palette>(text));
    case ValueKind::kPaletteArray:
      return ListOf(ParseValue<Array<Palette>>(text));
    case ValueKind::kText:
    case ValueKind::kWord:
    case ValueKind::kGeoRef:
      break;
  }
  return Json::value_t::discarded;
}

}  // namespace

Json ValueAsJson(const String& text, ValueKind kind) {
  Json value = TryValue(text, kind);
  return value.is_discarded() ? Json(text.ToUTF8()) : value;
}

Json SecondsAsJson(const String& text) {
  const std::string narrow = text.ToUTF8();
  char* end = nullptr;
  const unsigned long long count = std::strtoull(narrow.c_str(), &end, 10);
  if (end == narrow.c_str()) return {};
  const std::string_view unit(end);
  const auto number = static_cast<double>(count);
  if (unit == "us") return number / 1e6;
  if (unit == "ms") return number / 1e3;
  if (unit == "s") return number;
  if (unit == "min") return number * 60;
  if (unit == "hr") return number * 3600;
  return {};
}

}  // namespace lumo::host
