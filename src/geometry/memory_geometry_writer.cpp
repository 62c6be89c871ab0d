#include "geometry/memory_geometry_writer.h"

namespace lumo {

template <typename T>
MemoryGeometryPolygonWriter<T>::MemoryGeometryPolygonWriter(const MemoryGeometryPtr& geometry,
                                                            std::uint32_t originX,
                                                            std::uint32_t originY,
                                                            const GeoRefPtr& source,
                                                            const GeoRefPtr& target)
    : geometry_(geometry), originX_(originX), originY_(originY), source_(source), target_(target) {}

template <typename T>
bool MemoryGeometryPolygonWriter<T>::Write(const T&, const Deque<bool>& holes,
                                           const Deque<unsigned>& starts,
                                           const Deque<std::uint32_t>& coordinates) {
  return Put(holes, starts, coordinates);
}

template <typename T>
bool MemoryGeometryPolygonWriter<T>::Write(const T&, const Array<bool>& holes,
                                           const Array<unsigned>& starts,
                                           const Array<std::uint32_t>& coordinates) {
  return Put(holes, starts, coordinates);
}

template <typename T>
template <typename Flags, typename Indices, typename Values>
bool MemoryGeometryPolygonWriter<T>::Put(const Flags& holes, const Indices& starts,
                                         const Values& coordinates) {
  std::uint32_t record = 0;
  if (!geometry_->AddRecord(kPolygonRecord, record)) return false;
  for (unsigned ring = 0; ring < starts.GetCount(); ++ring) {
    const unsigned begin = starts[ring];
    const unsigned end =
        ring + 1 < starts.GetCount() ? starts[ring + 1] : coordinates.GetCount() / 2;
    Array<double> carried{ArrayDims(end - begin, 2)};
    Array<Point2D<double>> points{ArrayDims(end - begin)};
    if (end <= begin || !carried.IsValid() || !points.IsValid()) return false;
    for (unsigned i = 0; i < end - begin; ++i) {
      carried[2 * i] = static_cast<double>(originX_) + coordinates[2 * (begin + i)];
      carried[2 * i + 1] = static_cast<double>(originY_) + coordinates[2 * (begin + i) + 1];
    }
    if (source_ && !source_->PixelToMap(carried)) return false;
    if (source_ && target_ && !source_->MapToMap(carried, *target_)) return false;
    for (unsigned i = 0; i < end - begin; ++i) points[i] = {carried[2 * i], carried[2 * i + 1]};
    std::uint32_t part = 0;
    if (!geometry_->AddPart(record, holes[ring], part, points)) return false;
  }
  return true;
}

template class MemoryGeometryPolygonWriter<std::uint8_t>;
template class MemoryGeometryPolygonWriter<std::int32_t>;

}  // namespace lumo
