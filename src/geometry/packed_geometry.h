#pragma once

#include <vector>

#include "data/vector_records.h"
#include "geometry/geometry.h"

namespace lumo {

/// Shapes that don't change, as a file of many holds them: in a few pieces of memory, 16 bytes a
/// vertex and some 20 a record. The ids of records and parts count from 0.
///
/// Threads: any number once it is filled.
/// Failure: std::bad_alloc while it is filled.
///
///     PackedGeometry shapes(layer.coordSys);
///     for (VectorRecord record; file->Next(record);) shapes.Add(kPolygonRecord, record);
class VEXG_EXPORT PackedGeometry final : public Geometry {
 public:
  static const unsigned TypeCode;
  /// @param coordSys  the system of all coordinates.
  explicit PackedGeometry(const lumo::CoordSys& coordSys);
  bool IsA(unsigned typeCode) const override;

  /// Adds a record behind all others.
  void Add(GeometryKind kind, const VectorRecord& record);

  /// A copy that shares nothing; null when there is no memory.
  GeometryPtr Clone() const override;
  std::uint32_t RecordRevision(std::uint32_t record) const override;
  std::uint32_t PartRevision(std::uint32_t record, std::uint32_t part) const override;
  std::uint32_t RecordCount() const override;
  Array<int> RecordIds() const override;
  std::int32_t RecordKind(std::uint32_t record) const override;
  std::uint32_t PartCount(std::uint32_t record) const override;
  Array<int> PartIds(std::uint32_t record) const override;
  std::uint32_t VertexCount(std::uint32_t record, std::uint32_t part) const override;
  bool IsHole(std::uint32_t record, std::uint32_t part) const override;
  Array<Point2D<double>> Coordinates(std::uint32_t record, std::uint32_t part) const override;
  bool FindPart(std::uint32_t record, std::uint32_t part, std::uint32_t& recordIndex,
                std::uint32_t& partIndex) const override;
  bool FindRecord(std::uint32_t record, std::uint32_t& recordIndex) const override;

 private:
  PackedGeometry(const PackedGeometry& other) = default;
  bool HasPart(std::uint32_t record, std::uint32_t part) const { return part < PartCount(record); }
  std::size_t PartIndex(std::uint32_t record, std::uint32_t part) const {
    return (record == 0 ? 0 : partEnds_[record - 1]) + part;
  }

  std::vector<unsigned char> kinds_;
  std::vector<std::size_t> partEnds_;    // for each record, the number of parts up to its end
  std::vector<std::size_t> vertexEnds_;  // for each part, the number of vertices up to its end
  std::vector<unsigned char> holes_;
  std::vector<Point2D<double>> vertices_;
};

}  // namespace lumo
