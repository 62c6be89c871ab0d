#pragma once

#include <string>
#include <vector>

#include "tiff_writer/directory_writer.h"
#include "tiff_writer/packed_pixels.h"

namespace lumo::tiff {

/// The parts that a cloud-optimised file is put together from.
struct CogParts {
  const platform::RandomAccessFile& store;  ///< holds the packed blocks
  const std::vector<PackedLevel>& levels;   ///< the raster, and levels each half of the one before
  const std::vector<TagValue>& tags;        ///< of the raster
  const Packing& packing;
  std::vector<unsigned char> fill;       ///< a packed block that nobody has written
  bool hasMasks = false;                 ///< some pixel is excluded
  std::vector<unsigned char> allValid;   ///< a packed block of a mask without excluded pixels
  std::vector<unsigned char> noneValid;  ///< one of nothing else
  bool isFillNoData = false;             ///< noneValid is the mask of `fill`
  BigTiffChoice bigTiff;
};

/// How masks are packed: a bit for each pixel, 1 where it counts.
Packing MaskPacking();
/// The bits of a mask. @param excluded  width by height bytes inside the block; empty for none.
std::vector<unsigned char> MaskBits(const BlockLayout& layout, unsigned width, unsigned height,
                                    const std::vector<unsigned char>& excluded);

/// Sets the tags that say how blocks lie in a file.
void SetBlockTags(DirectoryWriter& directory, const BlockLayout& layout, const Packing& packing,
                  const std::vector<std::uint64_t>& offsets,
                  const std::vector<std::uint32_t>& counts);

/// Writes a cloud-optimised GeoTIFF file: what describes all images, then the pixels of the
/// smallest level, and so on up to the raster's own. In front stands the text by which GDAL knows
/// the order; each block has its size in front and its last four bytes once more behind it.
///
/// Source: "Cloud Optimized GeoTIFF driver", section "File format", GDAL documentation, 3.1 and
/// later. False, with the fault set, when it can't be written.
bool WriteCog(const std::string& path, const CogParts& parts);

}  // namespace lumo::tiff
