#pragma once

#include "geometry/polygon_file.h"

namespace lumo {

/// The default of the smoothing tolerance of a footprint, in square pixels, see SimplifyRing.
inline constexpr float kFootprintTolerance = 1.1F;
/// The default of the area below which polygons and holes are left out of a footprint, in pixels.
inline constexpr double kFootprintMinimumArea = 16.0;

/// Writes the footprint of a scene, or the part of it that a mosaic shows: polygons around pixels,
/// in a file that takes its place when it is closed. T is the type of the scene's pixels, one of
/// EightTypes, and of the labels; C is std::uint32_t.
///
/// Polygons in deques or in plain memory, as the vectorizer gives them, are thinned: those below
/// the minimum area are left out, holes below it as well, and the rest is simplified. Polygons in
/// arrays are written as they stand. A label of 0 marks what is outside, and isn't written.
///
///     MosaicFootPrintPolygonWriter<std::uint8_t> file{URI("scene_footprint.msf")};
///     file.Write(polygon);
///     if (!file.Close()) return false;  // TakeFault() says why
template <typename T, typename C = std::uint32_t>
class MosaicFootPrintPolygonWriter final : public PolygonFileWriter<T> {
  static_assert(std::is_same_v<C, std::uint32_t>);

 public:
  /// @param bufferSize   bytes that are gathered before they are written; 0 for none of the
  ///                     caller's.
  /// @param tolerance    in square pixels, see SimplifyRing.
  /// @param minimumArea  in pixels.
  explicit MosaicFootPrintPolygonWriter(const URI& uri, unsigned bufferSize = kPolygonBufferSize,
                                        float tolerance = kFootprintTolerance,
                                        double minimumArea = kFootprintMinimumArea);

  using PolygonFileWriter<T>::Write;
  bool Write(const T& label, const Array<bool>& holes, const Array<unsigned>& starts,
             const Array<C>& coordinates) override;
  /// Writes a polygon as it stands, one of label 0 under the label 1. One without rings leaves
  /// nothing.
  bool Write(const Polygon2D<C>& polygon) override;
  /// Writes a polygon of the vectorizer, thinned.
  bool WriteFlat(const T& label, std::size_t rings, const unsigned char* holes,
                 const std::uint32_t* starts, std::size_t coordinateCount,
                 const C* coordinates) override;

 private:
  const float tolerance_;
  const double minimumArea_;
};

/// Reads a footprint. A file without polygons leaves the reader not valid, with
/// PolygonErrorBadPolygon; every other one that can't be used with ObjectErrorIO.
template <typename T, typename C = std::uint32_t>
class MosaicFootPrintPolygonReader final : public PolygonFileReader<T> {
  static_assert(std::is_same_v<C, std::uint32_t>);

 public:
  explicit MosaicFootPrintPolygonReader(const URI& uri, unsigned bufferSize = kPolygonBufferSize);
};

VEXG_EXTERN(EIGHT, MosaicFootPrintPolygonWriter);
VEXG_EXTERN(EIGHT, MosaicFootPrintPolygonReader);

/// All polygons of a footprint file as one, which has as many outer rings as the scene has separate
/// parts.
/// @return a polygon that isn't valid when there are none, with the reader's error: of a whole file
///         without polygons PolygonErrorBadPolygon. TakeFault says why.
template <typename T>
VEXG_EXPORT Polygon2D<std::uint32_t> ReadFootprint(const String& path);

}  // namespace lumo
