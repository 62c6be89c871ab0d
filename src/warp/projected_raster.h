#pragma once

#include <optional>

#include "raster/raster_def.h"
#include "views/computed_raster.h"
#include "warp/reprojection.h"

namespace lumo {

/// Names the grids that a ProjectedRaster can have.
enum class ProjectedGrid : unsigned {
  kComputed = 0,  ///< all of the parent in the target's system, with pixels as large as its own
  kExact = 1      ///< the target as it is: its tie point, its pixel size, and its size
};

VEXG_EXPORT std::span<const EnumWord<ProjectedGrid>> WordsOf(ProjectedGrid);

/// Holds the wishes to a ProjectedRaster beside its method and resampling.
struct ProjectedRasterOptions {
  ProjectedGrid grid = ProjectedGrid::kComputed;
  WarpSampling sampling = WarpSampling::kCorner;
  /// The no-data value of all bands, which pixels outside the parent have; otherwise the parent's.
  /// With one that the pixel type can't hold, bands have none.
  std::optional<double> noData;
  /// The kernel in place of the resampling and the sampling; for an exact grid.
  WarpKernel kernel = WarpKernel::kTold;
};

/// Shows its parent in the grid of another geo-reference. Nothing is computed until a block is
/// asked for; see Reprojection. Palettes are the parent's. Statistics and histograms are the view's
/// own on an exact grid, computed from the pixels that it shows, and the parent's on a computed
/// one. Exists for EightTypes.
///
/// On an exact grid a pixel is the same whatever block it is read in: the polynomials belong to
/// fixed squares of the grid, with no position off by more than an eighth of a pixel, see WarpMap.
/// A block that misses the parent is one of background pixels. On a computed grid each block has a
/// polynomial of its own, and a block that misses the parent is given as such but the read reports
/// false.
///
/// Ownership: shares the parent, which does not know the view; has copies of the geo-references.
/// Threads:   every operation may run on many threads at once; nothing is stored per call.
/// Failure:   a target that isn't a StdGeoRef, a parent without geo-reference, or one that can't be
///            carried to the target makes a view without a parent: IsValid() is false and
///            operations give false, 0 or empty. Nothing can be written.
///
///     const GeoRefPtr grid(new StdGeoRef(target));  // with its size set
///     const RasterPtr<float> warped(new ProjectedRaster<float>(
///         raster, grid, ReprojectionMethod::kRigorous, PyramidResamplingMethod::kCubic,
///         {ProjectedGrid::kExact, WarpSampling::kCentred, -9999.0, WarpKernel::kCubic}));
template <typename T>
class ProjectedRaster final : public ComputedRaster<T> {
 public:
  /// @param method      anything but kRigorous runs as kPolynomial.
  /// @param resampling  anything but kLinear and kCubic runs as kNearest.
  ProjectedRaster(const RasterPtr<T>& parent, const GeoRefPtr& target, ReprojectionMethod method,
                  PyramidResamplingMethod resampling, const ProjectedRasterOptions& options = {});
  ~ProjectedRaster() override { this->StopComputing(); }

  URI GetURI() const override { return this->DefaultURI("ProjectedRaster"); }
  bool CanWrite() const override { return false; }
  RasterDef GetRasterDef() const override { return def_; }
  unsigned Samples() const override { return def_.samples; }
  unsigned Lines() const override { return def_.lines; }
  bool HasNoDataValue(unsigned band) const override;
  T NoDataValue(unsigned band) const override;
  void SetTileDimensions(const lumo::TileDimensions& tiles) override { tiles_ = tiles; }
  lumo::TileDimensions TileDimensions() const override { return tiles_; }

  /// The parent's level in the same target; on an exact grid that is reduced as the level is.
  RasterPtr<T> PyramidLevel(unsigned level) override;
  RasterPtr<T> StoredPyramidLevel(unsigned level) override;

  bool GetSubRect(const SubRect& rect, const Array<unsigned>& bands, Interleave interleave,
                  Array<T>& pixels, Array<unsigned char>& state) override;
  bool PutSubRect(const SubRect&, const Array<unsigned>&, Interleave, Array<T>&,
                  Array<unsigned char>&) override {
    return false;
  }

 private:
  bool SetUp();
  GeoRefPtr ComputedGrid(const GeoRef& source) const;
  RasterPtr<T> OnLevel(const RasterPtr<T>& level) const;

  GeoRefPtr target_;
  ReprojectionMethod method_;
  PyramidResamplingMethod resampling_;
  ProjectedRasterOptions options_;
  RasterDef def_;
  lumo::TileDimensions tiles_;
  Reprojection<T> reprojection_;
};

VEXG_EXTERN(EIGHT, ProjectedRaster);

}  // namespace lumo
