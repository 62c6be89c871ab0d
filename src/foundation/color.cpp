#include "foundation/color.h"

#include <algorithm>
#include <istream>
#include <iterator>
#include <ostream>

#include "foundation/text_form.h"

namespace lumo {
namespace {

Color MakeColor(const NamedColor& row) {
  const auto component = [&](int shift) { return static_cast<std::uint8_t>(row.value >> shift); };
  Color color(row.name, component(0), component(8), component(16), component(24));
  color.isNull = row.isNull;
  return color;
}

}  // namespace

Color::Color() : name("null") {}

Color::Color(const String& colorName, std::uint8_t red, std::uint8_t green, std::uint8_t blue,
             std::uint8_t alpha)
    : name(colorName), r(red), g(green), b(blue), a(alpha), isNull(false) {}

Color FindNamedColor(const String& name) {
  const auto* const row = std::find_if(std::begin(kNamedColors), std::end(kNamedColors),
                                       [&](const NamedColor& c) { return String(c.name) == name; });
  return row != std::end(kNamedColors) ? MakeColor(*row) : Color();
}

std::ostream& operator<<(std::ostream& out, const Color& color) {
  return out << color.name.ToUTF8() << ' ' << +color.r << ' ' << +color.g << ' ' << +color.b << ' '
             << +color.a << ' ' << (color.isNull ? 1 : 0);
}

std::istream& operator>>(std::istream& in, Color& color) {
  color.name = ReadWordText(in);
  for (std::uint8_t* component : {&color.r, &color.g, &color.b, &color.a}) {
    ReadNumber(in, *component);
  }
  return in >> color.isNull;
}

Palette::Palette(const Palette& other) {
  *this = other;
}

Palette& Palette::operator=(const Palette& other) {
  if (this == &other) return *this;
  colors_.clear();
  for (const auto& [index, color] : other.colors_) {
    colors_.emplace(index, ColorPtr(new Color(*color)));
  }
  count_ = other.count_;
  return *this;
}

ColorPtr Palette::At(unsigned index) {
  ColorPtr& color = colors_[index];
  if (color.IsNull()) color.Reset(new Color);
  return color;
}

void Palette::Set(unsigned index, const Color& color) {
  *At(index) = color;
}

void Palette::Append(const Color& color) {
  colors_[count_++].Reset(new Color(color));
}

std::ostream& operator<<(std::ostream& out, const Palette& palette) {
  out << palette.count_ << " [";
  for (unsigned i = 0; i < palette.count_; ++i) {
    const auto at = palette.colors_.find(i);
    out << '(' << (at != palette.colors_.end() ? *at->second : Color()) << ") ";
  }
  return out << "] ";
}

std::istream& operator>>(std::istream& in, Palette& palette) {
  // A text that breaks off still gives `count` colours, so a count that no band has is refused.
  constexpr unsigned kMaxCount = 65536;
  palette = Palette();
  unsigned count = 0;
  ReadNumber(in, count);
  SkipPast(in, '[');
  if (count > kMaxCount) {
    in.setstate(std::ios::failbit);
    return in;
  }
  for (unsigned i = 0; i < count; ++i) {
    Color color;
    SkipPast(in, '(');
    in >> color;
    SkipPast(in, ')');
    palette.Append(color);
  }
  SkipPast(in, ']');
  return in;
}

}  // namespace lumo
