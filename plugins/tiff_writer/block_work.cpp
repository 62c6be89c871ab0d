#include "tiff_writer/block_work.h"

#include <algorithm>
#include <cstring>

#include "tiff_writer/cog_file.h"

namespace lumo::tiff {
namespace {

bool IsFilled(const std::vector<unsigned char>& pixels, const std::vector<unsigned char>& fill) {
  const std::size_t each = fill.size();
  // Equal to itself one value on, and its first value the fill value.
  return std::memcmp(pixels.data(), fill.data(), each) == 0 &&
         std::memcmp(pixels.data(), pixels.data() + each, pixels.size() - each) == 0;
}

}  // namespace

void BlockWork::Run(const Packing& packing, const BlockReducer& reducer,
                    const std::vector<unsigned char>& fill, const BlockLayout& layout,
                    Levels levels) {
  OpenBlock& from = *open;
  const bool hasExcluded = std::any_of(from.excluded.begin(), from.excluded.end(),
                                       [](unsigned char e) { return e != 0; });
  if (!hasExcluded) from.excluded.clear();
  isFill = !hasExcluded && IsFilled(from.pixels, fill);
  if (!isFill && !isTaken &&
      !Pack(packing, layout.blockWidth, layout.LinesOf(block), from.pixels.data(), packed, why)) {
    if (why.empty()) why = "a block can't be packed";
    return;
  }
  if (levels == Levels::kNone) return;
  if (!isFill) {
    std::vector<unsigned char> excluded = from.excluded;
    excluded.resize(std::size_t{width} * height);
    reducer.ExcludeNoData(from.pixels.data(), width, height, layout.RowBytes(), excluded);
    const bool isAny =
        std::any_of(excluded.begin(), excluded.end(), [](unsigned char e) { return e != 0; });
    const auto bits =
        isAny ? MaskBits(layout, width, height, excluded) : std::vector<unsigned char>();
    if (isAny &&
        !Pack(MaskPacking(), layout.blockWidth, layout.blockHeight, bits.data(), packedMask, why)) {
      if (why.empty()) why = "a mask can't be packed";
      return;
    }
  }
  if (levels == Levels::kLast) return;
  const std::size_t pixels = std::size_t{(width + 1) / 2} * ((height + 1) / 2);
  reduced.resize(pixels * layout.PixelBytes());
  Reduction reduction{};
  reduction.pixels = from.pixels.data();
  reduction.width = width;
  reduction.height = height;
  reduction.line = layout.RowBytes();
  reduction.firstBand = static_cast<unsigned>(block / layout.PlaneBlocks());
  reduction.reduced = reduced.data();
  if (hasExcluded) {
    reducedExcluded.resize(pixels);
    reduction.excluded = from.excluded.data();
    reduction.excludedLine = width;
    reduction.reducedExcluded = reducedExcluded.data();
  }
  reducer.Reduce(reduction);
}

}  // namespace lumo::tiff
