#pragma once

#include "calibration/calibration_formula.h"
#include "raster/raster.h"

namespace lumo {

/// Computes a raster from another one by a formula, tile by tile (see MapTiles). Pixels that are
/// not valid are not computed; they get the target's no-data value, or 0 where it has none, and
/// keep their state.
///
/// Exists for all pairs of EightTypes.
/// @param name     of the process.
/// @param formula  for as many bands as the source has.
/// @param target   of the source's size and bands, exists and can be written.
/// @return false, with the fault set where there is one, when the rasters don't fit each
///         other or the formula, with nothing written; or when a read or a write failed. An aborted
///         run is true, and what was written stays.
///
///     const auto radiance = MakeRadianceFormula(gains, offsets, 1.0);
///     const bool well = Calibrate("Radiance", *radiance, counts, values, ipc);
template <typename TIn, typename TOut>
VEXG_EXPORT bool Calibrate(const char* name, const CalibrationFormula& formula,
                           const RasterPtr<TIn>& source, const RasterPtr<TOut>& target,
                           const IPC& ipc);

}  // namespace lumo
