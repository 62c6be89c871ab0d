#pragma once

#include "commands/value_text.h"
#include "geometry/polygon2d.h"

namespace lumo {

/// Names what became of an overlap.
enum class SplitOutcome {
  kDivided,
  // By all others both outlines are to stay.
  kTooThin,     ///< it is too thin for a seam
  kComesApart,  ///< it has several rings, and both outlines would come apart
  kImpossible,  ///< there is no way to do it
};

/// Divides the overlap of two outlines between them, along a seam through its middle.
///
/// The seam goes from one crossing of the outlines to another, the two that lie farthest apart. The
/// overlap is taken for a triangle or a quadrilateral with these crossings as corners, and the seam
/// follows the bisectors of its angles. Each side of the seam stays with the outline whose own edge
/// lies farther from it. An overlap thinner than 10 pixels at every vertex is not divided.
///
/// @param overlap    what a and b have in common; its first ring is divided.
/// @param sides      whether, of an overlap with four corners a, b, c, d, the middles of a, b and
/// of
///                   c, d tell how far an edge is (Told), or those of a, b and of b, c (Exact),
///                   which all lie on one side: of two scenes side by side each keeps its own then.
/// @param ofA, ofB   [out] what remains of a and of b, where the overlap is divided.
/// @return kImpossible where there are fewer than two crossings, where corners coincide, where
///         bisectors do not meet, and where nothing of an outline would remain.
VEXG_EXPORT SplitOutcome SplitOverlap(const Polygon2D<double>& a, const Polygon2D<double>& b,
                                      const Polygon2D<double>& overlap, Form sides,
                                      Polygon2D<double>& ofA, Polygon2D<double>& ofB);

}  // namespace lumo
