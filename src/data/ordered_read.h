#pragma once

#include <optional>

#include "data/raster_reader.h"
#include "raster/block_states.h"

namespace lumo {

/// Marks a reader of a plug-in whose ReadPixels may run on several threads at once, as its
/// ReadOrdered where it is an OrderedReads too, and writes every pixel of its block. Blocks that
/// are asked for in another order than the source's are then read and put in order a few lines at a
/// time, which stay in the cache meanwhile.
class VEXG_EXPORT ConcurrentReads {
 public:
  virtual ~ConcurrentReads() = default;
};

/// Marks a reader that brings blocks in other orders than the source's by itself, and without
/// states where no pixel has one.
template <typename T>
class OrderedReads {
 public:
  virtual ~OrderedReads() = default;
  /// Reads a block as RasterReader::ReadBlock does, into memory of its size, all of which is
  /// written.
  /// @param order   the source's own one as well.
  /// @param states  are made where a pixel has one.
  /// @return nothing, with no states made, where this block has to be read by ReadPixels and put in
  ///         order then.
  virtual std::optional<bool> ReadOrdered(const SubRect& rect, const Array<unsigned>& bands,
                                          unsigned level, Interleave order, T* pixels,
                                          BlockStates& states) = 0;
};

}  // namespace lumo
