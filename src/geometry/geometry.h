#pragma once

#include <atomic>
#include <cstdint>
#include <memory>

#include "foundation/containers.h"
#include "foundation/locks.h"
#include "foundation/point.h"
#include "foundation/pointer.h"
#include "geometry/polygon2d.h"
#include "georef/coordsys.h"

namespace lumo {

class Geometry;
using GeometryPtr = Pointer<Geometry>;

/// Kinds of records. Every other value is a polygon.
enum GeometryKind : std::int32_t { kPolygonRecord = 0, kPolylineRecord = 1, kPointsRecord = 2 };

/// Vector data: records of one kind each, made of parts, each a list of coordinates in a CoordSys.
/// A record is named by its id, a part by its id within the record. An id that isn't there gives 0,
/// false or an empty result.
///
/// Revisions are for those who keep something that they made from the data: it is out of date once
/// a revision differs.
///
/// Threads: as the derived class says.
class VEXG_EXPORT Geometry : public Object {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;

  /// A deep copy; null when there is no memory.
  virtual GeometryPtr Clone() const = 0;
  /// How often the parts of a record have changed: were added, or taken away.
  virtual std::uint32_t RecordRevision(std::uint32_t record) const = 0;
  /// How often the vertices of a part have changed.
  virtual std::uint32_t PartRevision(std::uint32_t record, std::uint32_t part) const = 0;
  /// Number of records.
  virtual std::uint32_t RecordCount() const = 0;
  /// The ids of all records, ascending.
  virtual Array<int> RecordIds() const = 0;
  /// The kind of a record, see GeometryKind.
  virtual std::int32_t RecordKind(std::uint32_t record) const = 0;
  /// Number of parts of a record.
  virtual std::uint32_t PartCount(std::uint32_t record) const = 0;
  /// The ids of all parts of a record, ascending.
  virtual Array<int> PartIds(std::uint32_t record) const = 0;
  /// Number of vertices of a part.
  virtual std::uint32_t VertexCount(std::uint32_t record, std::uint32_t part) const = 0;
  /// True for a part that is a hole of a polygon.
  virtual bool IsHole(std::uint32_t record, std::uint32_t part) const = 0;
  /// The vertices of a part, in the units of CoordSys().
  virtual Array<Point2D<double>> Coordinates(std::uint32_t record, std::uint32_t part) const = 0;
  /// The places of a record among the records, and of a part among its parts.
  virtual bool FindPart(std::uint32_t record, std::uint32_t part, std::uint32_t& recordIndex,
                        std::uint32_t& partIndex) const = 0;
  /// The place of a record among the records.
  virtual bool FindRecord(std::uint32_t record, std::uint32_t& recordIndex) const = 0;

  /// The system of the coordinates.
  const lumo::CoordSys& CoordSys() const { return coordSys_; }
  /// How often records were added or taken away.
  std::uint32_t Revision() const { return revision_; }
  /// How often anything has changed: records, parts or vertices.
  /// @return false where the class does not count that.
  bool ReadChanges(std::uint64_t& changes) const {
    if (changes_) changes = *changes_;
    return changes_ != nullptr;
  }

 protected:
  explicit Geometry(const lumo::CoordSys& coordSys) : coordSys_(coordSys) {}
  Geometry(const Geometry& other) : Object(other), coordSys_(other.coordSys_) {}
  Geometry& operator=(const Geometry&) = delete;

  void Changed() {
    ++revision_;
    NoteChange();
  }
  /// Counts a change of a part or of vertices.
  void NoteChange() {
    if (changes_) ++*changes_;
  }
  /// Begins to count changes, which the class then notes without exception.
  void CountChanges() { changes_ = std::make_shared<std::atomic<std::uint64_t>>(0); }
  /// Takes the changes of another geometry for its own.
  void ShareChanges(const Geometry& other) { changes_ = other.changes_; }

 private:
  lumo::CoordSys coordSys_;
  std::atomic<std::uint32_t> revision_ = 0;
  std::shared_ptr<std::atomic<std::uint64_t>> changes_;
};

/// Vector data that can be changed. Each change raises the revision that it belongs to.
///
///     const MemoryGeometryPtr areas(new MemoryGeometry(coordSys));
///     std::uint32_t record = 0, ring = 0;
///     if (!areas->AddRecord(kPolygonRecord, record)) return false;
///     areas->AddPart(record, false, ring, points);
class VEXG_EXPORT WritableGeometry : public Geometry {
 public:
  static const unsigned TypeCode;
  bool IsA(unsigned typeCode) const override;

  /// Adds a record behind all others.
  /// @param id  [out] of the record; never used again in this geometry.
  virtual bool AddRecord(std::int32_t kind, std::uint32_t& id) = 0;
  /// Removes a record with its parts. False when it isn't there.
  virtual bool RemoveRecord(std::uint32_t record) = 0;
  /// Removes all records.
  virtual void Clear() = 0;
  /// Adds a part with its vertices behind all others of a record.
  virtual bool AddPart(std::uint32_t record, bool hole, std::uint32_t& id,
                       const Array<Point2D<double>>& points) = 0;
  /// Adds a part without vertices.
  virtual bool AddPart(std::uint32_t record, bool hole, std::uint32_t& id) = 0;
  /// Removes a part. False when it isn't there.
  virtual bool RemovePart(std::uint32_t record, std::uint32_t part) = 0;
  /// Replaces the vertices of a part.
  virtual bool SetCoordinates(std::uint32_t record, std::uint32_t part,
                              const Array<Point2D<double>>& points) = 0;

 protected:
  using Geometry::Geometry;
};

/// One part of a record: a ring, a line or points.
class VEXG_EXPORT GeometryPart : public Object {
 public:
  static const unsigned TypeCode;
  GeometryPart(std::uint32_t id, bool hole) : hole_(hole), id_(id) {}
  bool IsA(unsigned typeCode) const override;

  /// Its id within the record.
  std::uint32_t Id() const { return id_; }
  /// True for a hole of a polygon.
  bool IsHole() const { return hole_; }
  /// Its vertices.
  const Point2DArray<double>& Points() const { return points_; }
  void SetPoints(Point2DArray<double> points) {
    points_ = std::move(points);
    ++revision_;
  }
  std::uint32_t Revision() const { return revision_; }

 private:
  Point2DArray<double> points_;
  bool hole_;
  std::uint32_t id_;
  std::uint32_t revision_ = 0;
};

using GeometryPartPtr = Pointer<GeometryPart>;

/// One record: parts in ascending order of their ids. Threads: any number; each operation holds the
/// record's lock.
class VEXG_EXPORT GeometryRecord : public Object {
 public:
  static const unsigned TypeCode;
  GeometryRecord(std::int32_t kind, std::uint32_t id) : kind_(kind), id_(id) {}
  /// A copy with parts of its own.
  GeometryRecord(const GeometryRecord& other);
  GeometryRecord& operator=(const GeometryRecord&) = delete;
  bool IsA(unsigned typeCode) const override;

  /// A GeometryKind.
  std::int32_t Kind() const { return kind_; }
  std::uint32_t Id() const { return id_; }
  std::uint32_t Revision() const;   ///< how often parts were added or taken away
  std::uint32_t PartCount() const;  ///< number of parts
  Array<int> PartIds() const;       ///< of all parts, ascending
  /// The place of a part among the others. False when it isn't there.
  bool FindPart(std::uint32_t part, std::uint32_t& index) const;
  /// Calls `read` with a part under the lock. @return false when it isn't there.
  template <typename Read>
  bool ReadPart(std::uint32_t part, Read&& read) const;

  /// Adds a part behind all others.
  /// @param id      [out] of the part; never used again in this record.
  /// @param points  are taken out of it; null for none.
  bool AddPart(bool hole, std::uint32_t& id, Point2DArray<double>* points);
  /// Removes a part. False when it isn't there.
  bool RemovePart(std::uint32_t part);
  /// Replaces the vertices of a part. False when it isn't there.
  bool SetPoints(std::uint32_t part, Point2DArray<double> points);

 private:
  std::int32_t kind_;
  Deque<GeometryPartPtr> parts_;
  std::uint32_t id_;
  std::uint32_t nextPart_ = 0;
  mutable QueuingRWMutex mutex_;
  std::uint32_t revision_ = 0;
};

using GeometryRecordPtr = Pointer<GeometryRecord>;

/// Vector data in memory.
///
/// Cost: a record or a part is found by binary search. Taking away the first or the last record is
///       cheap, another one costs as many steps as there are records.
/// Threads: any number; each operation holds the geometry's lock, then that of its record.
/// Failure: ObjectErrorOutOfMemory when a record or part can't be made; nothing changes then.
class VEXG_EXPORT MemoryGeometry final : public WritableGeometry {
 public:
  static const unsigned TypeCode;
  /// @param coordSys  the system of all coordinates.
  explicit MemoryGeometry(const lumo::CoordSys& coordSys);
  bool IsA(unsigned typeCode) const override;

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

  bool AddRecord(std::int32_t kind, std::uint32_t& id) override;
  bool RemoveRecord(std::uint32_t record) override;
  void Clear() override;
  bool AddPart(std::uint32_t record, bool hole, std::uint32_t& id,
               const Array<Point2D<double>>& points) override;
  bool AddPart(std::uint32_t record, bool hole, std::uint32_t& id) override;
  bool RemovePart(std::uint32_t record, std::uint32_t part) override;
  bool SetCoordinates(std::uint32_t record, std::uint32_t part,
                      const Array<Point2D<double>>& points) override;

 private:
  MemoryGeometry(const MemoryGeometry& other);
  GeometryRecord* Find(std::uint32_t record) const;
  template <typename Read>
  bool ReadPart(std::uint32_t record, std::uint32_t part, Read&& read) const;
  template <typename Change>
  bool ChangeRecord(std::uint32_t record, Change&& change);

  Deque<GeometryRecordPtr> records_;
  std::uint32_t nextRecord_ = 0;
  mutable QueuingRWMutex mutex_;
};

using MemoryGeometryPtr = Pointer<MemoryGeometry>;

/// Shows a geometry in another coordinate system: each list of coordinates is carried when it is
/// asked for. Places of records and parts are not given.
///
/// Threads: as the inner geometry.
class VEXG_EXPORT ProjectedGeometry final : public Geometry {
 public:
  static const unsigned TypeCode;
  /// @param inner   is shared, and not empty.
  /// @param target  the system in which coordinates are given.
  ProjectedGeometry(const GeometryPtr& inner, const lumo::CoordSys& target)
      : Geometry(target), inner_(inner) {
    ShareChanges(*inner_);
  }
  bool IsA(unsigned typeCode) const override;

  /// Another view on the same inner geometry.
  GeometryPtr Clone() const override;
  std::uint32_t RecordRevision(std::uint32_t record) const override {
    return inner_->RecordRevision(record);
  }
  std::uint32_t PartRevision(std::uint32_t record, std::uint32_t part) const override {
    return inner_->PartRevision(record, part);
  }
  std::uint32_t RecordCount() const override { return inner_->RecordCount(); }
  Array<int> RecordIds() const override { return inner_->RecordIds(); }
  std::int32_t RecordKind(std::uint32_t record) const override {
    return inner_->RecordKind(record);
  }
  std::uint32_t PartCount(std::uint32_t record) const override { return inner_->PartCount(record); }
  Array<int> PartIds(std::uint32_t record) const override { return inner_->PartIds(record); }
  std::uint32_t VertexCount(std::uint32_t record, std::uint32_t part) const override {
    return inner_->VertexCount(record, part);
  }
  bool IsHole(std::uint32_t record, std::uint32_t part) const override {
    return inner_->IsHole(record, part);
  }
  Array<Point2D<double>> Coordinates(std::uint32_t record, std::uint32_t part) const override;
  bool FindPart(std::uint32_t, std::uint32_t, std::uint32_t&, std::uint32_t&) const override {
    return false;
  }
  bool FindRecord(std::uint32_t, std::uint32_t&) const override { return false; }

 private:
  GeometryPtr inner_;
};

}  // namespace lumo
