#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "raster/raster_def.h"
#include "tiff_writer/block_layout.h"

namespace lumo::tiff {

/// How the values of blocks are packed.
struct Packing {
  BlockCompression compression = BlockCompression::kNone;
  BlockPredictor predictor = BlockPredictor::kNone;
  std::optional<unsigned> level;
  unsigned bits = 8;          ///< of a value; 1 for masks
  unsigned depth = 1;         ///< values of a pixel
  unsigned sampleFormat = 1;  ///< of TIFF: 1 whole, 2 signed, 3 floating-point, 5, 6 complex
  bool isTiled = true;
  bool isYcc = false;  ///< JPEG of colours, which are packed as brightness and hue

  /// The number in tag 259.
  std::uint16_t CompressionTag() const;
  /// The number in tag 317.
  std::uint16_t PredictorTag() const;
  std::uint64_t RowBytes(unsigned width) const {
    return (std::uint64_t{width} * depth * bits + 7) / 8;
  }
};

/// Gives the packing of a raster whose creation options name a codec.
Packing PackingOf(const RasterDef& def, const BlockLayout& layout);

/// Packs a block.
///
/// Threads: any number at once.
/// @param packed  [out] the bytes in the file.
/// @param why     [out] the reason of a failure.
bool Pack(const Packing& packing, unsigned width, unsigned height, const unsigned char* block,
          std::vector<unsigned char>& packed, std::string& why);

/// Gets back what was packed, as far as the codec keeps it.
bool Unpack(const Packing& packing, unsigned width, unsigned height,
            const std::vector<unsigned char>& packed, unsigned char* block, std::string& why);

}  // namespace lumo::tiff
