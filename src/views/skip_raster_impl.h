#pragma once

#include <algorithm>

#include "data/block_shape.h"
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
    GeoRef& geoRef = *def_.geoRef;
    geoRef.SetDimensions(def_.samples, def_.lines);
    geoRef.SetPixelSize(geoRef.PixelSizeX() * skipX, geoRef.PixelSizeY() * skipY);
    geoRef.SetTiePixel(geoRef.TiePixelX() / skipX, geoRef.TiePixelY() / skipY);
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

/// What of the parent a line of a block stands on, from its first pixel to its last.
template <typename T>
SubRect SkipRaster<T>::LineInParent(const SubRect& rect, unsigned line) const {
  const unsigned y = line * skipY_;
  return {rect.left * skipX_, y, rect.right * skipX_, y};
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
  T* toPixel = inOrder ? pixels.GetData() : bip.GetData();
  unsigned char* toState = inOrder ? state.GetData() : bipState.GetData();

  Array<T> line;
  Array<unsigned char> lineState;
  for (unsigned y = rect.top; y <= rect.bottom; ++y) {
    if (!this->Parent()->GetSubRect(LineInParent(rect, y), block.bands, Interleave::BIP, line,
                                    lineState)) {
      return false;
    }
    const std::size_t step = std::size_t{skipX_} * count;
    for (unsigned x = 0; x < block.width; ++x) {
      toPixel = std::copy_n(&line[x * step], count, toPixel);
      toState = std::copy_n(&lineState[x * step], count, toState);
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
