#pragma once

#include <optional>

#include "foundation/run_controls.h"
#include "geometry/label_mask.h"

namespace lumo {

/// Says how the pixels outside of a scene are known, where its no-data values alone don't tell.
struct SceneBorder {
  /// Marks pixels that hold it in all bands as outside; without it the scene's own no-data values
  /// do.
  std::optional<double> noData;
  /// Lets pixels count as outside as well whose values are so close to those in all bands, where
  /// they are connected with the edge of the raster through such pixels: what lossy compression
  /// makes of a border. In pixel values.
  double tolerance = 0;
};

/// Finds the pixels of a scene that lie outside of it. Pixels are connected where they share a
/// side. Exists for EightTypes.
///
/// Cost: one pass over the scene, and three bits of memory for each of its pixels.
/// @param also  leaves out more pixels; may be empty.
/// @return the mask of the other pixels; empty, with the fault set, when the scene can't be read,
///         or no no-data value is known.
template <typename T>
VEXG_EXPORT LabelMaskPtr MakeBorderMask(const RasterPtr<T>& scene, const SceneBorder& border,
                                        const LabelMaskPtr& also, const IPC& ipc);

}  // namespace lumo
