#include "views/spectral_subset_raster_impl.h"

namespace lumo {

template class SpectralSubsetRaster<std::uint8_t>;
template class SpectralSubsetRaster<std::int8_t>;
template class SpectralSubsetRaster<std::uint16_t>;
template class SpectralSubsetRaster<std::int16_t>;
template class SpectralSubsetRaster<std::uint32_t>;
template class SpectralSubsetRaster<std::int32_t>;
template class SpectralSubsetRaster<float>;
template class SpectralSubsetRaster<double>;

}  // namespace lumo
