#pragma once

#include <span>

#include "raster/raster_iterator.h"

namespace lumo {

/// The blocks in which pixels are copied.
enum class CopyBlocks : unsigned {
  kTold = 0,    ///< squares, or lines, of 8 MiB
  kStream = 1,  ///< those of the source's storage
  kTarget = 2   ///< those of the target's storage
};

inline std::span<const EnumWord<CopyBlocks>> WordsOf(CopyBlocks) {
  static constexpr EnumWord<CopyBlocks> kWords[] = {{"Told", CopyBlocks::kTold},
                                                    {"Stream", CopyBlocks::kStream},
                                                    {"Target", CopyBlocks::kTarget}};
  return kWords;
}

/// Bytes of a block that is read as the target stores it. Measured with warps: a block stays in the
/// caches from its making to its writing, and is worth the reading of what lies around it in the
/// source.
inline constexpr unsigned kTargetBudget = 0x200000;

/// Reads a raster in the blocks and the order in which another one of its size is stored, so that
/// whole blocks are written there.
template <typename T>
class IteratorOfTarget final : public RasterIterator<T> {
 public:
  IteratorOfTarget(const RasterPtr<T>& source, const Array<unsigned>& bands,
                   const BasicRaster& target)
      : RasterIterator<T>(source, StreamTiles(&target, sizeof(T), kTargetBudget, bands.GetCount()),
                          bands) {
    this->order_ = StreamOrder(&target);
  }
};

/// Makes the iterator by which a raster is copied into another one.
template <typename T>
RasterIteratorPtr<T> MakeCopyIterator(const RasterPtr<T>& source, const Array<unsigned>& bands,
                                      CopyBlocks blocks, const BasicRaster& target) {
  if (blocks == CopyBlocks::kTarget) {
    return RasterIteratorPtr<T>(new IteratorOfTarget<T>(source, bands, target));
  }
  if (blocks == CopyBlocks::kStream) {
    return RasterIteratorPtr<T>(new RasterIteratorStream<T>(source, bands));
  }
  return RasterIteratorPtr<T>(new RasterIteratorSmart<T>(source, bands));
}

}  // namespace lumo
