#include "geometry/record_writer.h"

#include <algorithm>

#include "foundation/fault.h"

namespace lumo {
namespace {

/// The area of a polygon in pixels, holes taken off.
double AreaOf(const TracedPolygon& polygon) {
  double sum = 0;
  for (std::size_t ring = 0; ring < polygon.starts.size(); ++ring) {
    const std::size_t end = ring + 1 < polygon.starts.size()
                                ? polygon.starts[ring + 1] * std::size_t{2}
                                : polygon.coordinates.size();
    for (std::size_t at = polygon.starts[ring] * std::size_t{2}; at + 3 < end; at += 2) {
      const std::uint32_t* const edge = polygon.coordinates.data() + at;
      sum += static_cast<double>(edge[0]) * edge[3] - static_cast<double>(edge[2]) * edge[1];
    }
  }
  return sum / 2;
}

template <typename T>
VectorValue ValueOf(T label) {
  if constexpr (std::is_floating_point_v<T>) return static_cast<double>(label);
  return static_cast<std::int64_t>(label);
}

}  // namespace

template <typename T>
RecordPolygonWriter<T>::RecordPolygonWriter(const VectorRecordSinkPtr& sink,
                                            const PolygonRecordOptions& options)
    : sink_(sink), options_(options) {
  record_.geometry = VectorGeometry::kPolygon;
}

template <typename T>
bool RecordPolygonWriter<T>::Write(const T& label, const Deque<bool>& holes,
                                   const Deque<unsigned>& starts,
                                   const Deque<std::uint32_t>& coordinates) {
  polygon_.holes.assign(holes.begin(), holes.end());
  polygon_.starts.assign(starts.begin(), starts.end());
  polygon_.coordinates.assign(coordinates.begin(), coordinates.end());
  return Put(label);
}

template <typename T>
bool RecordPolygonWriter<T>::Write(const T& label, const Array<bool>& holes,
                                   const Array<unsigned>& starts,
                                   const Array<std::uint32_t>& coordinates) {
  polygon_.holes.assign(holes.begin(), holes.end());
  polygon_.starts.assign(starts.begin(), starts.end());
  polygon_.coordinates.assign(coordinates.begin(), coordinates.end());
  return Put(label);
}

template <typename T>
bool RecordPolygonWriter<T>::WriteFlat(const T& label, std::size_t rings,
                                       const unsigned char* holes, const std::uint32_t* starts,
                                       std::size_t coordinateCount,
                                       const std::uint32_t* coordinates) {
  polygon_.holes.assign(holes, holes + rings);
  polygon_.starts.assign(starts, starts + rings);
  polygon_.coordinates.assign(coordinates, coordinates + coordinateCount);
  return Put(label);
}

template <typename T>
bool RecordPolygonWriter<T>::Put(T label) {
  if (options_.leastPixels > 0 && AreaOf(polygon_) < options_.leastPixels) {
    ++leftOut_;
    return true;
  }
  const TracedPolygon& rings = SplitAtTouches(polygon_, split_) ? split_ : polygon_;
  const auto vertices = static_cast<std::uint32_t>(rings.coordinates.size() / 2);
  record_.partEnds.assign(rings.starts.begin() + 1, rings.starts.end());
  record_.partEnds.push_back(vertices);
  record_.holes = rings.holes;
  record_.values.assign(1, ValueOf(label));
  if (!Carry(rings.coordinates) || !sink_->Write(record_)) return false;
  ++written_;
  return true;
}

template <typename T>
bool RecordPolygonWriter<T>::Carry(const std::vector<std::uint32_t>& pixels) {
  record_.coordinates.assign(pixels.begin(), pixels.end());
  if (!options_.geoRef) return true;
  // The vertices are carried where they lie.
  Array<double> points(record_.coordinates.data(),
                       ArrayDims(static_cast<unsigned>(pixels.size() / 2), 2));
  if (options_.geoRef->PixelToMap(points)) return true;
  SetFault("a polygon has points that the raster's geo-reference can't carry to its map");
  return false;
}

VEXG_INSTANCES(EIGHT, RecordPolygonWriter);

}  // namespace lumo
