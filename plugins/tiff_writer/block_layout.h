#pragma once

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <type_traits>

#include "foundation/array.h"

namespace lumo {

/// A block of pixels: where it lies in the raster, and in the caller's memory.
struct BlockPlace {
  unsigned left, top, width, height;  ///< in pixels of the level
  const Array<unsigned>& bands;
  unsigned level;
};

namespace tiff {

/// How a TIFF file cuts a raster into blocks, tiles or strips. In bytes, where nothing else is
/// said.
struct BlockLayout {
  unsigned samples = 0;
  unsigned lines = 0;
  unsigned bands = 0;
  unsigned blockWidth = 0;   ///< pixels
  unsigned blockHeight = 0;  ///< lines; the last strip of a raster may have fewer
  unsigned element = 0;      ///< one value
  bool byPixel = false;      ///< the bands of a pixel lie together, else those of a block's band
  bool isTiled = false;

  unsigned Columns() const { return (samples + blockWidth - 1) / blockWidth; }
  unsigned Rows() const { return (lines + blockHeight - 1) / blockHeight; }
  /// Bands in a block.
  unsigned Depth() const { return byPixel ? bands : 1; }
  std::uint64_t PixelBytes() const { return std::uint64_t{Depth()} * element; }
  std::uint64_t RowBytes() const { return blockWidth * PixelBytes(); }
  std::uint64_t PlaneBlocks() const { return std::uint64_t{Columns()} * Rows(); }
  std::uint64_t Planes() const { return bands / Depth(); }
  std::uint64_t Blocks() const { return PlaneBlocks() * Planes(); }
  unsigned RowOf(std::uint64_t block) const {
    return static_cast<unsigned>(block % PlaneBlocks() / Columns());
  }
  unsigned ColumnOf(std::uint64_t block) const {
    return static_cast<unsigned>(block % PlaneBlocks() % Columns());
  }
  /// Lines that a block has in the file.
  unsigned LinesOf(std::uint64_t block) const { return isTiled ? blockHeight : InnerHeight(block); }
  /// Lines and pixels of a block that lie inside the raster.
  unsigned InnerHeight(std::uint64_t block) const {
    return std::min(blockHeight, lines - RowOf(block) * blockHeight);
  }
  unsigned InnerWidth(std::uint64_t block) const {
    return std::min(blockWidth, samples - ColumnOf(block) * blockWidth);
  }
  std::uint64_t BlockBytes(std::uint64_t block) const { return LinesOf(block) * RowBytes(); }
};

/// A rectangle inside one block of the file.
struct BlockRun {
  std::uint64_t block;
  unsigned left, top, width, height;  ///< inside the block
  unsigned columns;                   ///< of the block, that lie inside the raster
  std::uint64_t memory;               ///< where its first pixel lies in the caller's memory

  bool IsWholeRows() const { return left == 0 && width == columns; }
};

/// Strides of the caller's memory, which is in the order of the file, in bytes.
struct MemoryStrides {
  MemoryStrides(const BlockLayout& layout, const BlockPlace& place)
      : pixel((layout.byPixel ? place.bands.GetCount() : 1) * std::uint64_t{layout.element}),
        line(place.width * pixel),
        band(place.height * line) {}

  std::uint64_t pixel, line, band;
};

/// True when the memory has the bands of the file, in their order.
inline bool HasAllBands(const BlockLayout& layout, const BlockPlace& place) {
  if (!layout.byPixel) return true;
  if (place.bands.GetCount() != layout.bands) return false;
  for (unsigned i = 0; i < layout.bands; ++i) {
    if (place.bands[i] != i) return false;
  }
  return true;
}

/// Carries the chosen bands of pixels from the caller's memory to the file's order, or back.
template <bool kToFile>
void CarryBands(const BlockLayout& layout, const BlockPlace& place, unsigned width,
                std::conditional_t<kToFile, unsigned char*, const unsigned char*> file,
                std::conditional_t<kToFile, const unsigned char*, unsigned char*> memory) {
  const std::size_t element = layout.element;
  const unsigned bands = place.bands.GetCount();
  for (unsigned x = 0; x < width; ++x) {
    for (unsigned i = 0; i < bands; ++i) {
      auto* const inFile = file + place.bands[i] * element;
      if constexpr (kToFile) {
        std::memcpy(inFile, memory, element);
      } else {
        std::memcpy(memory, inFile, element);
      }
      memory += element;
    }
    file += layout.PixelBytes();
  }
}

/// Calls `visit(run)` for the part of a place in each block of the file, until one gives false.
template <typename Visit>
bool ForRuns(const BlockLayout& layout, const BlockPlace& place, const Visit& visit) {
  const MemoryStrides strides(layout, place);
  const unsigned planes = layout.byPixel ? 1 : place.bands.GetCount();
  const unsigned right = place.left + place.width, bottom = place.top + place.height;
  for (unsigned plane = 0; plane < planes; ++plane) {
    const std::uint64_t first = layout.byPixel ? 0 : layout.PlaneBlocks() * place.bands[plane];
    for (unsigned y = place.top; y < bottom;) {
      const unsigned row = y / layout.blockHeight;
      const auto below = static_cast<unsigned>(
          std::min(std::uint64_t{row + 1} * layout.blockHeight, std::uint64_t{bottom}));
      for (unsigned x = place.left; x < right;) {
        const unsigned column = x / layout.blockWidth;
        const std::uint64_t blockRight = std::uint64_t{column + 1} * layout.blockWidth;
        const auto beyond = static_cast<unsigned>(std::min(blockRight, std::uint64_t{right}));
        BlockRun run{};
        run.block = first + std::uint64_t{row} * layout.Columns() + column;
        run.left = x - column * layout.blockWidth;
        run.top = y - row * layout.blockHeight;
        run.width = beyond - x;
        run.height = below - y;
        run.columns = std::min(layout.blockWidth, layout.samples - column * layout.blockWidth);
        run.memory = plane * strides.band + (y - place.top) * strides.line +
                     (x - place.left) * strides.pixel;
        if (!visit(run)) return false;
        x = beyond;
      }
      y = below;
    }
  }
  return true;
}

}  // namespace tiff
}  // namespace lumo
