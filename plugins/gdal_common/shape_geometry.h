#pragma once

#include <memory>
#include <ogr_api.h>
#include <vector>

#include "data/vector_def.h"

namespace lumo::gdal {

struct FeatureDeleter {
  void operator()(OGRFeatureH feature) const { OGR_F_Destroy(feature); }
};
using FeaturePtr = std::unique_ptr<void, FeatureDeleter>;

/// Gives our kind of shape for GDAL's type of geometry.
VectorGeometry GeometryOf(OGRwkbGeometryType type);

/// GDAL's type for a kind of features; wkbUnknown for kUnknown.
OGRwkbGeometryType LayerTypeOf(VectorGeometry geometry);

/// The parts of a feature's geometry, in their order: points, lines or rings, outer and inner. They
/// belong to the feature.
std::vector<OGRGeometryH> PartsOf(OGRFeatureH feature);

/// Makes a geometry of one part. Null when the vertices can't be one: a point has one, a line two
/// or more, and a ring four or more of which the last is the first.
OGRGeometryH MakeGeometry(VectorGeometry geometry, std::int32_t vertexCount,
                          const double* vertices);

/// Gives a part other places; its heights and measures stay.
/// @param vertices  2 * as many as the part has.
void MovePart(OGRGeometryH part, const double* vertices);

/// Writes the places of a part. Gives the end of what was written.
double* CopyPart(OGRGeometryH part, double* vertices);

}  // namespace lumo::gdal
