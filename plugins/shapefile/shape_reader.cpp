#include "shape_reader.h"

#include <limits>

#include "gdal_common/messages.h"

namespace lumo::shapefile {
namespace {

unsigned CountOf(OGRGeometryH part) {
  return static_cast<unsigned>(OGR_G_GetPointCount(part));
}

}  // namespace

lumo::VectorDef Reader::VectorDef() {
  lumo::VectorDef def = layer_.Describe();
  if (geoRef_) def.geoRef = CloneOf(geoRef_);
  return def;
}

std::int32_t Reader::Vertices() {
  std::uint64_t count = 0;
  for (unsigned i = 0; i < layer_.Features(); ++i) {
    OGRFeatureH const feature = layer_.Get(static_cast<std::int32_t>(i));
    if (feature == nullptr) return 0;
    for (OGRGeometryH const part : gdal::PartsOf(feature)) count += CountOf(part);
  }
  if (count <= std::numeric_limits<std::int32_t>::max()) return static_cast<std::int32_t>(count);
  gdal::FailWith(layer_.Name(), "more vertices than can be counted");
  return 0;
}

bool Reader::ReadGeometryT2(double* vertices, unsigned* featureEnds) {
  const double* const begin = vertices;
  for (unsigned i = 0; i < layer_.Features(); ++i) {
    OGRFeatureH const feature = layer_.Get(static_cast<std::int32_t>(i));
    if (feature == nullptr) return false;
    for (OGRGeometryH const part : gdal::PartsOf(feature))
      vertices = gdal::CopyPart(part, vertices);
    featureEnds[i] = static_cast<unsigned>((vertices - begin) / 2);
  }
  return true;
}

bool Reader::ReadGeometryT1(std::int32_t feature, double* vertices, unsigned* partEnds) {
  OGRFeatureH const found = layer_.Get(feature);
  if (found == nullptr) return false;
  unsigned end = 0;
  for (OGRGeometryH const part : gdal::PartsOf(found)) {
    vertices = gdal::CopyPart(part, vertices);
    end += CountOf(part);
    *partEnds++ = end;
  }
  return true;
}

bool Reader::WriteGeometryT1(std::int32_t feature, const double* vertices,
                             const unsigned* partEnds) {
  OGRFeatureH const found = layer_.Get(feature);
  if (found == nullptr) return false;
  const auto parts = gdal::PartsOf(found);
  const bool isRings = gdal::GeometryOf(OGR_G_GetGeometryType(OGR_F_GetGeometryRef(found))) ==
                       VectorGeometry::kPolygon;
  unsigned begin = 0;
  for (std::size_t i = 0; i < parts.size(); ++i) {
    const unsigned end = begin + CountOf(parts[i]);
    if (partEnds[i] != end) return gdal::FailWith(layer_.Name(), "a part has another size");
    const double* const first = vertices + 2 * std::size_t{begin};
    const double* const last = vertices + 2 * (std::size_t{end} - 1);
    if (isRings && (first[0] != last[0] || first[1] != last[1])) {
      return gdal::FailWith(layer_.Name(), "a ring isn't closed");
    }
    begin = end;
  }
  for (OGRGeometryH const part : parts) {
    gdal::MovePart(part, vertices);
    vertices += 2 * std::size_t{CountOf(part)};
  }
  return layer_.Put(found);
}

bool Reader::AppendGeometry(std::int32_t geometry, std::int32_t vertexCount,
                            const double* vertices) {
  const auto kind = static_cast<VectorGeometry>(geometry);
  if (kind != layer_.Describe().geometry) {
    return gdal::FailWith(layer_.Name(), "holds shapes of another kind");
  }
  OGRGeometryH const made = gdal::MakeGeometry(kind, vertexCount, vertices);
  if (made == nullptr) {
    return gdal::FailWith(layer_.Name(), "these vertices are no point, line or closed ring");
  }
  return layer_.Append(made);
}

bool Reader::GetFeatureInfo(std::int32_t feature, std::int32_t* geometry, unsigned* parts,
                            unsigned* vertexCount) {
  OGRFeatureH const found = layer_.Get(feature);
  if (found == nullptr) return false;
  OGRGeometryH const shape = OGR_F_GetGeometryRef(found);
  const auto kind =
      shape != nullptr ? gdal::GeometryOf(OGR_G_GetGeometryType(shape)) : VectorGeometry::kUnknown;
  *geometry = static_cast<std::int32_t>(kind);
  *parts = *vertexCount = 0;
  for (OGRGeometryH const part : gdal::PartsOf(found)) {
    ++*parts;
    *vertexCount += CountOf(part);
  }
  return true;
}

}  // namespace lumo::shapefile
