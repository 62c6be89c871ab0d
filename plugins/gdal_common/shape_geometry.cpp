#include "gdal_common/shape_geometry.h"

namespace lumo::gdal {
namespace {

void AddParts(OGRGeometryH geometry, std::vector<OGRGeometryH>& parts) {
  const int inner = OGR_G_GetGeometryCount(geometry);
  if (inner == 0) {
    if (OGR_G_GetPointCount(geometry) > 0) parts.push_back(geometry);
    return;
  }
  for (int i = 0; i < inner; ++i) AddParts(OGR_G_GetGeometryRef(geometry, i), parts);
}

bool IsClosed(std::int32_t count, const double* vertices) {
  const double* const last = vertices + 2 * (std::ptrdiff_t{count} - 1);
  return last[0] == vertices[0] && last[1] == vertices[1];
}

}  // namespace

VectorGeometry GeometryOf(OGRwkbGeometryType type) {
  switch (wkbFlatten(type)) {
    case wkbPoint:
    case wkbMultiPoint:
      return VectorGeometry::kPoint;
    case wkbLineString:
    case wkbMultiLineString:
      return VectorGeometry::kLine;
    case wkbPolygon:
    case wkbMultiPolygon:
      return VectorGeometry::kPolygon;
    default:
      return VectorGeometry::kUnknown;
  }
}

OGRwkbGeometryType LayerTypeOf(VectorGeometry geometry) {
  switch (geometry) {
    case VectorGeometry::kPoint:
      return wkbPoint;
    case VectorGeometry::kLine:
      return wkbLineString;
    case VectorGeometry::kPolygon:
      return wkbPolygon;
    default:
      return wkbUnknown;
  }
}

std::vector<OGRGeometryH> PartsOf(OGRFeatureH feature) {
  std::vector<OGRGeometryH> parts;
  OGRGeometryH const geometry = OGR_F_GetGeometryRef(feature);
  if (geometry != nullptr) AddParts(geometry, parts);
  return parts;
}

OGRGeometryH MakeGeometry(VectorGeometry geometry, std::int32_t vertexCount,
                          const double* vertices) {
  const bool isRing = geometry == VectorGeometry::kPolygon;
  const bool fits = geometry == VectorGeometry::kPoint  ? vertexCount == 1
                    : geometry == VectorGeometry::kLine ? vertexCount >= 2
                                                        : isRing && vertexCount >= 4;
  if (!fits || (isRing && !IsClosed(vertexCount, vertices))) return nullptr;
  OGRGeometryH const part = OGR_G_CreateGeometry(isRing ? wkbLinearRing : LayerTypeOf(geometry));
  for (std::int32_t i = 0; i < vertexCount; ++i) {
    OGR_G_SetPoint_2D(part, i, vertices[2 * std::ptrdiff_t{i}],
                      vertices[2 * std::ptrdiff_t{i} + 1]);
  }
  if (!isRing) return part;
  OGRGeometryH const polygon = OGR_G_CreateGeometry(wkbPolygon);
  OGR_G_AddGeometryDirectly(polygon, part);
  return polygon;
}

void MovePart(OGRGeometryH part, const double* vertices) {
  const int count = OGR_G_GetPointCount(part);
  const bool hasHeights = OGR_G_Is3D(part) != 0, hasMeasures = OGR_G_IsMeasured(part) != 0;
  for (int i = 0; i < count; ++i) {
    const double x = *vertices++, y = *vertices++;
    double oldX = 0, oldY = 0, z = 0, m = 0;
    OGR_G_GetPointZM(part, i, &oldX, &oldY, &z, &m);
    if (hasHeights && hasMeasures) {
      OGR_G_SetPointZM(part, i, x, y, z, m);
    } else if (hasHeights) {
      OGR_G_SetPoint(part, i, x, y, z);
    } else if (hasMeasures) {
      OGR_G_SetPointM(part, i, x, y, m);
    } else {
      OGR_G_SetPoint_2D(part, i, x, y);
    }
  }
}

double* CopyPart(OGRGeometryH part, double* vertices) {
  const int count = OGR_G_GetPointCount(part);
  for (int i = 0; i < count; ++i) {
    *vertices++ = OGR_G_GetX(part, i);
    *vertices++ = OGR_G_GetY(part, i);
  }
  return vertices;
}

}  // namespace lumo::gdal
