#pragma once

#include "foundation/sub_rect.h"
#include "raster/interleave.h"

namespace lumo {

/// The contents of a block of pixels that is asked for, or given, under an interleave: bands, size
/// and the shape of its arrays. Without an interleave it holds the first band alone, however many
/// are named (see BandsOfBlock).
struct BlockShape {
  /// @param rect   corners inclusive; only its size counts.
  /// @param named  bands that are asked for, in the order wanted.
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

  /// Resizes both arrays of a block that is read to the shape. False when the shape is not valid,
  /// or there is no memory.
  template <typename T>
  bool Size(Array<T>& pixels, Array<unsigned char>& state) const {
    return IsValid() && pixels.Resize(dims) && state.Resize(dims);
  }

  /// True when both arrays of a block that is written have all its elements.
  template <typename T>
  bool IsHeldBy(const Array<T>& pixels, const Array<unsigned char>& state) const {
    return IsValid() && pixels.GetCount() >= dims.count && state.GetCount() >= dims.count;
  }

  /// Converts both arrays of a block from one interleave into another. All four have room for the
  /// block. False as ConvertInterleave.
  template <typename T>
  bool Convert(const Array<T>& fromPixels, const Array<unsigned char>& fromState, Interleave from,
               Array<T>& toPixels, Array<unsigned char>& toState, Interleave to) const {
    return ConvertInterleave(fromPixels.GetData(), from, toPixels.GetData(), to, width, height,
                             count, sizeof(T)) &&
           ConvertInterleave(fromState.GetData(), from, toState.GetData(), to, width, height, count,
                             1);
  }

  Interleave interleave;
  Array<unsigned> bands;  ///< those that the block has
  unsigned count;         ///< of bands
  unsigned width;         ///< samples
  unsigned height;        ///< lines
  ArrayDims dims;         ///< shape of the arrays of pixels and of states
};

}  // namespace lumo
