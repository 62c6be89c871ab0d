#pragma once

#include <functional>

#include "georef/coordsys.h"

namespace lumo {

/// Carries points from one coordinate system to another, in place: to geographic positions, to the
/// other datum unless both have one, and to the other's map coordinates. A step for which a system
/// is missing is left out.
/// @param points  (points, 2), or pairs in an array of rank 1.
/// @param extent  gives the map rectangle of the work in `from`, rank 1: min x, min y, max x, max
///                y; only called when the datums differ.
/// @return false when a point is not finite afterwards.
bool CarryPoints(Array<double>& points, const CoordSys& from, const CoordSys& to,
                 const std::function<Array<double>()>& extent);

/// Gives both coordinates of every point that is not finite the value HUGE_VAL. For models that go
/// on computing with points that could not be carried.
void MarkUncarried(Array<double>& points);

}  // namespace lumo
