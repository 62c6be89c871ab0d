#pragma once

#include <algorithm>
#include <numeric>

#include "mosaic/pvs_raster.h"
#include "raster/block_strides.h"
#include "raster/interleave.h"

namespace lumo {

template <typename T>
PVSRaster<T>::PVSRaster(const RasterPtr<T>& raster) : ComputedRaster<T>(raster) {
  if (raster.IsNull()) return;
  def_ = raster->GetRasterDef();
  def_.bands = 1;
  def_.noData.clear();
}

template <typename T>
RasterPtr<T> PVSRaster<T>::PyramidLevel(unsigned level) {
  const RasterPtr<T> reduced = ComputedRaster<T>::PyramidLevel(level);
  return reduced ? RasterPtr<T>(new PVSRaster(reduced)) : RasterPtr<T>();
}

template <typename T>
RasterPtr<T> PVSRaster<T>::StoredPyramidLevel(unsigned level) {
  const RasterPtr<T> reduced = ComputedRaster<T>::StoredPyramidLevel(level);
  return reduced ? RasterPtr<T>(new PVSRaster(reduced)) : RasterPtr<T>();
}

template <typename T>
bool PVSRaster<T>::EveryBandHasNoData() const {
  const unsigned bands = this->Parent()->Bands();
  for (unsigned band = 0; band < bands; ++band) {
    if (!this->Parent()->HasNoDataValue(band)) return false;
  }
  return bands != 0;
}

template <typename T>
bool PVSRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                              Interleave interleave, Array<T>& pixels,
                              Array<unsigned char>& state) {
  if (this->Parent().IsNull() || interleave == Interleave::None) return false;
  const unsigned width = rect.Width(), height = rect.Height(), count = bands.GetCount();
  const ArrayDims dims = BlockDims(interleave, width, height, count);
  if (dims.count == 0 || !pixels.Resize(dims) || !state.Resize(dims)) return false;
  std::fill(pixels.begin(), pixels.end(), T(1));
  std::fill(state.begin(), state.end(), static_cast<unsigned char>(PixelValueState::Valid));
  if (!EveryBandHasNoData()) return true;

  Array<unsigned> all{ArrayDims(this->Parent()->Bands())};
  std::iota(all.begin(), all.end(), 0U);
  Array<T> values;
  Array<unsigned char> states;
  if (!this->Parent()->GetSubRect(rect, all, Interleave::BIP, values, states)) return false;
  const unsigned char* of = states.GetData();
  const BlockStrides strides(interleave, width, height, count);
  for (unsigned y = 0; y < height; ++y) {
    for (unsigned x = 0; x < width; ++x, of += all.GetCount()) {
      const bool isNoData = std::all_of(of, of + all.GetCount(), [](unsigned char s) {
        return (s & PixelValueState::NotValid) == PixelValueState::NoData;
      });
      if (isNoData) pixels[y * strides.line + x * strides.pixel] = T(0);
    }
  }
  return true;
}

}  // namespace lumo
