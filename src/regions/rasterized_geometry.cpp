#include "regions/rasterized_geometry.h"

#include <algorithm>

#include "foundation/fault.h"
#include "foundation/type_code.h"
#include "regions/rasterized_roi.h"

namespace lumo {

const unsigned RasterizedGeometryRecord::TypeCode =
    GloballyUniqueObjectTypeCode("RasterizedGeometryRecord");
const unsigned RasterizedGeometry::TypeCode = GloballyUniqueObjectTypeCode("RasterizedGeometry");

bool RasterizedGeometryRecord::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}
bool RasterizedGeometry::IsA(unsigned typeCode) const {
  return typeCode == TypeCode || Object::IsA(typeCode);
}

/// Drops what has changed since the last call.
void RasterizedGeometryRecord::Refresh(std::uint64_t generation) {
  if (isFresh_ && generation == generation_) return;
  const std::uint32_t revision = geometry_->RecordRevision(record_);
  if (!isFresh_ || revision != seenRevision_) parts_.Clear();
  rows_.reset();  // vertices may have changed, which the parts find out
  seenRevision_ = revision;
  generation_ = generation;
  isFresh_ = true;
}

/// The rows of a part; null when it can't be carried.
std::shared_ptr<const SpanRows> RasterizedGeometryRecord::PreparePart(const GeoRefPtr& geoRef,
                                                                      int part) {
  RasterizedGeometryPartPtr& made = parts_[part];
  if (!made) {
    made = MakeRasterizedPart(geometry_, record_, static_cast<std::uint32_t>(part), options_);
  }
  unsigned flags = 0;
  made->WantRows(rowLimit_);
  return made->Prepare(geoRef, flags) ? made->Rows() : nullptr;
}

void RasterizedGeometryRecord::WantRows(std::int64_t rowLimit) {
  if (rowLimit <= rowLimit_) return;
  rowLimit_ = rowLimit;
  rows_.reset();
}

bool RasterizedGeometryRecord::HitTest(const GeoRefPtr& geoRef, std::uint64_t generation,
                                       const RegionWindow& pixel, std::int64_t rowLimit,
                                       std::uint32_t& part) {
  const std::lock_guard lock(mutex_);
  Refresh(generation);
  WantRows(rowLimit);
  for (const int id : geometry_->PartIds(record_)) {
    part = static_cast<std::uint32_t>(id);
    if (geometry_->IsHole(record_, part)) continue;
    const std::shared_ptr<const SpanRows> rows = PreparePart(geoRef, id);
    if (rows && rows->Contains(pixel.left, pixel.top)) return true;
  }
  return false;
}

std::shared_ptr<const SpanRows> RasterizedGeometryRecord::Rows(const GeoRefPtr& geoRef,
                                                               std::uint64_t generation,
                                                               std::int64_t rowLimit) {
  const std::lock_guard lock(mutex_);
  Refresh(generation);
  WantRows(rowLimit);
  if (rows_) return rows_;
  std::vector<std::shared_ptr<const SpanRows>> held;
  std::vector<PartRows> parts;
  for (const int id : geometry_->PartIds(record_)) {
    const std::shared_ptr<const SpanRows> rows = PreparePart(geoRef, id);
    if (!rows) return nullptr;
    parts.push_back({rows.get(), geometry_->IsHole(record_, static_cast<std::uint32_t>(id))});
    held.push_back(rows);
  }
  const bool isOneAlone = parts.size() == 1 && !parts.front().isHole && held.front()->AreApart();
  rows_ = isOneAlone ? held.front() : std::make_shared<const SpanRows>(CombineRows(parts));
  return rows_;
}

bool AreProjected(const Geometry& geometry, const GeoRefPtr& geoRef, const ScanOptions& options) {
  if (!geoRef || options.coordinates == ShapeCoordinates::kPixel) return false;
  const CoordSys& target = geoRef->CoordinateSystem();
  return geometry.CoordSys().Type() != 0 && target.Type() != 0 &&
         !geometry.CoordSys().IsEqual(target);
}

GeometryPtr ShownOnGrid(const GeometryPtr& geometry, const GeoRefPtr& geoRef,
                        const ScanOptions& options) {
  if (!AreProjected(*geometry, geoRef, options)) return geometry;
  return GeometryPtr(new ProjectedGeometry(geometry, geoRef->CoordinateSystem()));
}

RasterizedGeometry::RasterizedGeometry(const GeometryPtr& geometry, const GeoRefPtr& geoRef,
                                       unsigned samples, unsigned lines, const ScanOptions& options)
    : geometry_(geometry),
      geoRef_(geoRef),
      samples_(geoRef ? geoRef->Samples() : samples),
      lines_(geoRef ? geoRef->Lines() : lines),
      options_(options) {}

/// A number that every change of the geometry changes.
std::uint64_t RasterizedGeometry::CountChanges() const {
  std::uint64_t changes = 0;
  if (geometry_->ReadChanges(changes)) return changes;
  changes = geometry_->Revision();
  for (const int id : geometry_->RecordIds()) {
    const auto record = static_cast<std::uint32_t>(id);
    changes = changes * 31 + record;
    changes = changes * 31 + geometry_->RecordRevision(record);
    for (const int part : geometry_->PartIds(record)) {
      changes = changes * 31 + geometry_->PartRevision(record, static_cast<std::uint32_t>(part));
    }
  }
  return changes;
}

RecordBox RasterizedGeometry::BoxOf(int record) const {
  constexpr double kFar = 1e16;  // beyond every vertex that can be scanned
  RecordBox box{record, {kFar, kFar, -kFar, -kFar}};
  ScanVertices vertices;
  for (const int part : geometry_->PartIds(static_cast<std::uint32_t>(record))) {
    if (!CarryPart(*geometry_, static_cast<std::uint32_t>(record), static_cast<std::uint32_t>(part),
                   geoRef_, options_.coordinates, vertices)) {
      TakeFault();  // whoever asks for the record's pixels hears of it
      box.bounds = {-kFar, -kFar, kFar, kFar};
      return box;
    }
    for (const Point2D<double>& vertex : vertices) {
      box.bounds = {std::min(box.bounds.minX, vertex.x), std::min(box.bounds.minY, vertex.y),
                    std::max(box.bounds.maxX, vertex.x), std::max(box.bounds.maxY, vertex.y)};
    }
  }
  return box;
}

/// Brings the index up to the geometry as it is now, and forgets records that are gone.
RasterizedGeometry::Sight RasterizedGeometry::Refresh() {
  const std::lock_guard lock(mutex_);
  const std::uint64_t changes = CountChanges();
  if (sight_.index && changes == seenChanges_) return sight_;
  std::vector<RecordBox> boxes;
  const Array<int> ids = geometry_->RecordIds();
  boxes.reserve(ids.GetCount());
  for (const int id : ids) {
    const RecordBox box = BoxOf(id);
    if (box.bounds.minX <= box.bounds.maxX) boxes.push_back(box);
  }
  for (const int id : records_.GetKeys()) {
    if (!std::binary_search(ids.begin(), ids.end(), id)) records_.Remove(id);
  }
  sight_ = {std::make_shared<const RecordIndex>(boxes), sight_.generation + 1};
  seenChanges_ = changes;
  return sight_;
}

RasterizedGeometryRecordPtr RasterizedGeometry::Record(int record) {
  const std::lock_guard lock(mutex_);
  if (!records_.HasKey(record)) {
    if (records_.GetCount() >= kCacheLimit) records_.Remove(records_.begin()->first);
    records_[record].Reset(
        new RasterizedGeometryRecord(geometry_, static_cast<std::uint32_t>(record), options_));
  }
  return records_.Find(record);
}

/// The rows to scan for a window: those of the whole grid, those below it that the last lines of
/// its pyramid levels reach, and more where the window lies further down.
std::int64_t RasterizedGeometry::RowLimitFor(const RegionWindow& window) const {
  constexpr std::int64_t kBelow = 1024;
  return std::max<std::int64_t>(lines_ + kBelow, window.Bottom() + 1);
}

bool RasterizedGeometry::HitTest(const Point2D<unsigned>& point, std::uint32_t& record,
                                 std::uint32_t& part) {
  return HitTest(RegionWindow{point.x, point.y, 1, 1}, record, part);
}

bool RasterizedGeometry::HitTest(const RegionWindow& pixel, std::uint32_t& record,
                                 std::uint32_t& part) {
  const Sight sight = Refresh();
  for (const std::int32_t id : sight.index->Find(pixel)) {
    if (!Record(id)->HitTest(geoRef_, sight.generation, pixel, RowLimitFor(pixel), part)) continue;
    record = static_cast<std::uint32_t>(id);
    return true;
  }
  return false;
}

bool RasterizedGeometry::Mask(const SubRect& rect, Array<unsigned char>& mask,
                              std::uint64_t& count) {
  count = 0;
  if (!ShapeMask(rect, mask, true)) return false;
  RegionMarks marks(WindowOf(rect), mask.GetData());
  if (!Mark(marks)) return false;
  count = marks.Count();
  return true;
}

std::vector<std::int32_t> RasterizedGeometry::FindRecords(const RegionWindow& window) {
  return Refresh().index->Find(window);
}

std::shared_ptr<const SpanRows> RasterizedGeometry::RowsOf(std::int32_t record,
                                                           const RegionWindow& window) {
  return RowsOf(record, window, Refresh());
}

std::shared_ptr<const SpanRows> RasterizedGeometry::RowsOf(std::int32_t record,
                                                           const RegionWindow& window,
                                                           const Sight& sight) {
  return Record(record)->Rows(geoRef_, sight.generation, RowLimitFor(window));
}

bool RasterizedGeometry::ForEachRecord(
    const RegionWindow& window, const std::function<void(std::int32_t, const SpanRows&)>& take) {
  const Sight sight = Refresh();
  for (const std::int32_t id : sight.index->Find(window)) {
    const auto rows = RowsOf(id, window, sight);
    if (!rows) return false;
    take(id, *rows);
  }
  return true;
}

bool RasterizedGeometry::Mark(RegionMarks& marks) {
  return ForEachRecord(marks.Window(),
                       [&](std::int32_t, const SpanRows& rows) { rows.Mark(marks); });
}

RegionCover RasterizedGeometry::Cover(const RegionWindow& window) {
  constexpr std::size_t kMostRecords = 16;
  const Sight sight = Refresh();
  const std::vector<std::int32_t> found = sight.index->Find(window);
  if (found.size() > kMostRecords) return RegionCover::kPartly;
  RegionCover cover = RegionCover::kOutside;
  bool isInside = false;
  for (const std::int32_t id : found) {
    const auto rows = RowsOf(id, window, sight);
    if (!rows) return RegionCover::kPartly;
    const RegionCover one = rows->Cover(window);
    isInside = isInside || one == RegionCover::kInside;
    if (one != RegionCover::kOutside) cover = RegionCover::kPartly;
  }
  return isInside ? RegionCover::kInside : cover;
}

}  // namespace lumo
