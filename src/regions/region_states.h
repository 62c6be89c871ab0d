#pragma once

#include <cstdint>

#include "foundation/run_controls.h"
#include "raster/raster_enums.h"
#include "regions/rasterized_roi.h"

namespace lumo {

// From regions to the state bytes of pixel blocks. A view keeps the RasterizedROI that RasterizeOn
// makes for the raster at full resolution and hands it on to the views on its pyramid levels:
//
//   rasterized_ = RasterizeOn(definition, parent->Samples(), parent->Lines(), geoRef);
//   ...
//   return FillRegionStates(*rasterized_, level_, rect, interleave, bands.GetCount(), states);

/// Sets PixelValueState::OutsideROI in the states of the pixels of a block that lie outside a
/// region, and clears it in all others; other bits stay. At a level above 0 a pixel is inside as
/// soon as one of the 2^level by 2^level pixels that it stands for is.
///
/// A block wholly inside or outside takes one pass over its states. Threads: any number at once.
/// @param region      on the grid of the raster at full resolution.
/// @param level       pyramid level of the raster whose block this is, 0 for full resolution.
/// @param rect        in pixels of the level.
/// @param interleave  the order of the states' axes.
/// @param bands       how many bands the block has.
/// @param states      one for each pixel and band.
/// @return false, with the fault set, when the region can't be carried to the grid; the states
///         then mean nothing.
VEXG_EXPORT bool FillRegionStates(RasterizedROI& region, unsigned level, const SubRect& rect,
                                  Interleave interleave, unsigned bands,
                                  Array<unsigned char>& states);

/// Marks a region in a rectangle of a pyramid level.
/// @param mask   [out] height by width; 1 inside, 0 outside.
/// @param count  [out] pixels inside.
VEXG_EXPORT bool MaskAtLevel(RasterizedROI& region, unsigned level, const SubRect& rect,
                             Array<unsigned char>& mask, std::uint64_t& count);

/// The part of a raster that a region covers.
struct RegionExtent {
  std::uint64_t pixels = 0;  ///< in the region
  SubRect bounds;            ///< the smallest rectangle with all of them; means nothing without any
};

/// Counts the pixels of a rectangle that lie in a region.
/// @return false, with the fault set, when the region can't be carried, or at an abort.
VEXG_EXPORT bool MeasureRegion(RasterizedROI& region, const SubRect& rect, const IPC& ipc,
                               RegionExtent& extent);

}  // namespace lumo
