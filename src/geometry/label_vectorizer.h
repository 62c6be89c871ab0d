#pragma once

#include <limits>
#include <vector>

#include "geometry/boundary_tracer.h"
#include "platform/export.h"
#include "raster/pixel_types.h"
#include "raster/raster_enums.h"

namespace lumo {

/// Takes the polygons of a label raster.
class VEXG_EXPORT LabelPolygonSink {
 public:
  virtual ~LabelPolygonSink() = default;
  /// Takes a polygon. It may be swapped for an empty one.
  /// @param label  of the pixel type, which a double holds exactly.
  /// @return false to stop.
  virtual bool Take(double label, TracedPolygon& polygon) = 0;
};

/// Turns label lines, given from top to bottom, into polygons: one for each connected area of equal
/// label, pixels being connected where they share a side. A pixel is excluded when its state is not
/// valid, when its label is the largest value of its type, and when it is NaN; excluded pixels are
/// in no polygon. Exists for EightTypes.
///
/// Cost: two lines of labels are held, and what BoundaryTracer needs.
/// Threads: one at a time.
///
///     LabelVectorizer<std::int32_t> vectorizer(width, sink);
///     for (unsigned y = 0; y < height; ++y) vectorizer.AddLine(labels + y * width, nullptr);
///     vectorizer.Finish();  // the sink has all polygons now
template <typename T>
class VEXG_EXPORT LabelVectorizer final : TracedPolygonSink {
 public:
  /// The label of excluded pixels.
  static constexpr T kExcluded = std::numeric_limits<T>::max();

  /// @param width  pixels of a line.
  /// @param sink   outlives the vectorizer.
  LabelVectorizer(std::uint32_t width, LabelPolygonSink& sink);

  /// Adds the next line.
  /// @param labels  `width` labels.
  /// @param states  a state byte for each; null when all are valid.
  /// @return false when the sink has stopped.
  bool AddLine(const T* labels, const unsigned char* states);
  /// Completes the polygons that the last line leaves open. No line may follow.
  /// @return false when the sink has stopped.
  bool Finish();

  /// The number of lines that were added.
  std::uint32_t LineCount() const { return lines_; }

 private:
  bool Wants(std::uint32_t column) override;
  bool Take(std::uint32_t column, TracedPolygon& polygon) override;
  void TakeLabels(const T* labels, const unsigned char* states);

  LabelPolygonSink& sink_;
  BoundaryTracer tracer_;
  std::vector<T> above_;
  std::vector<T> line_;
  ColumnBits up_;
  ColumnBits down_;
  ColumnBits across_;
  std::uint32_t lines_ = 0;
};

VEXG_EXTERN(EIGHT, LabelVectorizer);

}  // namespace lumo
