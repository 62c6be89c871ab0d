#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "tiff_writer/block_packer.h"
#include "tiff_writer/block_reducer.h"
#include "tiff_writer/open_blocks.h"

namespace lumo::tiff {

/// A block that is being packed. Several may run at once, each on a thread of its own.
struct BlockWork {
  /// Says what else than the packed block is made of the pixels.
  enum class Levels {
    kNone,  ///< nothing: a file without levels
    kLast,  ///< the mask
    kMore   ///< the mask, and a quarter of a block of the level above
  };

  unsigned level = 0;
  std::uint64_t block = 0;
  OpenBlock* open = nullptr;
  unsigned width = 0, height = 0;  ///< inside the raster
  bool isFill = false;             ///< nothing but the fill value
  bool isTaken = false;            ///< packed by somebody else
  std::vector<unsigned char> packed, packedMask;
  std::vector<unsigned char> reduced, reducedExcluded;  ///< of the level above
  std::string why;                                      ///< it failed; empty otherwise

  /// Packs the block and makes what goes with it.
  /// @param fill    bytes of the fill value.
  /// @param layout  of the block's level.
  void Run(const Packing& packing, const BlockReducer& reducer,
           const std::vector<unsigned char>& fill, const BlockLayout& layout, Levels levels);
};

}  // namespace lumo::tiff
