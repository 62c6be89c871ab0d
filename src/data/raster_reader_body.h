#pragma once

#include <algorithm>

#include "data/ordered_read_body.h"
#include "data/raster_reader.h"
#include "foundation/thrown.h"
#include "platform/huge_pages.h"
#include "platform/zero_memory.h"
#include "raster/interleave.h"
#include "raster/pixel_states.h"

namespace lumo {

namespace detail {

/// Gives an array the shape of a block, with every element zero unless all of them are about to be
/// written.
template <typename E>
bool SizeBlock(Array<E>& block, Interleave interleave, const SubRect& rect, unsigned bands,
               bool isCleared = true) {
  const ArrayDims dims = BlockDims(interleave, rect.Width(), rect.Height(), bands);
  // A larger one would get a copy of the old contents, which are of no use.
  if (dims.count > block.GetCapacity() && block.OwnsData()) block = Array<E>();
  if (!block.Resize(dims) || block.GetCount() != dims.count) return false;
  if (isCleared) std::fill_n(block.GetData(), block.GetCount(), E());
  return true;
}

/// Room for a block in the order of a source, on its way to another one. Its thread keeps the
/// memory for the next one, where that isn't much: pages that are new each time cost more than the
/// conversion. A larger block comes in large pages, of which there are few.
template <typename E>
class KeptBlock {
 public:
  KeptBlock() { std::swap(block_, Kept()); }
  ~KeptBlock() {
    std::swap(block_, Kept());
    if (large_ != nullptr) platform::FreeHuge(large_, largeBytes_);
  }
  KeptBlock(const KeptBlock&) = delete;
  KeptBlock& operator=(const KeptBlock&) = delete;

  /// Memory for `count` elements, which hold anything; null where there is none.
  E* Take(unsigned count) {
    constexpr std::size_t kMostBytes = 8 << 20;
    const std::size_t bytes = std::size_t{count} * sizeof(E);
    if (bytes <= kMostBytes) return block_.Resize(ArrayDims(count)) ? block_.GetData() : nullptr;
    try {
      large_ = platform::AllocateHuge(bytes);
      largeBytes_ = bytes;
    } catch (...) {
      NoteException();
    }
    return static_cast<E*>(large_);
  }

 private:
  static Array<E>& Kept() {
    thread_local Array<E> kept;
    return kept;
  }

  Array<E> block_;
  void* large_ = nullptr;
  std::size_t largeBytes_ = 0;
};

/// True for a format whose plug-in comes with the library and writes every pixel of a block that it
/// reads.
bool FillsBlocks(const String& format);

/// NativeInterleave keeps two things of a source: its interleave from 1 on, and whether it fills
/// blocks.
inline constexpr std::int32_t kFills = 256;

inline bool IsInterleave(Interleave interleave) {
  return interleave >= Interleave::None && interleave <= Interleave::BSQ;
}

/// Reads a block by ReadPixels and puts it in another order. All pixels are written; they mean
/// nothing where it gives false.
/// @param isCleared  the source gets memory of zeros, since it may leave some pixels out.
template <typename T>
bool ReadConverted(RasterReader<T>& reader, const SubRect& rect, const Array<unsigned>& bands,
                   unsigned level, Interleave order, bool isCleared, T* pixels,
                   BlockStates& states) {
  const Interleave native = reader.NativeInterleave();
  const unsigned width = rect.Width(), height = rect.Height(), count = bands.GetCount();
  const unsigned elements = width * height * count;  // fits: the arrays have as many
  KeptBlock<T> block;
  T* const nativePixels = block.Take(elements);
  KeptBlock<unsigned char> stateBlock;
  unsigned char* const nativeState = stateBlock.Take(elements);
  if (nativePixels == nullptr || nativeState == nullptr) return false;
  if (isCleared) std::fill_n(nativePixels, elements, T());
  std::fill_n(nativeState, elements, static_cast<unsigned char>(0));
  if (!reader.ReadPixels(rect.left, rect.top, width, height, bands, level, nativePixels,
                         nativeState) ||
      !ConvertInterleave(nativePixels, native, pixels, order, width, height, count, sizeof(T))) {
    return false;
  }
  // There is nothing to convert where all states are 0.
  if (!AnyHasState(nativeState, elements, 0xFF)) return true;
  unsigned char* const state = states.Make(order, width, height, count);
  return state != nullptr &&
         ConvertInterleave(nativeState, native, state, order, width, height, count, 1);
}

}  // namespace detail

template <typename T>
Interleave RasterReader<T>::NativeInterleave() {
  std::int32_t native = nativeInterleave_;
  if (native == kNotAsked) {
    const lumo::RasterDef def = RasterDef();
    native = (static_cast<std::int32_t>(def.interleave) + 1) |
             (detail::FillsBlocks(def.format) ? detail::kFills : 0);
    nativeInterleave_ = native;
  }
  return static_cast<Interleave>((native & ~detail::kFills) - 1);
}

template <typename T>
bool RasterReader<T>::ReadBlock(const SubRect& rect, const Array<unsigned>& bands, unsigned level,
                                Interleave interleave, Array<T>& pixels,
                                Array<unsigned char>& state) {
  if (!detail::IsInterleave(interleave) || bands.GetCount() == 0) return false;
  BlockStates states(state);
  const bool isRead = ReadBlock(rect, bands, level, interleave, pixels, states);
  if (isRead && states.AreMade()) return true;
  const unsigned count = BandsOfBlock(bands, interleave).GetCount();
  return detail::SizeBlock(state, interleave, rect, count) && isRead;
}

template <typename T>
bool RasterReader<T>::ReadBlock(const SubRect& rect, const Array<unsigned>& bands, unsigned level,
                                Interleave interleave, Array<T>& pixels, BlockStates& states) {
  if (!detail::IsInterleave(interleave) || bands.GetCount() == 0) return false;
  const Array<unsigned> wanted = BandsOfBlock(bands, interleave);
  const unsigned count = wanted.GetCount();
  const Interleave native = NativeInterleave();
  const bool isCleared = (nativeInterleave_ & detail::kFills) == 0;
  const bool isStraight = native == interleave || count == 1;
  if (!detail::SizeBlock(pixels, interleave, rect, count, isCleared && isStraight)) return false;
  T* const to = pixels.GetData();
  std::optional<bool> isRead =
      detail::ReadAsked(*this, rect, wanted, level, interleave, to, states);
  if (!isRead) {
    isRead = detail::ReadConverted(*this, rect, wanted, level, interleave, isCleared, to, states);
  }
  // The pixels of an earlier block are nothing to go by.
  if (!*isRead && !(isStraight && isCleared)) std::fill_n(to, pixels.GetCount(), T());
  return *isRead;
}

template <typename T>
bool RasterReader<T>::WriteBlock(const SubRect& rect, const Array<unsigned>& bands, unsigned level,
                                 Interleave interleave, const Array<T>& pixels,
                                 const Array<unsigned char>& state) {
  const unsigned width = rect.Width(), height = rect.Height();
  if (!detail::IsInterleave(interleave) || bands.GetCount() == 0) return false;
  const Array<unsigned> given = BandsOfBlock(bands, interleave);
  const unsigned count = given.GetCount();
  const std::uint64_t elements = std::uint64_t{width} * height * count;
  if (pixels.GetCount() < elements || state.GetCount() < elements) return false;
  const Interleave native = NativeInterleave();
  if (native == interleave || count == 1) {
    return WriteNative(rect, given, level, pixels.GetData(), state.GetData());
  }
  Array<T> nativePixels;
  if (!detail::SizeBlock(nativePixels, native, rect, count, false) ||
      !ConvertInterleave(pixels.GetData(), interleave, nativePixels.GetData(), native, width,
                         height, count, sizeof(T))) {
    return false;
  }
  if (platform::AreZeros(state.GetData())) {
    return WriteNative(rect, given, level, nativePixels.GetData(), state.GetData());
  }
  Array<unsigned char> nativeState;
  return detail::SizeBlock(nativeState, native, rect, count, false) &&
         ConvertInterleave(state.GetData(), interleave, nativeState.GetData(), native, width,
                           height, count, 1) &&
         WriteNative(rect, given, level, nativePixels.GetData(), nativeState.GetData());
}

/// Counts once the pixels are there: what was computed meanwhile holds for a number before. A write
/// that fails may have changed pixels too.
template <typename T>
bool RasterReader<T>::WriteNative(const SubRect& rect, const Array<unsigned>& bands, unsigned level,
                                  const T* pixels, const unsigned char* state) {
  const bool isWritten =
      WritePixels(rect.left, rect.top, rect.Width(), rect.Height(), bands, level, pixels, state);
  ++writes_[PlaceOf(level)];
  return isWritten;
}

}  // namespace lumo
