#include "raster/tile_dimensions.h"

#include <istream>
#include <ostream>
#include <string>

#include "foundation/text_form.h"

namespace lumo {
namespace {

/// Reads numbers into `fields` in turn; false, with the stream failed, when one is missing.
template <typename... Fields>
bool ReadNumbers(std::istream& in, Fields&... fields) {
  return (ReadNumber(in, fields) && ...);
}

}  // namespace

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
