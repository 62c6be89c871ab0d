#pragma once

#include <optional>

#include "georef/georef.h"

namespace lumo {

/// Carries pixels of one affine grid to those of another one of the same coordinate system: x' = x0
/// + xx * x + xy * y, y' = y0 + yx * x + yy * y. The default is the identity.
///
///     if (const auto link = FindAffineLink(*from, *to)) {
///       const double column = link->x0 + link->xx * x + link->xy * y;
///     }
struct AffineLink {
  double x0 = 0, xx = 1, xy = 0;
  double y0 = 0, yx = 0, yy = 1;
};

/// The map between the pixels of two grids. Limits to 180 and -90 degrees play no part in it.
/// @return nothing unless both models are affine, with pixels that have a size, and their
///         coordinate systems are equal.
VEXG_EXPORT std::optional<AffineLink> FindAffineLink(const GeoRef& from, const GeoRef& to);

/// Converts map coordinates to pixels, in place: the inverse of PixelToMap. That is MapToPixel, but
/// for a turned grid whose pixels aren't square, where MapToPixel keeps a form that is no inverse.
/// @param points  (points, 2).
VEXG_EXPORT bool InvertPixelToMap(const GeoRef& model, Array<double>& points);

/// Carries pixels of `from` to those of `to`, in place, as from.PixelToPixel(points, to) but by
/// InvertPixelToMap.
VEXG_EXPORT bool CarryPixels(const GeoRef& from, const GeoRef& to, Array<double>& points);

}  // namespace lumo
