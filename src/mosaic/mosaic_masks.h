#pragma once

#include <memory>
#include <string>
#include <vector>

#include "georef/georef.h"
#include "mosaic/mask_shape.h"
#include "mosaic/mosaic_raster_def.h"
#include "mosaic/scene_pool.h"

namespace lumo {

/// The seam polygons and the footprints of a mosaic's scenes, on its grid. Each is read when it is
/// first needed, and those needed last are kept.
///
/// Threads: any number.
/// Failure: a file that can't be read gives none, or false, with the fault set.
class VEXG_EXPORT MosaicMasks {
 public:
  /// @param files       named by the scenes' keys.
  /// @param sceneModels of all scenes, with their sizes.
  /// @param grid        of the mosaic, with its size.
  /// @param scaleX,scaleY  pixels of the grid for one of the definition's own, below 1 for a level.
  MosaicMasks(const BasicMosaicRasterDef& definition, const MosaicSideFiles& files,
              const std::vector<GeoRefPtr>& sceneModels, const GeoRefPtr& grid, double scaleX,
              double scaleY, unsigned dataType);

  /// True when some scene has a seam file.
  bool HaveSeams() const { return haveSeams_; }
  bool HasSeam(unsigned scene) const { return !seams_[scene].empty(); }
  bool HasFootprint(unsigned scene) const { return !footprints_[scene].empty(); }

  /// The rings of the polygon that a scene is shown in, in pixels of the grid.
  bool ReadSeamRings(unsigned scene, Contour2DArray<double>& rings) const;
  /// The rings of a scene's footprint, in pixels of the grid. Those that can't be carried there are
  /// left out.
  bool ReadFootprintRings(unsigned scene, Contour2DArray<double>& rings) const;

  using Shape = std::shared_ptr<const MaskShape>;
  /// The polygon that a scene is shown in.
  Shape Seam(unsigned scene);
  /// The polygon around the pixels of a scene.
  Shape Footprint(unsigned scene);

 private:
  bool Read(const std::string& path, Polygon2D<std::uint32_t>& polygon) const;

  std::vector<std::string> seams_, footprints_;
  std::vector<GeoRefPtr> sceneModels_;
  GeoRefPtr grid_;
  double scaleX_, scaleY_;
  unsigned dataType_;
  bool haveSeams_ = false;
  static constexpr std::size_t kKept = 64;
  RecentScenes<Shape> seamShapes_{kKept}, footprintShapes_{kKept};
};

}  // namespace lumo
