#pragma once

#include <algorithm>

#include "raster/interleave.h"
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
  const unsigned width = rect.Width(), height = rect.Height(), count = bands.GetCount();
  const ArrayDims dims = BlockDims(interleave, width, height, count);
  if (!this->Parent() || rect.right >= Samples() || rect.bottom >= Lines() ||
      !pixels.Resize(dims) || !state.Resize(dims)) {
    return false;
  }
  const bool inOrder = interleave == Interleave::BIP || count == 1;
  Array<T> bip;
  Array<unsigned char> bipState;
  const ArrayDims flat(dims.count);
  if (!inOrder && (!bip.Resize(flat) || !bipState.Resize(flat))) return false;
  T* toPixel = inOrder ? pixels.GetData() : bip.GetData();
  unsigned char* toState = inOrder ? state.GetData() : bipState.GetData();

  Array<T> line;
  Array<unsigned char> lineState;
  for (unsigned y = rect.top; y <= rect.bottom; ++y) {
    if (!this->Parent()->GetSubRect(LineInParent(rect, y), bands, Interleave::BIP, line,
                                    lineState)) {
      return false;
    }
    const std::size_t step = std::size_t{skipX_} * count;
    for (unsigned x = 0; x < width; ++x) {
      toPixel = std::copy_n(&line[x * step], count, toPixel);
      toState = std::copy_n(&lineState[x * step], count, toState);
    }
  }
  return inOrder || (ConvertInterleave(bip.GetData(), Interleave::BIP, pixels.GetData(), interleave,
                                       width, height, count, sizeof(T)) &&
                     ConvertInterleave(bipState.GetData(), Interleave::BIP, state.GetData(),
                                       interleave, width, height, count, 1));
}

template <typename T>
bool SkipRaster<T>::PutSubRect(const SubRect& rect, const Array<unsigned>& bands,
                               Interleave interleave, Array<T>& pixels,
                               Array<unsigned char>& state) {
  const unsigned width = rect.Width(), height = rect.Height(), count = bands.GetCount();
  const ArrayDims flat(BlockDims(interleave, width, height, count).count);
  if (!this->Parent() || rect.right >= Samples() || rect.bottom >= Lines() ||
      pixels.GetCount() < flat.count || state.GetCount() < flat.count) {
    return false;
  }
  Array<T> bip;
  Array<unsigned char> bipState;
  if (!bip.Resize(flat) || !bipState.Resize(flat) ||
      !ConvertInterleave(pixels.GetData(), interleave, bip.GetData(), Interleave::BIP, width,
                         height, count, sizeof(T)) ||
      !ConvertInterleave(state.GetData(), interleave, bipState.GetData(), Interleave::BIP, width,
                         height, count, 1)) {
    return false;
  }
  const T* fromPixel = bip.GetData();
  const unsigned char* fromState = bipState.GetData();
  Array<T> line;
  Array<unsigned char> lineState;
  for (unsigned y = rect.top; y <= rect.bottom; ++y) {
    const SubRect inParent = LineInParent(rect, y);
    if (!this->Parent()->GetSubRect(inParent, bands, Interleave::BIP, line, lineState)) {
      return false;
    }
    const std::size_t step = std::size_t{skipX_} * count;
    for (unsigned x = 0; x < width; ++x, fromPixel += count, fromState += count) {
      std::copy_n(fromPixel, count, &line[x * step]);
      std::copy_n(fromState, count, &lineState[x * step]);
    }
    if (!this->Parent()->PutSubRect(inParent, bands, Interleave::BIP, line, lineState)) {
      return false;
    }
  }
  return true;
}

}  // namespace lumo
