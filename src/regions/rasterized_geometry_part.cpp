#include "regions/rasterized_geometry_part.h"

#include <algorithm>
#include <string>

#include "foundation/fault.h"
#include "foundation/type_code.h"
#include "regions/rasterized_roi.h"

namespace lumo {
namespace {

/// Sets the fault of a part.
void SetPartFault(std::uint32_t record, std::uint32_t part, const char* text) {
  SetFault(String("record " + std::to_string(record) + ", part " + std::to_string(part) +
                  " of the shapes: " + text));
}

/// Whether coordinates are those of a map, to be carried by the grid's geo-reference.
bool AreMapCoordinates(const Geometry& geometry, const GeoRefPtr& geoRef,
                       ShapeCoordinates coordinates) {
  if (coordinates == ShapeCoordinates::kPixel) return false;
  if (coordinates == ShapeCoordinates::kMap) return geoRef || geometry.CoordSys().Type() != 0;
  return geoRef && geometry.CoordSys().Type() != 0;
}

}  // namespace

const unsigned RasterizedGeometryPart::TypeCode =
    GloballyUniqueObjectTypeCode("RasterizedGeometryPart");
const unsigned RasterizedPolygon::TypeCode = GloballyUniqueObjectTypeCode("RasterizedPolygon");
const unsigned RasterizedPolyline::TypeCode = GloballyUniqueObjectTypeCode("RasterizedPolyline");
const unsigned RasterizedPoints::TypeCode = GloballyUniqueObjectTypeCode("RasterizedPoints");

bool RasterizedGeometryPart::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}
bool RasterizedPolygon::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || RasterizedGeometryPart::IsA(typeCode);
}
bool RasterizedPolyline::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || RasterizedGeometryPart::IsA(typeCode);
}
bool RasterizedPoints::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || RasterizedGeometryPart::IsA(typeCode);
}

bool CarryPart(const Geometry& geometry, std::uint32_t record, std::uint32_t part,
               const GeoRefPtr& geoRef, ShapeCoordinates coordinates, ScanVertices& vertices) {
  const Array<Point2D<double>> points = geometry.Coordinates(record, part);
  const unsigned count = points.GetCount();
  vertices.assign(points.begin(), points.end());
  if (count == 0) return true;
  if (AreMapCoordinates(geometry, geoRef, coordinates)) {
    if (!geoRef) {
      SetFault("the shapes lie on a map, but the raster has no geo-reference");
      return false;
    }
    static_assert(sizeof(Point2D<double>) == 2 * sizeof(double));
    Array<double> pairs(&vertices.data()->x, ArrayDims(count, 2));
    if (!geoRef->MapToPixel(pairs)) {
      SetPartFault(record, part, "a vertex can't be carried to the raster");
      return false;
    }
  }
  if (AreScannable(vertices)) return true;
  SetPartFault(record, part, "a vertex is not a number, or lies too far from the raster");
  return false;
}

void RasterizedGeometryPart::WantRows(std::int64_t rowLimit) {
  if (rowLimit <= rowLimit_) return;
  rowLimit_ = rowLimit;
  isPrepared_ = false;
}

bool RasterizedGeometryPart::Prepare(const GeoRefPtr& geoRef, unsigned& flags) {
  const std::uint32_t revision = geometry_->PartRevision(record_, part_);
  if (!isPrepared_ || revision != seenRevision_) {
    isPrepared_ = false;
    if (rowLimit_ == 0) rowLimit_ = 0x10000;
    ScanVertices vertices;
    if (!CarryPart(*geometry_, record_, part_, geoRef, options_.coordinates, vertices)) {
      return false;
    }
    rows_ = std::make_shared<const SpanRows>(Scan(std::move(vertices), rowLimit_));
    seenRevision_ = revision;
    isPrepared_ = true;
  }
  flags = rows_->IsEmpty() ? 0 : kHasPixels;
  return true;
}

bool RasterizedGeometryPart::Mask(const GeoRefPtr& geoRef, unsigned, unsigned lines,
                                  const SubRect& rect, Array<unsigned char>& mask,
                                  std::uint64_t& count, SubRect& covered) {
  count = 0;
  if (!ShapeMask(rect, mask)) return false;
  unsigned flags = 0;
  WantRows(std::max<std::int64_t>(lines, std::int64_t{rect.bottom} + 1));
  if (!Prepare(geoRef, flags)) return false;
  RegionMarks marks(WindowOf(rect), mask.GetData());
  rows_->Mark(marks);
  const std::int64_t last = std::min<std::int64_t>(rows_->LastRow(), rect.bottom);
  for (std::int64_t row = std::max<std::int64_t>(rows_->FirstRow(), rect.top); row <= last; ++row) {
    for (const ColumnSpan* span = rows_->Begin(row); span != rows_->End(row); ++span) {
      const std::int64_t from = std::max<std::int64_t>(span->first, rect.left) - rect.left;
      const std::int64_t to = std::min<std::int64_t>(span->last, rect.right) - rect.left;
      if (from > to) continue;
      const auto left = static_cast<unsigned>(from);
      const auto right = static_cast<unsigned>(to);
      const auto y = static_cast<unsigned>(row - rect.top);
      covered = count == 0 ? SubRect(left, y, right, y)
                           : SubRect(std::min(covered.left, left), covered.top,
                                     std::max(covered.right, right), y);
      count += right - left + 1;
    }
  }
  return true;
}

SpanRows RasterizedPolygon::Scan(ScanVertices vertices, std::int64_t rowLimit) const {
  switch (Options().pixels) {
    case PixelRule::kCenter:
      return ScanCenters(vertices, rowLimit);
    case PixelRule::kTouched:
      return ScanTouched(vertices, IsHole(), rowLimit);
    case PixelRule::kTold:
      break;
  }
  return ScanPolygon(std::move(vertices), Options().rules, rowLimit);
}

SpanRows RasterizedPolyline::Scan(ScanVertices vertices, std::int64_t rowLimit) const {
  return Options().pixels == PixelRule::kTouched ? ScanTouchedLine(vertices, rowLimit)
                                                 : ScanLine(vertices, rowLimit);
}

SpanRows RasterizedPoints::Scan(ScanVertices vertices, std::int64_t rowLimit) const {
  return ScanPoints(vertices, rowLimit);
}

RasterizedGeometryPartPtr MakeRasterizedPart(const GeometryPtr& geometry, std::uint32_t record,
                                             std::uint32_t part, const ScanOptions& options) {
  switch (geometry->RecordKind(record)) {
    case kPolylineRecord:
      return RasterizedGeometryPartPtr(new RasterizedPolyline(geometry, record, part, options));
    case kPointsRecord:
      return RasterizedGeometryPartPtr(new RasterizedPoints(geometry, record, part, options));
    default:
      return RasterizedGeometryPartPtr(new RasterizedPolygon(geometry, record, part, options));
  }
}

}  // namespace lumo
