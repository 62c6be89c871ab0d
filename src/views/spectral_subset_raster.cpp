#include "views/spectral_subset_raster.h"

#include "raster/band_order.h"

namespace lumo {

template <typename T>
SpectralSubsetRaster<T>::SpectralSubsetRaster(const RasterPtr<T>& parent,
                                              const Array<unsigned>& bands)
    : RasterView<T>(parent), order_(bands) {
  if (!parent || order_.GetCount() == 0) return;
  def_ = parent->GetRasterDef();
  ChooseBands(def_, order_);
}

template <typename T>
RasterPtr<T> SpectralSubsetRaster<T>::PyramidLevel(unsigned level) {
  const RasterPtr<T> reduced = RasterView<T>::PyramidLevel(level);
  return reduced ? RasterPtr<T>(new SpectralSubsetRaster(reduced, order_)) : RasterPtr<T>();
}

template <typename T>
bool SpectralSubsetRaster<T>::GetBlock(const SubRect& rect, const Array<unsigned>& bands,
                                       Interleave interleave, Array<T>& pixels,
                                       BlockStates& states) {
  const RasterPtr<T>& parent = this->Parent();
  return parent && GetBlockOf(*parent, rect, BandsIn(order_, bands), interleave, pixels, states);
}

VEXG_INSTANCES(EIGHT, SpectralSubsetRaster);

}  // namespace lumo
