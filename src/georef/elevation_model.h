#pragma once

#include "foundation/array.h"
#include "foundation/pointer.h"
#include "foundation/sub_rect.h"
#include "platform/export.h"

namespace lumo {

class GeoRef;
class ElevationModel;
using ElevationModelPtr = Pointer<ElevationModel>;

/// Terrain heights on a grid, as an RPC model needs them. The raster floor offers its rasters here.
/// Threads: Samples, Lines, Reference and ReadHeights may be called on many threads at once.
class VEXG_EXPORT ElevationModel {
 public:
  virtual ~ElevationModel() = default;

  /// Columns of the grid.
  virtual unsigned Samples() const = 0;
  /// Rows of the grid.
  virtual unsigned Lines() const = 0;

  /// Where the grid lies; null when that is not known, and the model then gives no heights.
  virtual const GeoRef* Reference() const = 0;

  /// Reads a block of heights, in metres. False when it can't be read.
  /// @param rect     pixels, inside the grid.
  /// @param heights  [out] (height, width) of the rectangle; NaN where there is no height.
  virtual bool ReadHeights(const SubRect& rect, Array<double>& heights) const = 0;

  /// The key under which the raster behind the heights is catalogued.
  virtual URI GetURI() const = 0;

  /// Looks up a model by its raster's key; null when there is none.
  static ElevationModelPtr Find(const URI& uri);

  /// Sets the lookup behind Find, once, at load.
  static void SetFinder(ElevationModelPtr (*finder)(const URI& uri));
};

}  // namespace lumo
