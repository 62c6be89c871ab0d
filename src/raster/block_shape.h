#pragma once

#include "foundation/sub_rect.h"
#include "raster/interleave.h"

namespace lumo {

/// The contents of a block of pixels that is asked for, or given, under an interleave: bands, size
/// and the shape of its arrays. Without an interleave it holds the first band alone, however many
/// are named (see BandsOfBlock).
struct BlockShape {
  BlockShape(const SubRect& rect, const Array<unsigned>& named, Interleave order)
      : interleave(order),
        bands(BandsOfBlock(named, order)),
        count(bands.GetCount()),
        width(rect.Width()),
        height(rect.Height()),
        dims(BlockDims(order, width, height, count)) {}

  /// False without a band, for an interleave that doesn't exist, and for more elements than an
  /// array can have.
  bool IsValid() const {
    return count != 0 && dims.count != ArrayDims::kTooMany &&
           dims.count == std::uint64_t{width} * height * count;
  }

  /// Gives both arrays of a block that is read the shape; false when that can't be had.
  template <typename T>
  bool Size(Array<T>& pixels, Array<unsigned char>& state) const {
    return IsValid() && pixels.Resize(dims) && state.Resize(dims);
  }

  /// True when both arrays of a block that is written have all its elements.
  template <typename T>
  bool IsHeldBy(const Array<T>& pixels, const Array<unsigned char>& state) const {
    return IsValid() && pixels.GetCount() >= dims.count && state.GetCount() >= dims.count;
  }

  /// Converts both arrays of a block from one interleave into another.
  template <typename T>
  bool Convert(const Array<T>& fromPixels, const Array<unsigned char>& fromState, Interleave from,
               Array<T>& toPixels, Array<unsigned char>& toState, Interleave to) const {
    return ConvertInterleave(fromPixels.GetData(), from, toPixels.GetData(), to, width, height,
                             count, sizeof(T)) &&
           ConvertInterleave(fromState.GetData(), from, toState.GetData(), to, width, height, count,
                             1);
  }

  Interleave interleave;
  Array<unsigned> bands;
  unsigned count;  ///< of bands
  unsigned width;
  unsigned height;
  ArrayDims dims;
};

}  // namespace lumo
