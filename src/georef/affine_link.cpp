#include "georef/affine_link.h"

#include <cmath>

#include "georef/std_georef.h"

namespace lumo {
namespace {

/// The turn of a grid; exactly none where it isn't turned.
struct Turn {
  explicit Turn(const GeoRef& grid) {
    if (grid.Rotation() == 0) return;
    cosine = std::cos(grid.Rotation() * StdGeoRef::kRadiansPerDegree);
    sine = std::sin(grid.Rotation() * StdGeoRef::kRadiansPerDegree);
  }
  double cosine = 1;
  double sine = 0;
};

bool IsUsable(const GeoRef& model) {
  return dynamic_cast<const StdGeoRef*>(&model) != nullptr && model.PixelSizeX() != 0 &&
         model.PixelSizeY() != 0;
}

}  // namespace

std::optional<AffineLink> FindAffineLink(const GeoRef& from, const GeoRef& to) {
  if (!IsUsable(from) || !IsUsable(to)) return std::nullopt;
  if (!from.CoordinateSystem().IsEqual(to.CoordinateSystem())) return std::nullopt;
  const Turn f(from), t(to);
  // To the target's axes before its turn, (a, b) in its pixels. The tie points are subtracted
  // first, so that large map coordinates cost no digits.
  const double ax = f.cosine * from.PixelSizeX() / to.PixelSizeX();
  const double ay = f.sine * from.PixelSizeY() / to.PixelSizeX();
  const double bx = -f.sine * from.PixelSizeX() / to.PixelSizeY();
  const double by = f.cosine * from.PixelSizeY() / to.PixelSizeY();
  const double a0 = (from.TieMapX() - to.TieMapX()) / to.PixelSizeX() - from.TiePixelX() * ax -
                    from.TiePixelY() * ay;
  const double b0 = (to.TieMapY() - from.TieMapY()) / to.PixelSizeY() - from.TiePixelX() * bx -
                    from.TiePixelY() * by;
  return AffineLink{t.cosine * a0 - t.sine * b0 + to.TiePixelX(),
                    t.cosine * ax - t.sine * bx,
                    t.cosine * ay - t.sine * by,
                    t.sine * a0 + t.cosine * b0 + to.TiePixelY(),
                    t.sine * ax + t.cosine * bx,
                    t.sine * ay + t.cosine * by};
}

}  // namespace lumo
