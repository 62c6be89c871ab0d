#pragma once

#include <cstddef>

#include "raster/interleave.h"

namespace lumo {

/// Names some lines of a block.
struct LinesOfBlock {
  std::size_t first = 0;    ///< from 0
  std::size_t count = 0;    ///< of them
  std::size_t ofLines = 0;  ///< lines of the block
};

/// Copies lines into their places in a block of another order of the axes, as ConvertInterleave
/// copies whole blocks: so several threads may each bring some lines while these lie in its cache.
/// @param from  `part.count` lines, as a block of their own.
/// @param to    the whole block.
/// Orders and sizes are those that ConvertInterleave takes.
VEXG_EXPORT void ConvertLines(const void* from, Interleave fromOrder, const LinesOfBlock& part,
                              void* to, Interleave toOrder, std::size_t samples, std::size_t bands,
                              std::size_t elementBytes);

/// Takes pixels of several bands apart, each band to a place of its own in a larger block.
/// @param bandStride  elements from a band's place to the next one's, `pixels` or more.
VEXG_EXPORT void SplitPixels(const void* from, void* to, std::size_t pixels, std::size_t bands,
                             std::size_t bandStride, std::size_t elementBytes);

}  // namespace lumo
