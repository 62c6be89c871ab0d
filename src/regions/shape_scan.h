#pragma once

#include "foundation/point.h"
#include "regions/scan_rules.h"
#include "regions/span_rows.h"

namespace lumo {

/// The vertices of a part in pixel coordinates.
using ScanVertices = std::vector<Point2D<double>>;

/// Says whether a scan can take all vertices: numbers of at most 2^52.
VEXG_EXPORT bool AreScannable(const ScanVertices& vertices);

// Each scan gives the rows from 0 to below `rowLimit` of a shape. The vertices are scannable.

/// Scans a polygon: rows with the spans between its edges, by the rules of PixelCenterEdge. The
/// ring closes by itself; a last vertex equal to the first is dropped. Pieces along a row count
/// where they are the lower side of the polygon.
VEXG_EXPORT SpanRows ScanPolygon(ScanVertices vertices, ScanRules rules, std::int64_t rowLimit);

/// Scans a polygon: the pixels whose centre lies inside, by the even-odd rule. A centre on the
/// right or the upper border is inside, one on the left or the lower isn't.
VEXG_EXPORT SpanRows ScanCenters(const ScanVertices& vertices, std::int64_t rowLimit);

/// Scans a polygon: the pixels of ScanCenters, and those whose area its border enters. Of a hole
/// these are left out, so that taking it out leaves them.
VEXG_EXPORT SpanRows ScanTouched(const ScanVertices& vertices, bool isHole, std::int64_t rowLimit);

/// Scans a line: all pixels whose area it enters, and those of its vertices.
VEXG_EXPORT SpanRows ScanTouchedLine(const ScanVertices& vertices, std::int64_t rowLimit);

/// Scans a line by Bresenham's algorithm between the pixels of its vertices (J. E. Bresenham,
/// Algorithm for computer control of a digital plotter, 1965), each segment from its upper end.
VEXG_EXPORT SpanRows ScanLine(const ScanVertices& vertices, std::int64_t rowLimit);

/// Scans points: the pixel of each vertex.
VEXG_EXPORT SpanRows ScanPoints(const ScanVertices& vertices, std::int64_t rowLimit);

}  // namespace lumo
