#pragma once

#include "geometry/geometry.h"
#include "geometry/polygon_stream.h"
#include "georef/georef.h"

namespace lumo {

/// Puts vectorized polygons into a MemoryGeometry: a record of kind 0 for each, with a part for
/// each ring. Exists for labels of std::uint8_t and std::int32_t.
///
/// Failure: a polygon whose points can't be carried gives false; the parts before it stay.
template <typename T>
class VEXG_EXPORT MemoryGeometryPolygonWriter final : public PolygonWriter<T, std::uint32_t> {
 public:
  /// @param originX, originY  added to the coordinates: the first pixel of the vectorized part in
  ///                the source grid.
  /// @param source  carries pixels of the source grid to its map; null leaves pixels as they are.
  /// @param target  carries the map of `source` to that of this; null leaves out that step.
  MemoryGeometryPolygonWriter(const MemoryGeometryPtr& geometry, std::uint32_t originX,
                              std::uint32_t originY, const GeoRefPtr& source,
                              const GeoRefPtr& target);

  bool Write(const T& label, const Deque<bool>& holes, const Deque<unsigned>& starts,
             const Deque<std::uint32_t>& coordinates) override;
  bool Write(const T& label, const Array<bool>& holes, const Array<unsigned>& starts,
             const Array<std::uint32_t>& coordinates) override;
  using PolygonWriter<T, std::uint32_t>::Write;

 private:
  template <typename Flags, typename Indices, typename Values>
  bool Put(const Flags& holes, const Indices& starts, const Values& coordinates);

  MemoryGeometryPtr geometry_;
  std::uint32_t originX_;
  std::uint32_t originY_;
  GeoRefPtr source_;
  GeoRefPtr target_;
};

}  // namespace lumo
