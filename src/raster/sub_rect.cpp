#include "raster/sub_rect.h"

#include <algorithm>
#include <istream>
#include <ostream>
#include <string>

namespace lumo {
namespace {

/// Reads numbers into `fields` in turn; false, with the stream failed, when one is missing.
template <typename... Fields>
bool ReadNumbers(std::istream& in, Fields&... fields) {
  return (ReadNumber(in, fields) && ...);
}

}  // namespace

SubRect::SubRect(unsigned leftX, unsigned topY, unsigned rightX, unsigned bottomY)
    : left(leftX), top(topY), right(rightX), bottom(bottomY) {
  Order();
}

SubRect::SubRect(const Array<unsigned>& points) {
  if (points.GetCount() < 2) return;
  left = right = points[0];
  top = bottom = points[1];
  for (unsigned i = 2; i + 1 < points.GetCount(); i += 2) {
    left = std::min(left, points[i]);
    right = std::max(right, points[i]);
    top = std::min(top, points[i + 1]);
    bottom = std::max(bottom, points[i + 1]);
  }
}

void SubRect::Order() {
  if (right < left) std::swap(left, right);
  if (bottom < top) std::swap(top, bottom);
}

SubRect SubRect::Clip(unsigned lowX, unsigned lowY, unsigned highX, unsigned highY) const {
  return {std::max(left, lowX), std::max(top, lowY), std::min(right, highX),
          std::min(bottom, highY)};
}

std::ostream& operator<<(std::ostream& out, const SubRect& rect) {
  return out << rect.left << ' ' << rect.top << ' ' << rect.right << ' ' << rect.bottom;
}

std::istream& operator>>(std::istream& in, SubRect& rect) {
  unsigned left = 0;
  unsigned top = 0;
  unsigned right = 0;
  unsigned bottom = 0;
  const bool whole = ReadNumbers(in, left, top, right, bottom);
  rect = whole ? SubRect(left, top, right, bottom) : SubRect();
  return in;
}

std::ostream& operator<<(std::ostream& out, const TileDimensions& d) {
  for (const unsigned number :
       {d.width, d.height, d.bands, d.borderLeft, d.borderRight, d.borderTop, d.borderBottom}) {
    out << number << ' ';
  }
  return out << (d.borderClamp == 0 ? "Invariable" : "Variable");
}

std::istream& operator>>(std::istream& in, TileDimensions& dimensions) {
  TileDimensions d;
  std::string clamp;
  dimensions = {};
  if (!ReadNumbers(in, d.width, d.height, d.bands, d.borderLeft, d.borderRight, d.borderTop,
                   d.borderBottom) ||
      !(in >> clamp)) {
    return in;
  }
  if (clamp != "Variable" && clamp != "Invariable") {
    in.setstate(std::ios::failbit);
    return in;
  }
  d.borderClamp = clamp == "Variable" ? 1 : 0;
  dimensions = d;
  return in;
}

}  // namespace lumo
