#include "geometry/geometry.h"

#include <algorithm>
#include <vector>

#include "foundation/type_code.h"

namespace lumo {
namespace {

/// The place of an id in a deque of Pointers that ascend by theirs.
template <typename P>
bool FindById(const Deque<P>& list, std::uint32_t id, std::uint32_t& index) {
  const auto found =
      std::lower_bound(list.begin(), list.end(), id,
                       [](const P& one, std::uint32_t wanted) { return one->Id() < wanted; });
  if (found == list.end() || (*found)->Id() != id) return false;
  index = static_cast<std::uint32_t>(found - list.begin());
  return true;
}

template <typename P>
Array<int> IdsOf(const Deque<P>& list) {
  Array<int> ids{ArrayDims(list.GetCount())};
  int* next = ids.begin();
  if (ids.IsValid()) {
    for (const P& one : list) *next++ = static_cast<int>(one->Id());
  }
  return ids;
}

/// Takes an element out of a deque; the first and the last without moving others.
template <typename P>
void Erase(Deque<P>& list, std::uint32_t index) {
  if (index + 1 == list.GetCount()) {
    list.PopBack();
  } else if (index == 0) {
    list.PopFront();
  } else {
    std::move(list.begin() + index + 1, list.end(), list.begin() + index);
    list.PopBack();
  }
}

Point2DArray<double> ToPoints(const Array<Point2D<double>>& points) {
  return {points.begin(), points.end()};
}

}  // namespace

const unsigned Geometry::TypeCode = GloballyUniqueObjectTypeCode("Geometry");
const unsigned WritableGeometry::TypeCode = GloballyUniqueObjectTypeCode("WritableGeometry");
const unsigned GeometryPart::TypeCode = GloballyUniqueObjectTypeCode("GeometryPart");
const unsigned GeometryRecord::TypeCode = GloballyUniqueObjectTypeCode("GeometryRecord");
const unsigned MemoryGeometry::TypeCode = GloballyUniqueObjectTypeCode("MemoryGeometry");
const unsigned ProjectedGeometry::TypeCode = GloballyUniqueObjectTypeCode("ProjectedGeometry");

bool Geometry::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}
bool WritableGeometry::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Geometry::IsA(typeCode);
}
bool GeometryPart::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}
bool GeometryRecord::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}
bool MemoryGeometry::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || WritableGeometry::IsA(typeCode);
}
bool ProjectedGeometry::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Geometry::IsA(typeCode);
}

GeometryRecord::GeometryRecord(const GeometryRecord& other)
    : Object(other), kind_(other.kind_), id_(other.id_) {
  const QueuingRWMutexLock lock(other.mutex_, false);
  nextPart_ = other.nextPart_;
  revision_ = other.revision_;
  for (const GeometryPartPtr& part : other.parts_) {
    if (!parts_.PushBack(GeometryPartPtr(new GeometryPart(*part)))) throw std::bad_alloc();
  }
}

std::uint32_t GeometryRecord::Revision() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return revision_;
}

std::uint32_t GeometryRecord::PartCount() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return parts_.GetCount();
}

Array<int> GeometryRecord::PartIds() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return IdsOf(parts_);
}

bool GeometryRecord::FindPart(std::uint32_t part, std::uint32_t& index) const {
  const QueuingRWMutexLock lock(mutex_, false);
  return FindById(parts_, part, index);
}

template <typename Read>
bool GeometryRecord::ReadPart(std::uint32_t part, Read&& read) const {
  const QueuingRWMutexLock lock(mutex_, false);
  std::uint32_t index = 0;
  if (!FindById(parts_, part, index)) return false;
  read(*parts_[index]);
  return true;
}

bool GeometryRecord::AddPart(bool hole, std::uint32_t& id, Point2DArray<double>* points) {
  const QueuingRWMutexLock lock(mutex_);
  const GeometryPartPtr part(new GeometryPart(nextPart_, hole));
  if (points != nullptr) part->SetPoints(std::move(*points));
  if (!parts_.PushBack(part)) {
    parts_.ClearErrorState();
    return false;
  }
  id = nextPart_++;
  ++revision_;
  return true;
}

bool GeometryRecord::RemovePart(std::uint32_t part) {
  const QueuingRWMutexLock lock(mutex_);
  std::uint32_t index = 0;
  if (!FindById(parts_, part, index)) return false;
  Erase(parts_, index);
  ++revision_;
  return true;
}

bool GeometryRecord::SetPoints(std::uint32_t part, Point2DArray<double> points) {
  const QueuingRWMutexLock lock(mutex_);
  std::uint32_t index = 0;
  if (!FindById(parts_, part, index)) return false;
  parts_[index]->SetPoints(std::move(points));
  return true;
}

MemoryGeometry::MemoryGeometry(const lumo::CoordSys& coordSys) : WritableGeometry(coordSys) {
  CountChanges();
}

MemoryGeometry::MemoryGeometry(const MemoryGeometry& other) : WritableGeometry(other) {
  CountChanges();
  const QueuingRWMutexLock lock(other.mutex_, false);
  nextRecord_ = other.nextRecord_;
  for (const GeometryRecordPtr& record : other.records_) {
    if (!records_.PushBack(GeometryRecordPtr(new GeometryRecord(*record)))) throw std::bad_alloc();
  }
}

GeometryPtr MemoryGeometry::Clone() const {
  try {
    return GeometryPtr(new MemoryGeometry(*this));
  } catch (const std::bad_alloc&) {
    return {};
  }
}

GeometryRecord* MemoryGeometry::Find(std::uint32_t record) const {
  std::uint32_t index = 0;
  return FindById(records_, record, index) ? records_[index].Get() : nullptr;
}

std::uint32_t MemoryGeometry::RecordRevision(std::uint32_t record) const {
  const QueuingRWMutexLock lock(mutex_, false);
  const GeometryRecord* const found = Find(record);
  return found != nullptr ? found->Revision() : 0;
}

template <typename Read>
bool MemoryGeometry::ReadPart(std::uint32_t record, std::uint32_t part, Read&& read) const {
  const QueuingRWMutexLock lock(mutex_, false);
  const GeometryRecord* const found = Find(record);
  return found != nullptr && found->ReadPart(part, read);
}

std::uint32_t MemoryGeometry::PartRevision(std::uint32_t record, std::uint32_t part) const {
  std::uint32_t revision = 0;
  ReadPart(record, part, [&](const GeometryPart& found) { revision = found.Revision(); });
  return revision;
}

std::uint32_t MemoryGeometry::RecordCount() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return records_.GetCount();
}

Array<int> MemoryGeometry::RecordIds() const {
  const QueuingRWMutexLock lock(mutex_, false);
  return IdsOf(records_);
}

std::int32_t MemoryGeometry::RecordKind(std::uint32_t record) const {
  const QueuingRWMutexLock lock(mutex_, false);
  const GeometryRecord* const found = Find(record);
  return found != nullptr ? found->Kind() : 0;
}

std::uint32_t MemoryGeometry::PartCount(std::uint32_t record) const {
  const QueuingRWMutexLock lock(mutex_, false);
  const GeometryRecord* const found = Find(record);
  return found != nullptr ? found->PartCount() : 0;
}

Array<int> MemoryGeometry::PartIds(std::uint32_t record) const {
  const QueuingRWMutexLock lock(mutex_, false);
  const GeometryRecord* const found = Find(record);
  return found != nullptr ? found->PartIds() : Array<int>();
}

std::uint32_t MemoryGeometry::VertexCount(std::uint32_t record, std::uint32_t part) const {
  std::uint32_t count = 0;
  ReadPart(record, part, [&](const GeometryPart& found) {
    count = static_cast<std::uint32_t>(found.Points().size());
  });
  return count;
}

bool MemoryGeometry::IsHole(std::uint32_t record, std::uint32_t part) const {
  bool isHole = false;
  ReadPart(record, part, [&](const GeometryPart& found) { isHole = found.IsHole(); });
  return isHole;
}

Array<Point2D<double>> MemoryGeometry::Coordinates(std::uint32_t record, std::uint32_t part) const {
  Array<Point2D<double>> points;
  ReadPart(record, part, [&](const GeometryPart& found) {
    if (points.Resize(ArrayDims(static_cast<unsigned>(found.Points().size())))) {
      std::copy(found.Points().begin(), found.Points().end(), points.begin());
    }
  });
  return points;
}

bool MemoryGeometry::FindPart(std::uint32_t record, std::uint32_t part, std::uint32_t& recordIndex,
                              std::uint32_t& partIndex) const {
  const QueuingRWMutexLock lock(mutex_, false);
  return FindById(records_, record, recordIndex) &&
         records_[recordIndex]->FindPart(part, partIndex);
}

bool MemoryGeometry::FindRecord(std::uint32_t record, std::uint32_t& recordIndex) const {
  const QueuingRWMutexLock lock(mutex_, false);
  return FindById(records_, record, recordIndex);
}

bool MemoryGeometry::AddRecord(std::int32_t kind, std::uint32_t& id) {
  const QueuingRWMutexLock lock(mutex_);
  const bool isAdded = detail::Guarded(*this, [&] {
    const GeometryRecordPtr record(new GeometryRecord(kind, nextRecord_));
    if (!records_.PushBack(record)) throw std::bad_alloc();
  });
  if (!isAdded) return false;
  id = nextRecord_++;
  Changed();
  return true;
}

bool MemoryGeometry::RemoveRecord(std::uint32_t record) {
  const QueuingRWMutexLock lock(mutex_);
  std::uint32_t index = 0;
  if (!FindById(records_, record, index)) return false;
  Erase(records_, index);
  Changed();
  return true;
}

void MemoryGeometry::Clear() {
  const QueuingRWMutexLock lock(mutex_);
  if (records_.GetCount() == 0) return;
  records_.Clear();
  Changed();
}

/// Runs a change of a record under the lock, and counts it.
template <typename Change>
bool MemoryGeometry::ChangeRecord(std::uint32_t record, Change&& change) {
  const QueuingRWMutexLock lock(mutex_, false);
  GeometryRecord* const found = Find(record);
  bool hasChanged = false;
  if (found == nullptr || !detail::Guarded(*this, [&] { hasChanged = change(*found); })) {
    return false;
  }
  if (hasChanged) NoteChange();
  return hasChanged;
}

bool MemoryGeometry::AddPart(std::uint32_t record, bool hole, std::uint32_t& id,
                             const Array<Point2D<double>>& points) {
  return ChangeRecord(record, [&](GeometryRecord& found) {
    Point2DArray<double> vertices = ToPoints(points);
    return found.AddPart(hole, id, &vertices);
  });
}

bool MemoryGeometry::AddPart(std::uint32_t record, bool hole, std::uint32_t& id) {
  return ChangeRecord(record,
                      [&](GeometryRecord& found) { return found.AddPart(hole, id, nullptr); });
}

bool MemoryGeometry::RemovePart(std::uint32_t record, std::uint32_t part) {
  return ChangeRecord(record, [&](GeometryRecord& found) { return found.RemovePart(part); });
}

bool MemoryGeometry::SetCoordinates(std::uint32_t record, std::uint32_t part,
                                    const Array<Point2D<double>>& points) {
  return ChangeRecord(
      record, [&](GeometryRecord& found) { return found.SetPoints(part, ToPoints(points)); });
}

GeometryPtr ProjectedGeometry::Clone() const {
  return GeometryPtr(new ProjectedGeometry(inner_, CoordSys()));
}

Array<Point2D<double>> ProjectedGeometry::Coordinates(std::uint32_t record,
                                                      std::uint32_t part) const {
  Array<Point2D<double>> points = inner_->Coordinates(record, part);
  const unsigned count = points.GetCount();
  if (count == 0) return points;
  Array<double> carried{ArrayDims(count, 2)};
  Array<double> extent{ArrayDims(4)};
  if (!carried.IsValid() || !extent.IsValid()) return {};
  for (unsigned i = 0; i < count; ++i) {
    carried[2 * i] = points[i].x;
    carried[2 * i + 1] = points[i].y;
  }
  const lumo::CoordSys& from = inner_->CoordSys();
  from.Unproject(carried);
  if (!from.SameDatum(CoordSys())) {
    for (unsigned axis = 0; axis < 2; ++axis) {
      double least = carried[axis], most = carried[axis];
      for (unsigned i = 1; i < count; ++i) {
        least = std::min(least, carried[2 * i + axis]);
        most = std::max(most, carried[2 * i + axis]);
      }
      extent[axis] = least;
      extent[axis + 2] = most;
    }
    from.GeoTransform(CoordSys(), carried, extent);
  }
  CoordSys().Project(carried);
  for (unsigned i = 0; i < count; ++i) points[i] = {carried[2 * i], carried[2 * i + 1]};
  return points;
}

}  // namespace lumo
