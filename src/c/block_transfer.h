#pragma once

#include "c/vexg.h"
#include "foundation/run_controls.h"
#include "raster/raster.h"

namespace lumo {

/// Reads a block of a raster into memory of the caller's, in pieces of whole lines that stay in the
/// caches.
/// @param abort  looked at before each piece.
/// @return false, with the fault text set, unless the memory holds the whole block.
bool ReadBlock(BasicRaster& raster, const vexg_block& block, const AbortFlag& abort);

/// Writes a block of the caller's memory to a raster, likewise.
bool WriteBlock(BasicRaster& raster, const vexg_block& block, const AbortFlag& abort);

}  // namespace lumo
