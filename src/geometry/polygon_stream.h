#pragma once

#include "foundation/containers.h"
#include "geometry/polygon2d.h"

namespace lumo {

/// Takes polygons, one after the other. L is the type of labels, C that of coordinates.
///
/// The rings of a polygon are given by three lists: for each ring whether it is a hole, for each
/// ring the index of its first vertex, and x, y of all vertices.
///
/// Threads: one at a time.
template <typename L, typename C>
class PolygonWriter : public Object {
 public:
  /// Writes a polygon held in deques, as the vectorizer gives it.
  /// @return false when it can't be written; TakeFault may say why.
  virtual bool Write(const L& label, const Deque<bool>& holes, const Deque<unsigned>& starts,
                     const Deque<C>& coordinates) = 0;
  /// Writes a polygon held in arrays.
  virtual bool Write(const L& label, const Array<bool>& holes, const Array<unsigned>& starts,
                     const Array<C>& coordinates) = 0;
  /// Writes a polygon under its own label, by way of arrays.
  virtual bool Write(const Polygon2D<C>& polygon);
};

template <typename L, typename C>
using PolygonWriterPtr = Pointer<PolygonWriter<L, C>>;

/// A writer that also takes polygons as they lie in plain memory, which saves filling deques.
template <typename L, typename C>
class FlatPolygonWriter {
 public:
  virtual ~FlatPolygonWriter() = default;
  /// Writes a polygon.
  /// @param rings            how many `holes` and `starts` there are.
  /// @param coordinateCount  how many `coordinates` there are: twice the vertices.
  virtual bool WriteFlat(const L& label, std::size_t rings, const unsigned char* holes,
                         const std::uint32_t* starts, std::size_t coordinateCount,
                         const C* coordinates) = 0;
};

/// Gives polygons, one after the other.
///
///     Polygon2D<std::uint32_t> polygon;
///     while (reader.Read(polygon)) total += polygon.Measure(PolygonMeasure::kArea);
///
/// Threads: one at a time.
template <typename L, typename C>
class PolygonReader : public Object {
 public:
  /// Reads the next polygon into deques, which are emptied first.
  /// @return false at the end, and when it can't be read.
  virtual bool Read(L& label, Deque<bool>& holes, Deque<unsigned>& starts,
                    Deque<C>& coordinates) = 0;
  /// Reads the next polygon into arrays.
  virtual bool Read(L& label, Array<bool>& holes, Array<unsigned>& starts,
                    Array<C>& coordinates) = 0;
  /// Reads the next polygon; false also for one that is not valid.
  virtual bool Read(Polygon2D<C>& polygon);
  /// The number of polygons that the source says it has.
  virtual unsigned Count() const = 0;
};

template <typename L, typename C>
using PolygonReaderPtr = Pointer<PolygonReader<L, C>>;

namespace detail {

/// Fills an array from the elements of another container. @return false when there is no memory.
template <typename T, typename From>
bool CopyToArray(const From& from, Array<T>& to) {
  if (!to.Resize(ArrayDims(from.GetCount()))) return false;
  T* next = to.begin();
  for (const T& value : from) *next++ = value;
  return true;
}

/// Fills a deque from the elements of an array. @return false when there is no memory.
template <typename T>
bool CopyToDeque(const Array<T>& from, Deque<T>& to) {
  to.Clear();
  for (const T& value : from) {
    if (!to.PushBack(value)) return false;
  }
  return true;
}

}  // namespace detail

template <typename L, typename C>
bool PolygonWriter<L, C>::Write(const Polygon2D<C>& polygon) {
  unsigned rings = 0;
  unsigned vertices = 0;
  for (const Contour2D<C>& ring : polygon.Rings()) {
    ++rings;
    vertices += static_cast<unsigned>(ring.points.size());
  }
  Array<bool> holes{ArrayDims(rings)};
  Array<unsigned> starts{ArrayDims(rings)};
  Array<C> coordinates{ArrayDims(2 * vertices)};
  if (!holes.IsValid() || !starts.IsValid() || !coordinates.IsValid()) return false;
  unsigned ring = 0;
  unsigned at = 0;
  for (const Contour2D<C>& contour : polygon.Rings()) {
    holes[ring] = contour.hole;
    starts[ring++] = at / 2;
    for (const Point2D<C>& point : contour.points) {
      coordinates[at++] = point.x;
      coordinates[at++] = point.y;
    }
  }
  return Write(static_cast<L>(polygon.Label()), holes, starts, coordinates);
}

template <typename L, typename C>
bool PolygonReader<L, C>::Read(Polygon2D<C>& polygon) {
  L label{};
  Array<bool> holes;
  Array<unsigned> starts;
  Array<C> coordinates;
  if (!Read(label, holes, starts, coordinates)) return false;
  polygon = Polygon2D<C>(static_cast<double>(label), holes, starts, coordinates);
  return polygon.IsValid();
}

}  // namespace lumo
