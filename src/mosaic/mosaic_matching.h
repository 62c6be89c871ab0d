#pragma once

#include "foundation/run_controls.h"
#include "mosaic/mosaic_raster_def.h"
#include "mosaic/scene_shares.h"

namespace lumo {

/// The histogram by which a band is matched, by its least and its greatest value. Integers of 8 and
/// 16 bits have bins of one value each; those of 32 bits up to 32,768 and a few more of a whole
/// size. Floating-point numbers have 65,536 bins, of which bin i begins at
/// min + i (max - min) / 65535 in the exact form.
template <typename T>
VEXG_EXPORT HistogramRequest<T> MatchingHistogram(T min, T max, Form bins);

/// Makes the tables that give the scenes of a mosaic the colours of the reference scene, by
/// histogram matching, and writes them to its two files. Exists for EightTypes.
///
/// With the colour match mode 0 a scene is matched to the reference in the area that both have in
/// common, where that has more than a tenth of the scene's pixels; else, and with the mode 1, the
/// whole scene is matched to the whole reference. A histogram that has counted nothing, and a
/// reference of one bin, leave the values of the scene as they are.
///
/// Failure: false, with the fault set; files that were there before stay then.
/// @param shares  of a share, the tables of its scenes are put to it, and no file is made.
template <typename T>
VEXG_EXPORT bool MatchScenes(MosaicRasterDef<T>& definition, const IPC& ipc, SceneShares& shares);

/// The same for all scenes at once.
template <typename T>
bool MatchScenes(MosaicRasterDef<T>& definition, const IPC& ipc) {
  SceneShares none;
  return MatchScenes(definition, ipc, none);
}

}  // namespace lumo
