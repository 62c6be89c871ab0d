#pragma once

#include <vector>

#include "geometry/polygon2d.h"

namespace lumo {

/// The vertices of a ring that stay when it is thinned to a tolerance (Douglas and Peucker,
/// Algorithms for the reduction of the number of points, 1973), on integers: distances are to the
/// point of the segment that is cut to whole numbers.
/// @param ring       closed.
/// @param tolerance  in square pixels: a vertex stays whose squared distance reaches it. Below
///                   1e-15 all vertices stay.
/// @param fewest     a ring of so many vertices, the closing one counted, or fewer stays as it is.
VEXG_EXPORT std::vector<Point2D<std::int32_t>> SimplifyRing(
    const std::vector<Point2D<std::int32_t>>& ring, double tolerance, std::size_t fewest);

}  // namespace lumo
