#include "georef/affine_link.h"

#include <cmath>

#include "georef/carry_points.h"
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
  // East and south of the target's tie point, in map units. The tie points are subtracted first, so
  // that large map coordinates cost no digits.
  const double ex = f.cosine * from.PixelSizeX(), ey = f.sine * from.PixelSizeY();
  const double sx = -f.sine * from.PixelSizeX(), sy = f.cosine * from.PixelSizeY();
  const double e0 = (from.TieMapX() - to.TieMapX()) - from.TiePixelX() * ex - from.TiePixelY() * ey;
  const double s0 = (to.TieMapY() - from.TieMapY()) - from.TiePixelX() * sx - from.TiePixelY() * sy;
  const auto column = [&](double east, double south) {
    return (t.cosine * east - t.sine * south) / to.PixelSizeX();
  };
  const auto line = [&](double east, double south) {
    return (t.sine * east + t.cosine * south) / to.PixelSizeY();
  };
  return AffineLink{column(e0, s0) + to.TiePixelX(), column(ex, sx), column(ey, sy),
                    line(e0, s0) + to.TiePixelY(),   line(ex, sx),   line(ey, sy)};
}

bool InvertPixelToMap(const GeoRef& model, Array<double>& points) {
  const bool isPlain = model.Rotation() == 0 || model.PixelSizeX() == model.PixelSizeY();
  const bool isPairs = points.GetRank() == 2 && points.GetExtent(1) == 2;
  if (isPlain || !isPairs || !IsUsable(model)) return model.MapToPixel(points);
  const Turn turn(model);
  for (unsigned i = 0; i + 1 < points.GetCount(); i += 2) {
    const double east = points[i] - model.TieMapX(), south = model.TieMapY() - points[i + 1];
    points[i] = (turn.cosine * east - turn.sine * south) / model.PixelSizeX() + model.TiePixelX();
    points[i + 1] =
        (turn.sine * east + turn.cosine * south) / model.PixelSizeY() + model.TiePixelY();
  }
  return true;
}

bool CarryPixels(const GeoRef& from, const GeoRef& to, Array<double>& points) {
  bool isCarried = from.PixelToMap(points);
  if (!from.CoordinateSystem().IsEqual(to.CoordinateSystem())) {
    isCarried = from.MapToMap(points, to) && isCarried;
  }
  const bool isPlaced = InvertPixelToMap(to, points);
  if (isPlaced && !isCarried) MarkUncarried(points);
  return isPlaced && isCarried;
}

}  // namespace lumo
