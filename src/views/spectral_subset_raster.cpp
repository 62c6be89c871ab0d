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

VEXG_INSTANCES(EIGHT, SpectralSubsetRaster);

}  // namespace lumo
