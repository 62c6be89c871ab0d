#pragma once

#include <optional>

#include "foundation/run_controls.h"
#include "geometry/polygon2d.h"
#include "mosaic/mosaic_raster.h"
#include "mosaic/scene_shares.h"

namespace lumo {

/// Says which footprints are made, and how; see MosaicFootPrintsCommand.
struct FootprintOptions {
  bool again = false;      ///< of all scenes, also those that have one
  double smoothing = 3.1;  ///< square pixels
  std::optional<double> noData;
  double tolerance = 0;  ///< pixel values
  Array<URI> masks;      ///< one for each scene, empty for none; or none at all
};

/// Makes the footprints that a mosaic's scenes don't have yet, each by a job with
/// MosaicFootPrintsCommand, in files of its working directory. The definition is stored now and
/// then, so that what was made is found by a later run.
/// @param made    [out] how many.
/// @param shares  of a share, nothing is stored but its file, with the bytes of footprints.
/// @return false, with the fault set, when one could not be made, or it was aborted; the others
///         are in the definition.
template <typename T>
VEXG_EXPORT bool MakeMissingFootprints(MosaicRasterDef<T>& definition,
                                       const FootprintOptions& options, const IPC& ipc,
                                       unsigned& made, SceneShares& shares);

/// The footprint of a scene in pixels of the mosaic. Exists for EightTypes.
/// @return a polygon that isn't valid, with the fault set, when it can't be read, or not be carried
///         to the mosaic's grid.
template <typename T>
VEXG_EXPORT Polygon2D<double> LoadFootprint(MosaicRasterDef<T>& definition, unsigned scene,
                                            const GeoRef& grid);

/// Decides which scene of a mosaic shows which ground, see SeamGenerator, and writes what each one
/// shows to its `.emp` file, in pixels of the mosaic. A scene that shows nothing has a file without
/// polygons. The files take their places together.
/// @return false, with the fault set, when it failed or was aborted; files that were there before
///         stay then.
template <typename T>
VEXG_EXPORT bool MakeSeams(MosaicRaster<T>& mosaic, const IPC& ipc, Form sides = Form::kTold);

}  // namespace lumo
