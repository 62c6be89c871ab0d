#pragma once

#include "geometry/boundary_tracer.h"

namespace lumo {

/// Splits the rings of a traced polygon where they touch themselves at a corner, so that the
/// polygon is valid by the rules of the OGC's simple features: a loop that runs like an outer ring
/// becomes a ring of its own, and one that runs the other way a hole. The outer ring stays the
/// first.
/// @return false when no ring touches itself, with `to` untouched.
VEXG_EXPORT bool SplitAtTouches(const TracedPolygon& polygon, TracedPolygon& to);

}  // namespace lumo
