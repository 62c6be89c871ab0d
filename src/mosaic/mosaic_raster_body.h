#pragma once

#include "foundation/type_code.h"
#include "mosaic/mosaic_raster.h"
#include "raster/block_shape.h"
#include "raster/block_strides.h"
#include "raster/pixel_states.h"
#include "raster/pixel_value.h"
#include "warp/projected_raster.h"

namespace lumo {

template <typename T>
const unsigned MosaicRaster<T>::TypeCode = GloballyUniqueObjectTypeCode(
    String("MosaicRaster<" + DataTypeName(kDataTypeOf<T>).ToUTF8() + ">"));

template <typename T>
MosaicRaster<T>::MosaicRaster(const MosaicRasterDefPtr<T>& definition, const RasterDef& grid)
    : definition_(definition), def_(grid) {
  def_.dataType = kDataTypeOf<T>;
  const bool isUsable =
      definition && def_.geoRef && def_.samples != 0 && def_.lines != 0 && def_.bands != 0;
  if (!isUsable) {
    def_.Clear();
    return;
  }
  def_.SetGeoRef(def_.geoRef);  // of the size
  const MosaicSettings& settings = definition->Settings();
  const ProjectedRasterOptions options{ProjectedGrid::kExact, WarpSampling::kCentred,
                                       settings.noData};
  onGrid_.Resize(ArrayDims(definition->SceneCount()));
  for (unsigned i = 0; i < onGrid_.GetCount(); ++i) {
    onGrid_[i].Reset(new ProjectedRaster<T>(definition->Scenes()[i], def_.geoRef,
                                            ReprojectionMethod::kPolynomial, settings.resampling,
                                            options));
  }
}

template <typename T>
bool MosaicRaster<T>::HasNoDataValue(unsigned band) const {
  const auto at = def_.noData.find(band);
  return at != def_.noData.end() && ToPixel<T>(at->second).has_value();
}

template <typename T>
T MosaicRaster<T>::NoDataValue(unsigned band) const {
  const auto at = def_.noData.find(band);
  return at != def_.noData.end() ? ToPixel<T>(at->second).value_or(T()) : T();
}

template <typename T>
std::uint64_t MosaicRaster<T>::WriteCount() const {
  return definition_ ? definition_->Revision() : 0;
}

template <typename T>
bool MosaicRaster<T>::GetSubRect(const SubRect& rect, const Array<unsigned>& bands,
                                 Interleave interleave, Array<T>& pixels,
                                 Array<unsigned char>& state) {
  const BlockShape block(rect, bands, interleave);
  if (!IsValid() || !block.Size(pixels, state)) return false;
  std::fill(state.begin(), state.end(), static_cast<unsigned char>(PixelValueState::NoData));
  const BlockStrides strides(interleave, block.width, block.height, block.count);
  for (unsigned band = 0; band < block.count; ++band) {
    const T value = NoDataValue(block.bands[band]);
    for (unsigned y = 0; y < block.height; ++y)
      for (unsigned x = 0; x < block.width; ++x)
        pixels[y * strides.line + x * strides.pixel + band * strides.band] = value;
  }
  Array<T> scenePixels;
  Array<unsigned char> sceneState;
  const auto hasAny = [&](const Array<unsigned char>& states, std::size_t at) {
    for (unsigned band = 0; band < block.count; ++band)
      if (IsValidState(states[static_cast<unsigned>(at + band * strides.band)])) return true;
    return false;
  };
  for (const RasterPtr<T>& scene : onGrid_) {
    if (!scene->GetSubRect(rect, block.bands, interleave, scenePixels, sceneState)) return false;
    for (unsigned y = 0; y < block.height; ++y) {
      for (unsigned x = 0; x < block.width; ++x) {
        const std::size_t at = y * strides.line + x * strides.pixel;
        if (hasAny(state, at) || !hasAny(sceneState, at)) continue;
        for (unsigned band = 0; band < block.count; ++band) {
          const auto to = static_cast<unsigned>(at + band * strides.band);
          pixels[to] = scenePixels[to];
          state[to] = sceneState[to];
        }
      }
    }
  }
  return true;
}

}  // namespace lumo
