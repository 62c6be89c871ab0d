#pragma once

#include <vector>

#include "geometry/label_vectorizer.h"
#include "geometry/polygon_stream.h"

namespace lumo {

/// Counts the polygons of a run, and those whose labels were changed.
struct LabelCounts {
  std::uint64_t polygons = 0;  ///< written
  std::uint64_t changed = 0;   ///< of those, the ones whose label the writer's type can't hold
};

/// The polygons of some lines, to be written later. They lie in a few pieces of memory, which are
/// used again.
///
/// Threads: one at a time.
class VEXG_EXPORT PolygonBatch final : public Object, public LabelPolygonSink {
 public:
  /// Adds a polygon.
  bool Take(double label, TracedPolygon& polygon) override;
  /// Drops all polygons; memory stays.
  void Clear();
  bool IsEmpty() const { return entries_.empty(); }

  /// Writes the polygons in their order.
  ///
  /// A label that the writer's type can't hold is changed and counted: whole numbers keep their
  /// lowest bits, as integers are converted in C++; others lose their fraction; what is outside of
  /// 64 bits becomes the nearest label of the type.
  /// @param writer  a PolygonWriter with labels of T or of int, and coordinates of unsigned int.
  /// @return false when the writer is another object or refuses a polygon; TakeFault may say why.
  template <typename T>
  bool WriteTo(Object& writer, LabelCounts& counts) const;

 private:
  struct Entry {
    double label;
    std::size_t rings;
    std::size_t coordinates;
  };

  template <typename L>
  bool WriteAll(PolygonWriter<L, std::uint32_t>& writer, LabelCounts& counts) const;

  std::vector<Entry> entries_;
  TracedPolygon all_;
};

}  // namespace lumo
