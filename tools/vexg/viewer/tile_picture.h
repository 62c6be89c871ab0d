#pragma once

#include <string>
#include <utility>
#include <vector>

#include "viewer/viewed_raster.h"

namespace lumo::host {

/// How values become brightness: a curve between the dark and the bright end of each band.
struct TileStretch {
  enum class Curve { kLinear, kSquareRoot, kGamma, kLogarithm };
  std::vector<std::pair<double, double>> ends;  ///< of one band, or of red, green and blue
  Curve curve = Curve::kLinear;
  double gamma = 1.5;
};

/// Draws a tile as a PNG with red, green, blue and alpha, as the page paints it: the place of a
/// value between the ends, 0 to 1, becomes itself, its square root, its 1/gamma-th power or the
/// logarithm of 1 + 99 times it in units of that of 100, and that 0 to 255. Where a band does not
/// count, or is no finite number, the picture is clear.
/// @param tile  with the bands of the stretch.
/// @param code  of its pixel type.
std::string DrawTile(const ViewedTile& tile, unsigned code, const TileStretch& stretch);

/// Draws the first band of a tile in the colours of a legend, which goes by value.
std::string DrawTile(const ViewedTile& tile, unsigned code, const Json& legend);

}  // namespace lumo::host
