#include "geometry/packed_geometry.h"

#include <algorithm>
#include <numeric>

#include "foundation/type_code.h"

namespace lumo {
namespace {

/// The ids from 0 to below `count`.
Array<int> CountedIds(std::size_t count) {
  Array<int> ids{ArrayDims(static_cast<unsigned>(count))};
  if (ids.IsValid()) std::iota(ids.begin(), ids.end(), 0);
  return ids;
}

}  // namespace

const unsigned PackedGeometry::TypeCode = GloballyUniqueObjectTypeCode("PackedGeometry");

bool PackedGeometry::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Geometry::IsA(typeCode);
}

PackedGeometry::PackedGeometry(const lumo::CoordSys& coordSys) : Geometry(coordSys) {
  CountChanges();
}

void PackedGeometry::Add(GeometryKind kind, const VectorRecord& record) {
  const std::size_t before = vertices_.size();
  for (std::size_t i = 0; i + 1 < record.coordinates.size(); i += 2) {
    vertices_.push_back({record.coordinates[i], record.coordinates[i + 1]});
  }
  for (const std::uint32_t end : record.partEnds) vertexEnds_.push_back(before + end);
  holes_.insert(holes_.end(), record.holes.begin(), record.holes.end());
  partEnds_.push_back(vertexEnds_.size());
  kinds_.push_back(static_cast<unsigned char>(kind));
}

GeometryPtr PackedGeometry::Clone() const {
  try {
    return GeometryPtr(new PackedGeometry(*this));
  } catch (const std::bad_alloc&) {
    return {};
  }
}

std::uint32_t PackedGeometry::RecordRevision(std::uint32_t) const {
  return 0;
}

std::uint32_t PackedGeometry::PartRevision(std::uint32_t, std::uint32_t) const {
  return 0;
}

std::uint32_t PackedGeometry::RecordCount() const {
  return static_cast<std::uint32_t>(kinds_.size());
}

Array<int> PackedGeometry::RecordIds() const {
  return CountedIds(kinds_.size());
}

std::int32_t PackedGeometry::RecordKind(std::uint32_t record) const {
  return record < kinds_.size() ? kinds_[record] : 0;
}

std::uint32_t PackedGeometry::PartCount(std::uint32_t record) const {
  return record < kinds_.size()
             ? static_cast<std::uint32_t>(partEnds_[record] - PartIndex(record, 0))
             : 0;
}

Array<int> PackedGeometry::PartIds(std::uint32_t record) const {
  return CountedIds(PartCount(record));
}

std::uint32_t PackedGeometry::VertexCount(std::uint32_t record, std::uint32_t part) const {
  if (!HasPart(record, part)) return 0;
  const std::size_t index = PartIndex(record, part);
  return static_cast<std::uint32_t>(vertexEnds_[index] - (index == 0 ? 0 : vertexEnds_[index - 1]));
}

bool PackedGeometry::IsHole(std::uint32_t record, std::uint32_t part) const {
  return HasPart(record, part) && holes_[PartIndex(record, part)] != 0;
}

Array<Point2D<double>> PackedGeometry::Coordinates(std::uint32_t record, std::uint32_t part) const {
  Array<Point2D<double>> points;
  const std::uint32_t count = VertexCount(record, part);
  if (count == 0 || !points.Resize(ArrayDims(count))) return points;
  std::copy_n(vertices_.data() + vertexEnds_[PartIndex(record, part)] - count, count,
              points.begin());
  return points;
}

bool PackedGeometry::FindPart(std::uint32_t record, std::uint32_t part, std::uint32_t& recordIndex,
                              std::uint32_t& partIndex) const {
  recordIndex = record;
  partIndex = part;
  return HasPart(record, part);
}

bool PackedGeometry::FindRecord(std::uint32_t record, std::uint32_t& recordIndex) const {
  recordIndex = record;
  return record < kinds_.size();
}

}  // namespace lumo
