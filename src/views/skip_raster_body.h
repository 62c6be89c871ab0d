#pragma once

#include <algorithm>

#include "georef/derived_georef.h"
#include "raster/block_shape.h"
#include "views/skip_raster.h"

namespace lumo {

template <typename T>
SkipRaster<T>::SkipRaster(const RasterPtr<T>& parent, unsigned skipX, unsigned skipY, bool topLevel)
    : ComputedRaster<T>(skipX != 0 && skipY != 0 ? parent : RasterPtr<T>()),
      skipX_(skipX),
      skipY_(skipY) {
  if (!this->Parent()) return;
  def_ = parent->GetRasterDef();
  def_.samples = parent->Samples() / skipX;
  def_.lines = parent->Lines() / skipY;
  if (def_.geoRef) {
    def_.geoRef = ReducedGeoRef(*def_.geoRef, skipX, skipY, def_.samples, def_.lines);
  }
  if (topLevel) pyramidDef_ = parent->GetPyramidDef();
}

template <typename T>
RasterPtr<T> SkipRaster<T>::PyramidLevel(unsigned level) {
  const RasterPtr<T> reduced =
      this->Parent() ? this->Parent()->PyramidLevel(level) : RasterPtr<T>();
  if (!reduced) return {};
  return RasterPtr<T>(new SkipRaster(reduced, skipX_, skipY_, false));
}

template <typename T>
lumo::TileDimensions SkipRaster<T>::TileDimensions() const {
  lumo::TileDimensions tiles;
  tiles.width = Samples();
  tiles.height = 1;
  return tiles;
}

/// Gives the pixels of the parent that a line of a block stands on, from its first to its last.
template <typename T>
SubRect SkipRaster<T>::LineInParent(const SubRect& rect, unsigned line) const {
  const unsigned y = line * skipY_;
  return {rect.left * skipX_, y, rect.right * skipX_, y};
}

/// Gives the part of a block that is read with its pixel (x, y) as the first one: the lines that
/// lie in the same row of the parent's tiles or strips, so that each of these is decoded once, and
/// as many tiles of it as memory allows. Of a parent stored in lines no line is read in vain.
template <typename T>
SubRect SkipRaster<T>::ReadAtOnce(const SubRect& rect, unsigned x, unsigned y,
                                  unsigned bands) const {
  const unsigned tileHeight = std::max(def_.tileHeight, 1U);
  const unsigned inTile = (tileHeight - 1 - y * skipY_ % tileHeight) / skipY_ + 1;
  const unsigned bottom = y + std::min(inTile - 1, rect.bottom - y);
  constexpr std::uint64_t kMostBytes = std::uint64_t{64} << 20;
  const std::uint64_t columnBytes =
      (std::uint64_t{bottom - y} * skipY_ + 1) * std::max(bands, 1U) * (sizeof(T) + 1);
  const std::uint64_t tileWidth = std::max(def_.tileWidth, 1U);
  const std::uint64_t columns =
      std::max<std::uint64_t>(kMostBytes / columnBytes / tileWidth, 1) * tileWidth;
  const std::uint64_t last =
      (x * std::uint64_t{skipX_} / tileWidth * tileWidth + columns - 1) / skipX_;
  const auto right = static_cast<unsigned>(std::clamp<std::uint64_t>(last, x, rect.right));
  return {x, y, right, bottom};
}

template <typename T>
bool SkipRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                               Interleave interleave, Array<T>& pixels,
                               Array<unsigned char>& state) {
  const BlockShape block(rect, bands, interleave);
  if (!this->Parent() || rect.right >= Samples() || rect.bottom >= Lines() ||
      !block.Size(pixels, state)) {
    return false;
  }
  const unsigned count = block.count;
  const bool inOrder = interleave == Interleave::BIP || count == 1;
  Array<T> bip;
  Array<unsigned char> bipState;
  const ArrayDims flat(block.dims.count);
  if (!inOrder && (!bip.Resize(flat) || !bipState.Resize(flat))) return false;
  T* const toPixels = inOrder ? pixels.GetData() : bip.GetData();
  unsigned char* const toStates = inOrder ? state.GetData() : bipState.GetData();

  Array<T> read;
  Array<unsigned char> readState;
  SubRect part = rect;
  for (unsigned y = rect.top; y <= rect.bottom; y = part.bottom + 1) {
    for (unsigned x = rect.left; x <= rect.right; x = part.right + 1) {
      part = ReadAtOnce(rect, x, y, count);
      const SubRect inParent(part.left * skipX_, part.top * skipY_, part.right * skipX_,
                             part.bottom * skipY_);
      if (!this->Parent()->GetSubRect(inParent, block.bands, Interleave::BIP, read, readState)) {
        return false;
      }
      const std::size_t step = std::size_t{skipX_} * count;
      for (std::size_t line = 0; line < part.Height(); ++line) {
        const std::size_t from = line * skipY_ * inParent.Width() * count;
        const std::size_t to = ((y - rect.top + line) * block.width + (x - rect.left)) * count;
        for (std::size_t i = 0; i < part.Width(); ++i) {
          std::copy_n(&read[from + i * step], count, toPixels + to + i * count);
          std::copy_n(&readState[from + i * step], count, toStates + to + i * count);
        }
      }
    }
  }
  return inOrder || block.Convert(bip, bipState, Interleave::BIP, pixels, state, interleave);
}

template <typename T>
bool SkipRaster<T>::PutSubRect(const SubRect& rect, const Array<unsigned>& bands,
                               Interleave interleave, Array<T>& pixels,
                               Array<unsigned char>& state) {
  const BlockShape block(rect, bands, interleave);
  if (!this->Parent() || rect.right >= Samples() || rect.bottom >= Lines() ||
      !block.IsHeldBy(pixels, state)) {
    return false;
  }
  const unsigned count = block.count;
  const ArrayDims flat(block.dims.count);
  Array<T> bip;
  Array<unsigned char> bipState;
  if (!bip.Resize(flat) || !bipState.Resize(flat) ||
      !block.Convert(pixels, state, interleave, bip, bipState, Interleave::BIP)) {
    return false;
  }
  const T* fromPixel = bip.GetData();
  const unsigned char* fromState = bipState.GetData();
  Array<T> line;
  Array<unsigned char> lineState;
  for (unsigned y = rect.top; y <= rect.bottom; ++y) {
    const SubRect inParent = LineInParent(rect, y);
    if (!this->Parent()->GetSubRect(inParent, block.bands, Interleave::BIP, line, lineState)) {
      return false;
    }
    const std::size_t step = std::size_t{skipX_} * count;
    for (unsigned x = 0; x < block.width; ++x, fromPixel += count, fromState += count) {
      std::copy_n(fromPixel, count, &line[x * step]);
      std::copy_n(fromState, count, &lineState[x * step]);
    }
    if (!this->Parent()->PutSubRect(inParent, block.bands, Interleave::BIP, line, lineState)) {
      return false;
    }
  }
  return true;
}

}  // namespace lumo
