#pragma once

#include <span>

#include "raster/raster_iterator.h"

namespace lumo {

/// The blocks in which pixels are copied.
enum class CopyBlocks : unsigned {
  kTold = 0,   ///< squares, or lines, of 8 MiB
  kStream = 1  ///< those of the source's storage
};

inline std::span<const EnumWord<CopyBlocks>> WordsOf(CopyBlocks) {
  static constexpr EnumWord<CopyBlocks> kWords[] = {{"Told", CopyBlocks::kTold},
                                                    {"Stream", CopyBlocks::kStream}};
  return kWords;
}

/// Makes the iterator by which a raster is copied.
template <typename T>
RasterIteratorPtr<T> MakeCopyIterator(const RasterPtr<T>& source, const Array<unsigned>& bands,
                                      CopyBlocks blocks) {
  if (blocks == CopyBlocks::kStream) {
    return RasterIteratorPtr<T>(new RasterIteratorStream<T>(source, bands));
  }
  return RasterIteratorPtr<T>(new RasterIteratorSmart<T>(source, bands));
}

}  // namespace lumo
