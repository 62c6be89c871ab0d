#pragma once

#include <optional>
#include <vector>

#include "regions/rasterized_geometry.h"
#include "views/computed_raster.h"

namespace lumo {

/// Shapes with a value for each, and the grid on which they are shown.
struct ValuedShapes {
  GeometryPtr geometry;
  std::vector<double> values;  ///< for each record, in the order of their ids
  GeoRefPtr geoRef;            ///< of the grid; null for one of pixels
  unsigned samples = 0;        ///< of the grid
  unsigned lines = 0;          ///< of the grid
  ScanOptions options;         ///< how the shapes become pixels
  double background = 0;       ///< of the pixels outside
  bool isNoData = false;  ///< whether these are not valid, and `background` is their no-data value
};

/// Shows shapes as a raster of one band: each pixel has the value of the last record that it lies
/// in. No pixel is kept. Exists for EightTypes.
///
/// Threads: every operation may run on many threads at once.
/// Failure: IsValid() is false for shapes in another coordinate system than the grid's that can't
///          be carried, and for values that T can't hold; a read then gives false.
template <typename T>
class ShapesRaster final : public ComputedRaster<T> {
 public:
  /// @param shapes  are copied, but for the geometry, which is shared.
  explicit ShapesRaster(const ValuedShapes& shapes);
  ~ShapesRaster() override { this->StopComputing(); }

  URI GetURI() const override { return this->DefaultURI("ShapesRaster"); }
  bool IsValid() const override { return Object::IsValid(); }
  bool CanWrite() const override { return false; }
  RasterDef GetRasterDef() const override { return def_; }
  unsigned Samples() const override { return def_.samples; }
  unsigned Lines() const override { return def_.lines; }
  unsigned Bands() const override { return 1; }
  bool HasNoDataValue(unsigned band) const override { return isNoData_ && band == 0; }
  T NoDataValue(unsigned) const override { return background_; }

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;

 private:
  RasterDef def_;
  RasterizedGeometryPtr shapes_;
  std::vector<T> values_;
  T background_{};
  bool isNoData_;
};

VEXG_EXTERN(EIGHT, ShapesRaster);

}  // namespace lumo
