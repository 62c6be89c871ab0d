#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "data/vector_records.h"
#include "georef/georef.h"
#include "viewer/job_door.h"

namespace lumo::host {

/// The part of the raster that the page shows.
struct ShapeView {
  double left = 0, top = 0, right = 0, bottom = 0;  ///< pixels of the raster
  double step = 1;                                  ///< of these to a pixel of the screen
};

/// The shapes of a vector file in pixels of a raster, from the corner of the first one. Those that
/// can't be carried to the raster are left out.
///
/// A small file is given as a whole. Of a large one a view gets what it shows: lines without the
/// vertices that lie within half a pixel of the screen of the one before, of the shapes that are
/// smaller than such a pixel one for each, and the largest ones where there are too many.
///
/// Threads: any.
class ViewedShapes {
 public:
  /// Reads all layers of a file. Throws HostError.
  /// @param grid  of the raster; empty for shapes in pixels.
  ViewedShapes(const std::string& file, const GeoRefPtr& grid);

  /// A FeatureCollection of GeoJSON with the layer, and the fields of a small file, as properties;
  /// "layers" has their names, "isWhole" is true for all of a small file, "inView" counts shapes
  /// and "left" those that are not drawn.
  Json Give(const std::optional<ShapeView>& view) const;

 private:
  struct Shape {
    std::uint32_t layer = 0;
    VectorGeometry kind{};
    std::vector<std::uint32_t> partEnds;
    std::vector<std::uint8_t> holes;
    std::vector<double> points;  // x and y
    double left = 0, top = 0, right = 0, bottom = 0;
    Json properties;

    double Size() const { return std::max(right - left, bottom - top); }
  };
  void ReadLayer(VectorRecordSource& source, std::uint32_t number, const GeoRefPtr& grid);
  std::vector<const Shape*> Choose(const ShapeView& view, Json& told) const;
  Json FeatureOf(const Shape& shape, double apart) const;
  bool IsSmall() const;

  std::vector<std::string> layers_;
  std::vector<Shape> shapes_;
  std::size_t vertices_ = 0;
};

/// Reads the footprints and seams of a mosaic likewise.
/// @param work  a vector file that may be made for it, and is left there.
ViewedShapes ReadMosaicShapes(JobDoor& door, const std::string& mosaic, const GeoRefPtr& grid,
                              const std::string& work);

}  // namespace lumo::host
