#pragma once

#include "pyramid/pyramid_process.h"
#include "raster/level_reduction.h"

namespace lumo {

/// Makes the levels of a pyramid of means or modes in one pass over whole lines of the raster.
/// Exists for TwelveTypes.
///
/// A mean is that of all valid pixels of the raster below, 2^level by 2^level; of whole numbers the
/// nearest one, halves upwards. A mode is the most frequent of the four pixels of the level below.
/// Where none is valid the pixel is the first of them, with its state. A mean that comes out as the
/// no-data value becomes the first valid pixel below.
///
///     const PyramidPlan<float> plan{source, full, 1, 5, 256};
///     for (const Array<unsigned>& bands : GroupsOfBands(3, 256)) {
///       if (!ReducedLevels<float>::Make(plan, LevelReduction::kAverage, bands, {}, ipc)) return
///       false;
///     }
///
/// Memory: a strip of tiles and a line for each level.
template <typename T>
class ReducedLevels {
 public:
  /// @param bands  that are stored together, see GroupsOfBands.
  /// @param stats  RasterStats that take in the pixels on the way; empty for none.
  /// @return true as well after an abort; false, with the fault set, when something failed.
  static bool Make(const PyramidPlan<T>& plan, LevelReduction reduction,
                   const Array<unsigned>& bands, const ObjectPtr& stats, const IPC& ipc);
};

/// The bands of a raster as its levels are stored: all together, or of many each alone.
/// @param side  of the tiles.
VEXG_EXPORT std::vector<Array<unsigned>> GroupsOfBands(unsigned bands, unsigned side);

VEXG_EXTERN(TWELVE, ReducedLevels);

}  // namespace lumo
