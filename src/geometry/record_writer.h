#pragma once

#include "data/vector_records.h"
#include "geometry/polygon_stream.h"
#include "geometry/ring_touches.h"
#include "georef/georef.h"
#include "raster/pixel_types.h"

namespace lumo {

/// Says which polygons of a label raster become records, and how.
struct PolygonRecordOptions {
  GeoRefPtr geoRef;        ///< carries pixels to map coordinates; null leaves pixels
  double leastPixels = 0;  ///< smaller polygons are left out, by their area in pixels
};

/// Puts vectorized polygons into a sink of records with one field, the label. Rings are split where
/// they touch themselves, see SplitAtTouches. Exists for EightTypes.
///
/// Failure: a polygon that the sink refuses, or whose points can't be carried, gives false;
///          TakeFault says why.
template <typename T>
class VEXG_EXPORT RecordPolygonWriter final : public PolygonWriter<T, std::uint32_t>,
                                              public FlatPolygonWriter<T, std::uint32_t> {
 public:
  /// @param sink  of a layer with one field, the label; whoever made it closes it.
  RecordPolygonWriter(const VectorRecordSinkPtr& sink, const PolygonRecordOptions& options);

  bool Write(const T& label, const Deque<bool>& holes, const Deque<unsigned>& starts,
             const Deque<std::uint32_t>& coordinates) override;
  bool Write(const T& label, const Array<bool>& holes, const Array<unsigned>& starts,
             const Array<std::uint32_t>& coordinates) override;
  using PolygonWriter<T, std::uint32_t>::Write;
  bool WriteFlat(const T& label, std::size_t rings, const unsigned char* holes,
                 const std::uint32_t* starts, std::size_t coordinateCount,
                 const std::uint32_t* coordinates) override;

  /// Polygons that were written, and that were too small.
  std::uint64_t Written() const { return written_; }
  std::uint64_t LeftOut() const { return leftOut_; }

 private:
  bool Put(T label);
  bool Carry(const std::vector<std::uint32_t>& pixels);

  VectorRecordSinkPtr sink_;
  PolygonRecordOptions options_;
  TracedPolygon polygon_;
  TracedPolygon split_;
  VectorRecord record_;
  std::uint64_t written_ = 0;
  std::uint64_t leftOut_ = 0;
};

VEXG_EXTERN(EIGHT, RecordPolygonWriter);

}  // namespace lumo
