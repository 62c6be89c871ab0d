#pragma once

#include <cstddef>

#include "foundation/array.h"
#include "raster/raster_enums.h"

namespace lumo {

/// The shape of the array of a pixel block: its axes in the order of the interleave, slowest first.
/// Without an interleave only lines and samples. An interleave that doesn't exist gives rank 0.
VEXG_EXPORT ArrayDims BlockDims(Interleave interleave, unsigned samples, unsigned lines,
                                unsigned bands);

/// The bands that a block asked for in an interleave has: without an interleave one, whatever is
/// asked for.
VEXG_EXPORT Array<unsigned> BandsOfBlock(const Array<unsigned>& bands, Interleave interleave);

/// Copies a block of samples by lines by bands elements from one order of its axes into another.
/// The blocks have no gaps and do not overlap. The same call serves pixels and state bytes.
///
/// Without an interleave a block has one band, and is the same in every order.
/// @param elementBytes  1, 2, 4, 8 or 16.
/// @return false, with nothing written, for another element size, an interleave that doesn't exist,
///         or more than one band without an interleave.
/// The cost is that of moving the bytes: vector registers do the commonest cases.
///
///     // 512 lines by 512 samples of 4 bands, from pixel-interleaved to band after band:
///     ConvertInterleave(from, Interleave::BIP, to, Interleave::BSQ, 512, 512, 4, sizeof(float));
VEXG_EXPORT bool ConvertInterleave(const void* from, Interleave fromOrder, void* to,
                                   Interleave toOrder, std::size_t samples, std::size_t lines,
                                   std::size_t bands, std::size_t elementBytes);

}  // namespace lumo
